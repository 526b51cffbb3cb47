#include "devices/linux/hid_nodes.h"

#include <algorithm>
#include <cstdlib>
#include <map>
#include <sstream>

#include "devices/linux/device_log.h"
#include "devices/linux/system_problem.h"

namespace linux_device {

namespace {

constexpr std::string_view kFolder = "/sys/class/hidraw";

// The lines "KEY=value" of a uevent file.
std::map<std::string, std::string> variablesIn(const std::string& text) {
    std::map<std::string, std::string> variables;
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line);) {
        const std::size_t end = line.find('=');
        if (end != std::string::npos) {
            variables.emplace(line.substr(0, end), line.substr(end + 1));
        }
    }
    return variables;
}

HidNode readNode(const Machine& machine, const std::string& name) {
    const std::string device = std::string(kFolder) + "/" + name + "/device";
    HidNode node{.path = "/dev/" + name};
    auto variables = variablesIn(machine.read(device + "/uevent"));
    node.serial = variables["HID_UNIQ"];
    node.name = variables["HID_NAME"];
    // "0003:00001234:00005678"
    std::istringstream id(variables["HID_ID"]);
    for (std::uint16_t* const part : {&node.bus, &node.vendor, &node.product}) {
        std::string digits;
        std::getline(id, digits, ':');
        *part = static_cast<std::uint16_t>(std::strtoul(digits.c_str(), nullptr, 16));
    }
    const std::string descriptor = machine.read(device + "/report_descriptor");
    const std::vector<std::uint8_t> bytes(descriptor.begin(), descriptor.end());
    node.descriptor = parseReportDescriptor(bytes);
    return node;
}

}  // namespace

bool matches(const HidNode& node, const HidDescription& described) {
    return described.bus.value_or(node.bus) == node.bus &&
           described.identity.matches(node.vendor, node.product, node.serial);
}

std::vector<HidNode> findHidNodes(const Machine& machine,
                                  const std::vector<HidDescription>& described) {
    std::vector<HidNode> nodes;
    for (const std::string& name : machine.names(kFolder)) {
        try {
            HidNode node = readNode(machine, name);
            if (described.empty() ||
                std::any_of(described.begin(), described.end(),
                            [&](const HidDescription& each) { return matches(node, each); })) {
                nodes.push_back(std::move(node));
            }
        } catch (const SystemProblem& problem) {
            // It may have gone since its name was read.
            logProblem(std::string("hid: ") + problem.what());
        }
    }
    return nodes;
}

}  // namespace linux_device
