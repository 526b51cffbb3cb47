// A device module whose initializer fails.
#include <stdexcept>

namespace {

[[gnu::constructor]] void registerKind() {
    throw std::runtime_error("no driver for the board");
}

}  // namespace
