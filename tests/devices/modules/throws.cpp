// A device module whose initializer fails. ZR_TEST_THROWS in the environment: with an exception that is a number.
#include <cstdlib>
#include <stdexcept>

namespace {

[[gnu::constructor]] void registerKind() {
    if (std::getenv("ZR_TEST_THROWS") != nullptr) {
        throw 5;
    }
    throw std::runtime_error("no driver for the board");
}

}  // namespace
