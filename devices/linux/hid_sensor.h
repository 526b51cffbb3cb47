// HID devices behind hidraw nodes.
#ifndef ZR_DEVICES_LINUX_HID_SENSOR_H
#define ZR_DEVICES_LINUX_HID_SENSOR_H

#include <memory>
#include <vector>

#include "devices/linux/description.h"
#include "devices/linux/hid_nodes.h"
#include "devices/linux/machine.h"
#include "platform/welkin/hid.h"

namespace linux_device {

// The facility of the nodes that match the descriptions. A manager looks for them anew each time that it is asked to.
//
// A device reads its node on a thread of its own while it is scheduled, and delivers one report per turn of the run
// loop. With ReportDelivery::kMostWaiting reports waiting it reads no more; the kernel keeps 63 others and drops what comes then.
// A node that fails or is unplugged is delivered as an error that names it, and the device leaves the run loop.
// A feature report waits until the device has answered: the kernel gives it five seconds.
std::shared_ptr<platform::HidFacility> makeHidFacility(std::vector<HidDescription> described,
                                                       const Machine& machine);

// The device behind one node; `path` stands where the machine has it.
std::shared_ptr<WLIOHIDDeviceInterface> makeHidDevice(const HidNode& node, const Machine& machine);

}  // namespace linux_device

#endif
