#include "devices/simulator/kind.h"

#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "devices/simulator/device.h"
#include "devices/simulator/profile/profile_faults.h"
#include "devices/simulator/profile/reader.h"
#include "devices/simulator/profile/writer.h"

namespace simulator {

namespace {

std::vector<devices::Entry> listGallery() {
    std::vector<devices::Entry> entries;
    for (GalleryEntry& entry : gallery()) {
        entries.push_back({std::move(entry.name), std::move(entry.summary)});
    }
    return entries;
}

// The usual device when nothing is asked for.
std::optional<DeviceProfile> load(const std::string& what, std::vector<std::string>& problems) {
    return loadProfile(what.empty() ? "healthy" : what, problems);
}

DeviceProfile loadOrThrow(const std::string& what) {
    std::vector<std::string> problems;
    std::optional<DeviceProfile> profile = load(what, problems);
    if (!profile.has_value()) {
        throw std::invalid_argument(problems.front());
    }
    return *std::move(profile);
}

devices::Device deviceOf(const DeviceProfile& profile, double speed) {
    return {.name = profile.name,
            .summary = profile.summary,
            .facts = {{"platform", "simulated device"}},
            .services = makeDevice(profile, speed)};
}

devices::Device openProfile(const devices::Request& request) {
    return deviceOf(loadOrThrow(request.what), request.speed);
}

std::vector<devices::DataFault> listFaults(const std::string& what) {
    const auto profile = std::make_shared<const DeviceProfile>(loadOrThrow(what));
    std::vector<devices::DataFault> faults;
    for (const ProfileFault& fault : profileFaults(*profile)) {
        faults.push_back({.group = std::string(fault.group),
                          .kind = std::string(fault.kind),
                          .subject = fault.subject,
                          .service = std::string(fault.service),
                          .open = [profile, fault](double speed) {
                              return deviceOf(withFault(*profile, fault), speed);
                          }});
    }
    return faults;
}

std::string showProfile(const std::string& what) {
    return profileText(loadOrThrow(what));
}

devices::Findings checkProfile(const std::string& what) {
    devices::Findings findings;
    load(what, findings.problems);
    return findings;
}

}  // namespace

devices::Kind kind() {
    return {.name = "simulator",
            .summary = "Simulated devices: a gallery of profiles, or a profile's file",
            .takesSpeed = true,
            .hasFaults = true,
            .list = listGallery,
            .open = openProfile,
            .show = showProfile,
            .check = checkProfile,
            .dataFaults = listFaults};
}

}  // namespace simulator
