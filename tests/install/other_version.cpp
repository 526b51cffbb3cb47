// A device module built for the next version of the device interface.
#include "devices/device.h"

namespace {

[[gnu::constructor]] void registerKind() {
    devices::detail::registerKind(
        devices::kInterfaceVersion + 1,
        {.name = "other-version", .summary = "", .open = [](const devices::Request&) {
             return devices::Device();
         }});
}

}  // namespace
