// The simulated device behind every interface of the operating system and the support library.
//
// A device is data: its profile says what it has and which of its calls, frames, counters and
// reports are wrong. A profile made by default is a device without faults.
#ifndef ZR_DEVICES_SIMULATOR_DEVICE_H
#define ZR_DEVICES_SIMULATOR_DEVICE_H

#include <memory>

#include "devices/observed/observer.h"
#include "devices/simulator/profile/device_profile.h"
#include "platform/services.h"

namespace simulator {

// A device of that profile, as the services to install. It lives as long as somebody holds one of
// its services, streams or sensors, and keeps its state (counters, snapshots taken) from run to run.
// `speed`: device time a second of real time; 1 is real time, 0 as fast as frames are taken. The
// observer is told what happens as long as it lives.
platform::Services makeDevice(const DeviceProfile& profile,
                              double speed,
                              const std::weak_ptr<observed::Observer>& observer);

}  // namespace simulator

#endif
