#include "devices/simulator/kind.h"

#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "devices/simulator/device.h"
#include "devices/simulator/profile/reader.h"

namespace simulator {

namespace {

std::vector<devices::Entry> listGallery() {
    std::vector<devices::Entry> entries;
    for (GalleryEntry& entry : gallery()) {
        entries.push_back({std::move(entry.name), std::move(entry.summary)});
    }
    return entries;
}

devices::Device openProfile(const devices::Request& request) {
    std::string problem;
    const std::optional<DeviceProfile> profile =
        loadProfile(request.what.empty() ? "healthy" : request.what, problem);
    if (!profile.has_value()) {
        throw std::invalid_argument(problem);
    }
    return {.name = profile->name,
            .summary = profile->summary,
            .facts = {{"platform", "simulated device"}},
            .services = makeDevice(*profile, request.speed)};
}

}  // namespace

devices::Kind kind() {
    return {.name = "simulator",
            .summary = "Simulated devices: a gallery of profiles, or a profile's file",
            .takesSpeed = true,
            .hasFaults = true,
            .list = listGallery,
            .open = openProfile};
}

}  // namespace simulator
