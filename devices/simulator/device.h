// The simulated device behind every interface of the operating system and the support library.
//
// A device is data: its profile says what it has and which of its calls, frames, counters and
// reports are wrong. A profile made by default is a device without faults.
#ifndef ZR_DEVICES_SIMULATOR_DEVICE_H
#define ZR_DEVICES_SIMULATOR_DEVICE_H

#include "devices/simulator/profile/device_profile.h"
#include "platform/services.h"

namespace simulator {

// A device of that profile, as the services to install. It lives as long as one of its services,
// streams or sensors is held, and keeps its state (counters, snapshots taken) from run to run.
// `speed`: simulated seconds per real second; 1 is real time, 0 as fast as frames are taken.
platform::Services makeDevice(const DeviceProfile& profile, double speed);

}  // namespace simulator

#endif
