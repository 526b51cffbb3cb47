// The kind of devices that are parts of the Linux machine that the program runs on: "linux:FILE.json".
#ifndef ZR_DEVICES_LINUX_KIND_H
#define ZR_DEVICES_LINUX_KIND_H

#include <string>

#include "devices/device.h"
#include "devices/linux/machine.h"

namespace linux_device {

// The name of a device is the path of its port description (description.h).
devices::Kind kind();

// The device of that description on a machine. Throws as Kind::open() does.
devices::Device openDevice(const std::string& path, const Machine& machine);

}  // namespace linux_device

#endif
