// The cameras of a port description.
#ifndef ZR_DEVICES_LINUX_DESCRIPTION_CAMERA_H
#define ZR_DEVICES_LINUX_DESCRIPTION_CAMERA_H

#include <string>

#include "devices/linux/description_keys.h"

namespace linux_device {

StreamDescription streamOf(const Node& node, const std::string& name);

}  // namespace linux_device

#endif
