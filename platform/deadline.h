// When a wait ends, on the clock of all waits.
#ifndef ZR_PLATFORM_DEADLINE_H
#define ZR_PLATFORM_DEADLINE_H

#include <chrono>

#include "platform/number.h"

namespace platform {

// Now plus `delay` in whole nanoseconds, truncated toward zero; in the past when the delay is
// negative, now when it is NaN. A moment beyond the clock's end is the clock's last time point, which
// Condition::waitUntil takes as no limit.
inline std::chrono::steady_clock::time_point deadlineAfter(std::chrono::duration<double> delay) {
    using TimePoint = std::chrono::steady_clock::time_point;
    const std::chrono::nanoseconds whole(Number(delay.count() * 1e9).as<std::int64_t>());
    const TimePoint now = std::chrono::steady_clock::now();
    return whole < TimePoint::max() - now ? now + whole : TimePoint::max();
}

}  // namespace platform

#endif
