// When a simulated device does something, on the clock of the computer that it runs on.
#ifndef ZR_DEVICES_SIMULATOR_DUE_TIME_H
#define ZR_DEVICES_SIMULATOR_DUE_TIME_H

#include <chrono>
#include <cmath>
#include <cstdint>

#include "platform/number.h"

namespace simulator {

// The moment `seconds` of device time after `started`. `speed`: simulated seconds per real second; 0,
// infinity and NaN mean at once. A moment beyond the clock's end is its last time point: never.
inline std::chrono::steady_clock::time_point dueTime(std::chrono::steady_clock::time_point started,
                                                     double seconds,
                                                     double speed) {
    using TimePoint = std::chrono::steady_clock::time_point;
    if (!(speed > 0) || std::isinf(speed)) {
        return started;
    }
    const std::chrono::nanoseconds delay(
        platform::Number(seconds / speed * 1e9).as<std::int64_t>());
    return delay < TimePoint::max() - started ? started + delay : TimePoint::max();
}

}  // namespace simulator

#endif
