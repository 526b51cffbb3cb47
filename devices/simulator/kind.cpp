#include "devices/simulator/kind.h"

#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "devices/simulator/device.h"
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

devices::Device openProfile(const devices::Request& request) {
    const DeviceProfile profile = loadOrThrow(request.what);
    return {.name = profile.name,
            .summary = profile.summary,
            .facts = {{"platform", "simulated device"}},
            .services = makeDevice(profile, request.speed)};
}

std::string showProfile(const std::string& what) {
    return profileText(loadOrThrow(what));
}

std::vector<std::string> checkProfile(const std::string& what) {
    std::vector<std::string> problems;
    load(what, problems);
    return problems;
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
            .check = checkProfile};
}

}  // namespace simulator
