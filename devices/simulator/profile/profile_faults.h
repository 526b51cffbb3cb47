// What a simulated device can deliver wrongly, one fault at a time: each a change of the device's profile.
//
// The faults are derived from the keys that a profile has: a test names each key that no fault changes, and why.
// A call that fails is not among them: any device's calls can be made to fail, see devices/faulty.
#ifndef ZR_DEVICES_SIMULATOR_PROFILE_PROFILE_FAULTS_H
#define ZR_DEVICES_SIMULATOR_PROFILE_PROFILE_FAULTS_H

#include <string>
#include <string_view>
#include <vector>

#include "devices/simulator/profile/device_profile.h"

namespace simulator {

struct ProfileFault {
    std::string_view group;    // "frame metadata"
    std::string_view kind;     // "missing in every frame"
    std::string subject;       // "HardwareEvents"; the three together are unique
    std::string_view service;  // the member of platform::Services that shows it; empty: several do
    // A profile's keys, in JSON, that make the fault when they are read over the device.
    std::string change;
};

// The faults of a device that has none, those of a group one after the other. What the device does not have, or
// has wrong already, is left out.
std::vector<ProfileFault> profileFaults(const DeviceProfile& device);

// The device with the fault.
DeviceProfile withFault(DeviceProfile device, const ProfileFault& fault);

}  // namespace simulator

#endif
