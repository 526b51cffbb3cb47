#include "fuzz/clock.h"

namespace {

fuzz::TimePoint current;

}  // namespace

void fuzz::setClock(TimePoint now) {
    current = now;
}

// The program's own definition goes before the standard library's, for all of the process.
std::chrono::steady_clock::time_point std::chrono::_V2::steady_clock::now() noexcept {
    return current;
}
