// The steady clock of a fuzz target that links clock.cpp: it stands still until it is set. What waits for
// real must not be used with it.
#ifndef ZR_FUZZ_CLOCK_H
#define ZR_FUZZ_CLOCK_H

#include <chrono>

namespace fuzz {

using TimePoint = std::chrono::steady_clock::time_point;

void setClock(TimePoint now);

inline TimePoint atSecond(double second) {
    return TimePoint(std::chrono::nanoseconds(static_cast<std::int64_t>(second * 1e9)));
}

}  // namespace fuzz

#endif
