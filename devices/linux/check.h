// What a port description stands for on a machine: every node, control, file and channel that it names.
#ifndef ZR_DEVICES_LINUX_CHECK_H
#define ZR_DEVICES_LINUX_CHECK_H

#include "devices/device.h"
#include "devices/linux/description.h"
#include "devices/linux/machine.h"

namespace linux_device {

// Looks for each, with its value now and who may use it. A camera that is there streams for a moment, and is set up
// for that as for a run.
devices::Findings checkMachine(const Description& description, const Machine& machine);

}  // namespace linux_device

#endif
