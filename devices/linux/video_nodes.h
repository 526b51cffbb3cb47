// The camera nodes of the machine.
#ifndef ZR_DEVICES_LINUX_VIDEO_NODES_H
#define ZR_DEVICES_LINUX_VIDEO_NODES_H

#include <cstdint>
#include <string>
#include <vector>

#include "devices/linux/description.h"
#include "devices/linux/machine.h"

namespace linux_device {

struct VideoNode {
    std::string path;         // "/dev/video0"
    std::string name = {};    // as the kernel shows it
    unsigned index = 0;       // among the nodes of one camera
    std::string device = {};  // the folder of the device in /sys
    std::string driver = {};
    std::uint16_t vendor = 0;  // of the USB device; 0 for none
    std::uint16_t product = 0;
    std::string serial = {};
};

// All nodes, by number.
std::vector<VideoNode> videoNodes(const Machine& machine);

// Whether the node is what is described; the bus is left out, as only the open node knows it.
bool matches(const VideoNode& node, const VideoMatch& described);

}  // namespace linux_device

#endif
