// The steady clock of a fuzz target that links clock.cpp: it stands still until it is set. What waits for
// real must not be used with it.
#ifndef ZR_FUZZ_CLOCK_H
#define ZR_FUZZ_CLOCK_H

#include <chrono>
#include <cstdint>

namespace fuzz {

using TimePoint = std::chrono::steady_clock::time_point;

void setClock(TimePoint now);

// The same in seconds.
inline void setNow(double seconds) {
    setClock(TimePoint(std::chrono::nanoseconds(static_cast<std::int64_t>(seconds * 1e9))));
}
inline double now() {
    return std::chrono::duration<double>(std::chrono::steady_clock::now().time_since_epoch())
        .count();
}

}  // namespace fuzz

#endif
