// The HID devices of the machine, as the hidraw nodes of its kernel.
#ifndef ZR_DEVICES_LINUX_HID_NODES_H
#define ZR_DEVICES_LINUX_HID_NODES_H

#include <cstdint>
#include <string>
#include <vector>

#include "devices/linux/description.h"
#include "devices/linux/machine.h"
#include "devices/linux/report_descriptor.h"

namespace linux_device {

struct HidNode {
    std::string path;  // "/dev/hidraw0"
    std::uint16_t bus = 0;
    std::uint16_t vendor = 0;
    std::uint16_t product = 0;
    std::string serial = {};
    std::string name = {};
    ReportDescriptor descriptor = {};
};

// The nodes that match at least one of the descriptions; all nodes if there are no descriptions.
std::vector<HidNode> findHidNodes(const Machine& machine,
                                  const std::vector<HidDescription>& described);

bool matches(const HidNode& node, const HidDescription& described);

}  // namespace linux_device

#endif
