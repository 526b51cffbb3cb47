// A plug-in that registers nothing: what loading a module costs at the least.
#include "frame/host_interface.h"

namespace {

[[gnu::constructor]] void findLab() {
    static_cast<void>(ZRLab::defaultLab());
}

}  // namespace
