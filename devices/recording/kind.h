// Recordings as a kind of device, and what a session wants to know of one beforehand.
#ifndef ZR_DEVICES_RECORDING_KIND_H
#define ZR_DEVICES_RECORDING_KIND_H

#include "devices/device.h"
#include "devices/recording/recording.h"

namespace recording {

inline constexpr std::string_view kReplayKind = "replay";

// "replay". A device is asked for by the file of a recording. A call that was not recorded fails with an error of
// kReplayErrorDomain. The speed divides the times of deliveries.
devices::Kind kind();

// The services that a device has, by their names in platform::Services.
std::vector<std::string> serviceNames(const platform::Services& services);

}  // namespace recording

#endif
