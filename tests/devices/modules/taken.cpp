// A device module whose kind has a name that is taken.
#include "devices/device.h"

namespace {

[[gnu::constructor]] void registerKind() {
    devices::registerKind({.name = "simulator",
                           .summary = "Another simulator",
                           .open = [](const devices::Request&) { return devices::Device(); }});
}

}  // namespace
