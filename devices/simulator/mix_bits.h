// What simulated noise and jitter come from.
#ifndef ZR_DEVICES_SIMULATOR_MIX_BITS_H
#define ZR_DEVICES_SIMULATOR_MIX_BITS_H

#include <cstdint>

namespace simulator {

// The step of the splitmix64 generator: 2^64 divided by the golden ratio, made odd.
inline constexpr std::uint64_t kSplitMixStep = 0x9E3779B97F4A7C15U;

// The output function of splitmix64 (Steele, Lea and Flood, 2014): neighbouring inputs give outputs
// that look independent.
constexpr std::uint64_t mixBits(std::uint64_t bits) {
    bits = (bits ^ (bits >> 30U)) * 0xBF58476D1CE4E5B9U;
    bits = (bits ^ (bits >> 27U)) * 0x94D049BB133111EBU;
    return bits ^ (bits >> 31U);
}

}  // namespace simulator

#endif
