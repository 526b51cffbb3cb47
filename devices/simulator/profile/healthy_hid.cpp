// The HID bus of a device without faults.
#include <utility>

#include "devices/simulator/profile/hid_profile.h"

namespace simulator {

namespace {

// A device that no experiment opens.
HidDeviceProfile idleDevice(std::string product, std::int64_t usagePage, std::int64_t usage) {
    HidDeviceProfile device;
    device.product = std::move(product);
    device.usagePage = usagePage;
    device.usage = usage;
    device.needsFeatureReports = false;
    device.reportsPerSecond = 0;
    return device;
}

}  // namespace

HidProfile healthyHid() {
    const HidDeviceProfile sensor;
    return {.managerAvailable = true,
            .devices = {idleDevice("Keyboard", 1, 6),  // on the generic desktop page
                        sensor,
                        // on the sensor's own vendor-defined page
                        idleDevice("Ambient light sensor", sensor.usagePage, 4)}};
}

}  // namespace simulator
