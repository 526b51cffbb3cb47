// A device module whose device has faults of its own: one that the counters show, one that ends the process.
#include <cstdlib>

#include "devices/device.h"
#include "devices/simulator/device.h"

namespace {

devices::Device openFragile(const devices::Request& request) {
    return {.name = "fragile",
            .summary = "A device that can end the process",
            .services = simulator::makeDevice({}, request.speed)};
}

std::vector<devices::DataFault> listFaults(const std::string& /*what*/) {
    const auto stuck = [](double speed) {
        simulator::DeviceProfile profile;
        for (auto& channel : profile.meterix.channels) {
            channel.count = 1;
        }
        return devices::Device{.name = "stuck",
                               .summary = "Counters at 1",
                               .services = simulator::makeDevice(profile, speed)};
    };
    const auto crash = [](double /*speed*/) -> devices::Device { std::abort(); };
    return {{"board", "stuck", "counters", "meterix", stuck},
            {"board", "crashes", "driver", "meterix", crash}};
}

[[gnu::constructor]] void registerKind() {
    devices::registerKind({.name = "fragile",
                           .summary = "Devices that can end the process",
                           .takesSpeed = true,
                           .open = openFragile,
                           .dataFaults = listFaults});
}

}  // namespace
