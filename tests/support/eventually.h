// Waits for what other threads bring about.
#ifndef ZR_TESTS_SUPPORT_EVENTUALLY_H
#define ZR_TESTS_SUPPORT_EVENTUALLY_H

#include <chrono>
#include <thread>

namespace test {

// What a test waits for comes long before this, on any machine.
inline constexpr std::chrono::seconds kGenerous{60};

// Whether `condition` comes true in a generous time.
template <class Condition>
bool eventually(const Condition& condition) {
    const auto deadline = std::chrono::steady_clock::now() + kGenerous;
    while (!condition()) {
        if (std::chrono::steady_clock::now() >= deadline) {
            return false;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    return true;
}

}  // namespace test

#endif
