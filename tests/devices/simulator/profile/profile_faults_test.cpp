// The faults of a simulated device: each changes the device, no two are alike, and no key of a profile is left
// out without a reason.
#include "devices/simulator/profile/profile_faults.h"

#include <algorithm>
#include <fstream>
#include <set>
#include <string>
#include <string_view>
#include <tuple>

#include <gmock/gmock.h>
#include <nlohmann/json.hpp>

#include "devices/simulator/profile/writer.h"

namespace {

using Json = nlohmann::ordered_json;
using simulator::DeviceProfile;
using simulator::ProfileFault;
using ::testing::IsEmpty;

// Keys that no fault changes.
constexpr std::string_view kFaultless[] = {
    // What the profile is.
    "$schema", "summary", "extends",
    // Another device without a fault: other chance, an echo of another shape, a sensor that does not wait.
    "seed", "frequency", "chirp", "turn", "needsFeatureReports",
    // Devices that no experiment opens.
    "Keyboard", "Ambient light sensor",
    // Calls that fail: devices/faulty makes them.
    "faults", "control", "start", "stop", "lightSource", "multipleOutputs", "formatIndex",
    "minimumFrameRate", "maximumFrameRate", "outputConfigurations", "outputsEnabled",
    "autoExposure", "outputHandlers", "device", "invalidate", "report", "firstSnapshot",
    "laterSnapshots", "difference", "open", "close", "featureReports", "underlying"};

void collectKeys(const Json& json, std::set<std::string>& keys) {
    for (const auto& [key, value] : json.items()) {
        if (json.is_object()) {
            keys.insert(key);
        }
        if (json.is_structured()) {
            collectKeys(value, keys);
        }
    }
}

// The names of the keys that the format has.
void collectProperties(const Json& schema, std::set<std::string>& keys) {
    for (const auto& [key, value] : schema.items()) {
        if (key == "properties" && schema.is_object()) {
            for (const auto& property : value.items()) {
                keys.insert(property.key());
            }
        }
        if (value.is_structured()) {
            collectProperties(value, keys);
        }
    }
}

TEST(ProfileFaults, ChangeTheDeviceEachInAWayOfItsOwn) {
    const DeviceProfile healthy;
    std::set<std::string> devices = {simulator::profileText(healthy)};
    std::set<std::tuple<std::string_view, std::string_view, std::string>> names;
    for (const ProfileFault& fault : simulator::profileFaults(healthy)) {
        const std::string name = std::string(fault.kind) + ": " + fault.subject;
        EXPECT_FALSE(fault.subject.empty()) << name;
        EXPECT_TRUE(names.emplace(fault.group, fault.kind, fault.subject).second) << name;
        const std::string text = simulator::profileText(simulator::withFault(healthy, fault));
        EXPECT_TRUE(devices.insert(text).second) << name << ": " << fault.change;
    }
}

TEST(ProfileFaults, LeaveNoKeyOfAProfileOut) {
    std::set<std::string> changed;
    for (const ProfileFault& fault : simulator::profileFaults(DeviceProfile())) {
        collectKeys(Json::parse(fault.change), changed);
    }
    std::set<std::string> left;
    collectProperties(Json::parse(std::ifstream(ZR_PROFILES "/device-profile.schema.json")), left);
    ASSERT_FALSE(left.empty());
    for (const std::string_view key : kFaultless) {
        EXPECT_EQ(left.erase(std::string(key)), 1) << key << " is no key";
    }
    std::erase_if(left, [&](const std::string& key) { return changed.count(key) != 0; });
    EXPECT_THAT(left, IsEmpty());
}

TEST(ProfileFaults, LeaveOutWhatTheDeviceDoesNotHaveAndHasWrongAlready) {
    DeviceProfile device;
    const auto count = [](const DeviceProfile& of, std::string_view group) {
        const auto faults = simulator::profileFaults(of);
        return std::count_if(faults.begin(), faults.end(),
                             [&](const ProfileFault& fault) { return fault.group == group; });
    };
    const auto displays = count(device, "display");
    device.display.powered = false;
    EXPECT_EQ(count(device, "display"), displays - 1);
    device.meterix.channels.clear();
    EXPECT_EQ(count(device, "event counters"), 0);
}

}  // namespace
