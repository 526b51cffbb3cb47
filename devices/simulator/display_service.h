// The simulated display framebuffer service and device registry.
#ifndef ZR_DEVICES_SIMULATOR_DISPLAY_SERVICE_H
#define ZR_DEVICES_SIMULATOR_DISPLAY_SERVICE_H

#include <memory>

#include "devices/simulator/profile/display_profile.h"
#include "platform/display.h"

namespace simulator {

std::shared_ptr<platform::DisplayService> makeDisplayService(const DisplayProfile& profile);
std::shared_ptr<platform::DeviceRegistry> makeDeviceRegistry(const DisplayProfile& profile);

}  // namespace simulator

#endif
