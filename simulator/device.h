// The simulated device behind every interface of the operating system and the support library.
//
// A device is data: its profile says what it has and which of its calls, frames, counters and
// reports are wrong. A profile made by default is a device without faults.
#ifndef ZR_SIMULATOR_DEVICE_H
#define ZR_SIMULATOR_DEVICE_H

#include <memory>
#include <string>

#include "platform/services.h"
#include "simulator/capture_service.h"
#include "simulator/display_service.h"
#include "simulator/hid_sensor.h"
#include "simulator/meterix_facility.h"
#include "simulator/observer.h"

namespace simulator {

struct DeviceProfile {
    std::string name;     // under which the device is chosen
    std::string summary;  // one line
    CaptureProfile capture = healthyCapture();
    MeterixProfile meterix = healthyMeterix();
    HidProfile hid = healthyHid();
    DisplayProfile display = healthyDisplay();
};

// A device of that profile, as the services to install. It lives as long as somebody holds one of
// its services, streams or sensors, and keeps its state (counters, snapshots taken) from run to run.
// `speed`: device time a second of real time; 1 is real time, 0 as fast as frames are taken. The
// observer is told what happens as long as it lives.
platform::Services makeDevice(const DeviceProfile& profile,
                              double speed,
                              const std::weak_ptr<Observer>& observer);

}  // namespace simulator

#endif
