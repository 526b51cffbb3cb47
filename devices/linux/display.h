// The display behind a connector of the graphics driver.
#ifndef ZR_DEVICES_LINUX_DISPLAY_H
#define ZR_DEVICES_LINUX_DISPLAY_H

#include <memory>
#include <string>

#include "devices/linux/description.h"
#include "devices/linux/machine.h"
#include "platform/display.h"

namespace linux_device {

// The main display is the described connector: while its folder is there, it has a registry object. Its panel has
// power when all described files of the folder have the content that they should have; while one of them cannot be
// read, the power state is absent. Each call looks anew. The status of mainDisplay() is an errno.
std::shared_ptr<platform::DisplayService> makeDisplayService(const DisplayDescription& display,
                                                             const Machine& machine);
std::shared_ptr<platform::DeviceRegistry> makeDeviceRegistry(const DisplayDescription& display,
                                                             const Machine& machine);

// The folder of the connector. Throws a SystemProblem.
std::string connectorFolder(const DisplayDescription& display, const Machine& machine);

}  // namespace linux_device

#endif
