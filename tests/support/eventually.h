// Waits for what comes true on another thread.
#ifndef ZR_TESTS_SUPPORT_EVENTUALLY_H
#define ZR_TESTS_SUPPORT_EVENTUALLY_H

#include <chrono>
#include <functional>
#include <thread>

#include "platform/deadline.h"

namespace test {

// Whether `condition` comes true in a generous time.
inline bool eventually(const std::function<bool()>& condition) {
    const auto deadline = platform::deadlineAfter(std::chrono::seconds(60));
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
