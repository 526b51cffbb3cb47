// A device module that was built against another version of the interface.
#include "devices/device.h"

namespace {

[[gnu::constructor]] void registerKind() {
    devices::detail::registerKind(devices::kInterfaceVersion + 1,
                                  {.name = "future", .summary = "Built later"});
}

}  // namespace
