// What the device says of trouble that no caller asked about, in the log of the run.
#ifndef ZR_DEVICES_LINUX_DEVICE_LOG_H
#define ZR_DEVICES_LINUX_DEVICE_LOG_H

#include <string_view>

#include "platform/log.h"

namespace linux_device {

// Any thread.
inline void logProblem(std::string_view text) {
    platform::Log("zrlab", "linux").write(platform::LogLevel::Error, [text] { return text; });
}

}  // namespace linux_device

#endif
