// When a wait ends, on the clock of all waits.
#ifndef ZR_PLATFORM_DEADLINE_H
#define ZR_PLATFORM_DEADLINE_H

#include <chrono>

namespace platform {

// Now plus `delay`, in the past when the delay is negative. A moment beyond the clock's end is the
// clock's last time point, which Condition::waitUntil takes as no limit.
inline std::chrono::steady_clock::time_point deadlineAfter(std::chrono::nanoseconds delay) {
    using TimePoint = std::chrono::steady_clock::time_point;
    const TimePoint now = std::chrono::steady_clock::now();
    return delay < TimePoint::max() - now ? now + delay : TimePoint::max();
}

}  // namespace platform

#endif
