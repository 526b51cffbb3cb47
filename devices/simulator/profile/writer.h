// Device profiles as text.
#ifndef ZR_DEVICES_SIMULATOR_PROFILE_WRITER_H
#define ZR_DEVICES_SIMULATOR_PROFILE_WRITER_H

#include <string>

#include "devices/simulator/profile/device_profile.h"

namespace simulator {

// A JSON document with every key, defaults included, that describes the device on its own: it extends
// null. Read back it gives the same device, but for its name.
std::string profileText(const DeviceProfile& device);

}  // namespace simulator

#endif
