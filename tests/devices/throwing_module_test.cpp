// A device module whose initializer throws. In a process of its own, which ends at once: the exception
// leaves the loader's lock held.
#include <cstdio>
#include <cstdlib>
#include <stdexcept>
#include <string>

#include <unistd.h>

#include <gtest/gtest.h>

#include "devices/device.h"

namespace {

[[noreturn]] void loadAndEnd() {
    try {
        devices::loadDeviceModule(std::string(ZR_TEST_MODULES) + "/throws.so");
    } catch (const std::runtime_error& problem) {
        std::fputs(problem.what(), stderr);
        _exit(0);
    }
    _exit(1);
}

TEST(DeviceModuleDeathTest, AnInitializerThatThrowsIsNamed) {
    EXPECT_EXIT(loadAndEnd(), testing::ExitedWithCode(0),
                "throws.so: its initializer failed: no driver for the board");
    setenv("ZR_TEST_THROWS", "number", 1);
    EXPECT_EXIT(loadAndEnd(), testing::ExitedWithCode(0),
                "throws.so: its initializer failed with an exception of an unknown kind");
    unsetenv("ZR_TEST_THROWS");
}

}  // namespace
