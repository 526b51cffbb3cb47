// DeviceProfile: what a simulated device has, and which of its calls, frames, counters and reports are
// wrong. One made by default is a device without faults.
#ifndef ZR_DEVICES_SIMULATOR_PROFILE_DEVICE_PROFILE_H
#define ZR_DEVICES_SIMULATOR_PROFILE_DEVICE_PROFILE_H

#include <string>

#include "devices/simulator/profile/capture_profile.h"
#include "devices/simulator/profile/display_profile.h"
#include "devices/simulator/profile/hid_profile.h"
#include "devices/simulator/profile/meterix_profile.h"

namespace simulator {

struct DeviceProfile {
    std::string name;     // under which the device is chosen
    std::string summary;  // one line
    CaptureProfile capture = healthyCapture();
    MeterixProfile meterix = healthyMeterix();
    HidProfile hid = healthyHid();
    DisplayProfile display = {};
};

}  // namespace simulator

#endif
