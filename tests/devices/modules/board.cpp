// A device module in order: a board without services, in two revisions.
#include <stdexcept>

#include "devices/device.h"

namespace {

devices::Device openBoard(const devices::Request& request) {
    if (request.what == "rev-z") {
        throw std::runtime_error("board rev-z: not connected");
    }
    return {.name = "board " + request.what,
            .summary = "A board without services",
            .facts = {{"platform", "test board"}, {"serial number", "B-7"}}};
}

[[gnu::constructor]] void registerKind() {
    devices::registerKind({.name = "board",
                           .summary = "Boards without services",
                           .list =
                               [] {
                                   return std::vector<devices::Entry>{{"rev-a", "first"}};
                               },
                           .open = openBoard});
}

}  // namespace
