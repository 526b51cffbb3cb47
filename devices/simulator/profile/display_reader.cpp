// The display of a device profile.
#include "devices/simulator/profile/part_readers.h"
#include "devices/simulator/profile/value_readers.h"

namespace simulator {

namespace {

constexpr JsonKey<DisplayProfile> kDisplayKeys[] = {
    {"mainDisplayStatus", readMember<&DisplayProfile::mainDisplayStatus>},
    {"registryService", readMember<&DisplayProfile::registryService>},
    {"property", readMember<&DisplayProfile::property>},
    {"powerInfo", readMember<&DisplayProfile::powerInfo>},
    {"powerPanel", readMember<&DisplayProfile::powerPanel>},
    {"powered", readMember<&DisplayProfile::powered>},
};

}  // namespace

void readDisplay(const JsonNode& node, DisplayProfile& display) {
    readObject(node, kDisplayKeys, display);
}

}  // namespace simulator
