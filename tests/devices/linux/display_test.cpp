#include "devices/linux/display.h"

#include <cerrno>

#include <gtest/gtest.h>

#include "tests/devices/linux/machine_in_folder.h"

namespace {

constexpr std::string_view kFolder = "/sys/class/drm/card1-Virtual-1";

TEST(Display, IsPoweredWhileItsFilesSaySo) {
    const test::MachineInFolder files;
    const linux_device::DisplayDescription described{.connector = "card*-Virtual-1"};
    const auto displays = makeDisplayService(described, files.machine());
    const auto registry = makeDeviceRegistry(described, files.machine());
    platform::DisplayId display = 77;
    EXPECT_EQ(displays->mainDisplay(display), ENOENT);
    EXPECT_EQ(display, 77U);

    const auto power = [&] {
        const platform::Value property =
            registry->property(displays->registryObject(display), platform::kDisplayDebugInfo);
        return property[platform::kDisplayPowerInfo][platform::kDisplayPowerInfoPanel]
            .asNumber()
            .text();
    };
    const auto write = [&](std::string_view file, std::string_view content) {
        files.write(std::string(kFolder) + "/" + std::string(file), content);
    };
    write("status", "connected\n");
    ASSERT_EQ(displays->mainDisplay(display), 0);
    EXPECT_EQ(power(), "(null)");  // the other files cannot be read
    write("enabled", "enabled\n");
    write("dpms", "On\n");
    EXPECT_EQ(power(), "1");
    write("dpms", "Off\n");
    EXPECT_EQ(power(), "0");

    files.remove(kFolder);
    EXPECT_EQ(displays->registryObject(display), 0U);
    EXPECT_FALSE(registry->property(1, platform::kDisplayDebugInfo).isPresent());
}

}  // namespace
