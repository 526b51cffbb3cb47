// A device profile as a whole.
#include <algorithm>
#include <cctype>
#include <string>

#include "devices/simulator/profile/parts.h"
#include "devices/simulator/profile/value_forms.h"

namespace simulator {

namespace {

void readSummary(const JsonNode& node, DeviceProfile& device) {
    device.summary = node.asText();
    if (std::any_of(device.summary.begin(), device.summary.end(),
                    [](unsigned char character) { return std::iscntrl(character) != 0; })) {
        node.fail("not one line");
    }
}

// A key whose value is a part.
template <auto Member, auto read, auto write>
constexpr JsonKey<DeviceProfile> partKey(std::string_view name) {
    return {name, [](const JsonNode& node, DeviceProfile& device) { read(node, device.*Member); },
            [](const DeviceProfile& device) { return write(device.*Member); }};
}

constexpr JsonKey<DeviceProfile> kProfileKeys[] = {
    {"$schema", [](const JsonNode& node, DeviceProfile& /*device*/) { node.asText(); },
     [](const DeviceProfile& /*device*/) { return Json(input::kNotWritten); }},
    {"summary", readSummary, [](const DeviceProfile& device) { return jsonOf(device.summary); }},
    // The reader has followed it before. What is written stands on its own.
    {"extends", [](const JsonNode& /*node*/, DeviceProfile& /*device*/) {},
     [](const DeviceProfile& /*device*/) { return Json(); }},
    partKey<&DeviceProfile::capture, readCapture, writeCapture>("capture"),
    partKey<&DeviceProfile::meterix, readCounters, writeCounters>("counters"),
    partKey<&DeviceProfile::hid, readHid, writeHid>("hid"),
    partKey<&DeviceProfile::display, readDisplay, writeDisplay>("display"),
};

}  // namespace

void readProfile(const JsonNode& node, DeviceProfile& device) {
    input::readObject(node, kProfileKeys, device);
}

Json writeProfile(const DeviceProfile& device) {
    return input::writeObject(kProfileKeys, device);
}

}  // namespace simulator
