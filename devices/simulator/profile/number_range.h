// NumberRange: which frames or reports something applies to.
#ifndef ZR_DEVICES_SIMULATOR_PROFILE_NUMBER_RANGE_H
#define ZR_DEVICES_SIMULATOR_PROFILE_NUMBER_RANGE_H

#include <cstdint>
#include <limits>

namespace simulator {

// Numbers from 1, both ends included; all of them when made by default.
struct NumberRange {
    std::uint64_t first = 1;
    std::uint64_t last = std::numeric_limits<std::uint64_t>::max();

    bool covers(std::uint64_t number) const { return first <= number && number <= last; }

    friend bool operator==(const NumberRange&, const NumberRange&) = default;
};

}  // namespace simulator

#endif
