#include "devices/linux/video_nodes.h"

#include <cstdlib>
#include <filesystem>

namespace linux_device {

namespace {

constexpr std::string_view kFolder = "/sys/class/video4linux";
constexpr int kMostParents = 3;  // a USB interface, its device

std::uint16_t hexadecimal(const std::string& text) {
    return static_cast<std::uint16_t>(std::strtoul(text.c_str(), nullptr, 16));
}

// The identity is that of the USB device that the node's device is a part of.
void readIdentity(const Machine& machine, VideoNode& node) {
    std::filesystem::path folder = node.device;
    for (int parent = 0; parent < kMostParents && node.vendor == 0; ++parent) {
        node.vendor = hexadecimal(machine.line((folder / "idVendor").string()));
        node.product = hexadecimal(machine.line((folder / "idProduct").string()));
        node.serial = machine.line((folder / "serial").string());
        folder = folder.parent_path();
    }
}

}  // namespace

std::vector<VideoNode> videoNodes(const Machine& machine) {
    std::vector<VideoNode> nodes;
    for (const std::string& name : machine.names(kFolder)) {
        const std::string folder = std::string(kFolder) + "/" + name;
        VideoNode node{.path = "/dev/" + name,
                       .name = machine.line(folder + "/name"),
                       .index = static_cast<unsigned>(
                           parseNumber(machine.line(folder + "/index")).as<std::uint32_t>()),
                       .device = machine.target(folder + "/device")};
        node.driver =
            std::filesystem::path(machine.target(folder + "/device/driver")).filename().string();
        readIdentity(machine, node);
        nodes.push_back(std::move(node));
    }
    return nodes;
}

bool matches(const VideoNode& node, const VideoMatch& described) {
    const auto isMeant = [](const std::string& wanted, const std::string& is) {
        return wanted.empty() || wanted == is;
    };
    return isMeant(described.driver, node.driver) && isMeant(described.name, node.name) &&
           described.index.value_or(node.index) == node.index &&
           described.usb.matches(node.vendor, node.product, node.serial);
}

}  // namespace linux_device
