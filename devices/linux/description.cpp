#include "devices/linux/description.h"

#include <linux/input.h>

#include "devices/linux/description_camera.h"
#include "devices/linux/description_keys.h"
#include "devices/linux/description_numbers.h"
#include "input/text_file.h"

namespace linux_device {

namespace {

using input::DocumentProblem;

struct CapturePart {
    std::vector<StreamDescription> streams;
};
constexpr JsonKey<CapturePart> kCaptureKeys[] = {
    key<&CapturePart::streams, namedOf<streamOf>>("streams"),
};

struct CountersPart {
    std::vector<CounterChannel> channels;
};
constexpr JsonKey<CountersPart> kCountersKeys[] = {
    key<&CountersPart::channels, namedOf<channelOf>>("channels"),
};

std::optional<std::uint16_t> busOf(const Node& node) {
    static constexpr std::pair<std::string_view, std::uint16_t> kChoices[] = {
        {"usb", BUS_USB},
        {"bluetooth", BUS_BLUETOOTH},
        {"i2c", BUS_I2C},
        {"spi", BUS_SPI},
        {"virtual", BUS_VIRTUAL}};
    return choiceOf(node, kChoices, "bus");
}

constexpr JsonKey<HidDescription> kHidDeviceKeys[] = {
    key<&HidDescription::bus, busOf>("bus"),
    identityKey<HidDescription, &HidDescription::identity, &UsbIdentity::vendor, identityOf>(
        "vendor"),
    identityKey<HidDescription, &HidDescription::identity, &UsbIdentity::product, identityOf>(
        "product"),
    identityKey<HidDescription, &HidDescription::identity, &UsbIdentity::serial, textOf>("serial"),
    kNote<HidDescription>,
};

HidDescription hidDeviceOf(const Node& node, const std::string& name) {
    HidDescription device = objectOf<kHidDeviceKeys>(node);
    device.name = name;
    return device;
}

struct HidPart {
    std::vector<HidDescription> devices;
};
constexpr JsonKey<HidPart> kHidKeys[] = {
    key<&HidPart::devices, namedOf<hidDeviceOf>>("devices"),
};

std::string connectorOf(const Node& node) {
    std::string connector = textOf(node);
    if (connector.find('/') != std::string::npos) {
        node.fail("not the name of a folder in /sys/class/drm");
    }
    return connector;
}

std::map<std::string, std::string> contentsOf(const Node& node) {
    std::map<std::string, std::string> contents;
    for (const auto& [file, content] : whereOf(node)) {
        contents.emplace(file, content);
    }
    if (contents.empty()) {
        node.fail("empty: it would count as powered always");
    }
    return contents;
}

constexpr JsonKey<DisplayDescription> kDisplayKeys[] = {
    key<&DisplayDescription::connector, connectorOf>("connector"),
    key<&DisplayDescription::on, contentsOf>("on"),
};

std::optional<std::vector<StreamDescription>> captureOf(const Node& node) {
    return objectOf<kCaptureKeys>(node).streams;
}
std::optional<std::vector<CounterChannel>> countersOf(const Node& node) {
    return objectOf<kCountersKeys>(node).channels;
}
std::optional<std::vector<HidDescription>> hidOf(const Node& node) {
    return objectOf<kHidKeys>(node).devices;
}
std::optional<DisplayDescription> displayOf(const Node& node) {
    node.requireKeys({"connector"}, R"(needs "connector")");
    return objectOf<kDisplayKeys>(node);
}

std::string summaryOf(const Node& node) {
    std::string summary = node.asText();
    if (input::oneLine(summary) != summary) {
        node.fail("not one line");
    }
    return summary;
}

constexpr JsonKey<Description> kKeys[] = {
    {"$schema", [](const Node& node, Description& /*description*/) { node.asText(); }},
    key<&Description::summary, summaryOf>("summary"),
    key<&Description::capture, captureOf>("capture"),
    key<&Description::counters, countersOf>("counters"),
    key<&Description::hid, hidOf>("hid"),
    key<&Description::display, displayOf>("display"),
};

}  // namespace

platform::Number Conversion::apply(platform::Number number) const {
    if (!number.isPresent()) {
        return number;
    }
    if (mask.has_value() || shift != 0) {
        number = (number.as<std::uint64_t>() & mask.value_or(~std::uint64_t{0})) >> shift;
    }
    if (scale != 1 || add != 0) {
        number = number.asDouble() * scale + add;
    }
    return number;
}

std::optional<Description> readDescription(const std::string& path,
                                           std::vector<std::string>& problems) {
    std::vector<std::string> found;
    Description description;
    description.path = path;
    std::string prefix;
    try {
        const std::string text = input::readTextFile(path, "a port description");
        prefix = path + ": ";
        const input::Json document = input::parseJson(text);
        input::readObject(Node(document, found), kKeys, description);
    } catch (const DocumentProblem& problem) {
        found.emplace_back(problem.what());
    }
    for (const std::string& problem : found) {
        problems.push_back(input::oneLine(prefix + problem));
    }
    return found.empty() ? std::optional(std::move(description)) : std::nullopt;
}

}  // namespace linux_device
