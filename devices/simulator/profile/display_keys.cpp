// The display of a device profile.
#include "devices/simulator/profile/parts.h"
#include "devices/simulator/profile/value_forms.h"

namespace simulator {

namespace {

constexpr JsonKey<DisplayProfile> kDisplayKeys[] = {
    memberKey<&DisplayProfile::mainDisplayStatus>("mainDisplayStatus"),
    memberKey<&DisplayProfile::registryService>("registryService"),
    memberKey<&DisplayProfile::property>("property"),
    memberKey<&DisplayProfile::powerInfo>("powerInfo"),
    memberKey<&DisplayProfile::powerPanel>("powerPanel"),
    memberKey<&DisplayProfile::powered>("powered"),
};

}  // namespace

void readDisplay(const JsonNode& node, DisplayProfile& display) {
    input::readObject(node, kDisplayKeys, display);
}

input::Json writeDisplay(const DisplayProfile& display) {
    return input::writeObject(kDisplayKeys, display);
}

}  // namespace simulator
