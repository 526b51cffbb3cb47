// A Kirra sensor without a device behind it: whoever holds it plays the device.
#ifndef ZR_TESTS_SUPPORT_HAND_FED_SENSOR_H
#define ZR_TESTS_SUPPORT_HAND_FED_SENSOR_H

#include <memory>
#include <utility>
#include <vector>

#include "platform/services.h"
#include "platform/welkin/hid.h"

namespace test {

// Takes everything; what is to be reported goes through `callback`.
struct HandFedSensor : WLIOHIDDeviceInterface {
    bool open(platform::ErrorSlot /*error*/) override { return true; }
    void setInputReportCallback(WLHIDInputReportCallback installed) override {
        callback = std::move(installed);
    }
    bool setFeatureReportWithID(std::int64_t /*reportID*/,
                                std::span<const std::byte> /*data*/,
                                platform::ErrorSlot /*error*/) override {
        return true;
    }
    void scheduleWithRunLoop(const std::shared_ptr<platform::RunLoop>& /*runLoop*/,
                             std::string_view /*mode*/) override {}
    void unscheduleFromRunLoop(const std::shared_ptr<platform::RunLoop>& /*runLoop*/,
                               std::string_view /*mode*/) override {}
    bool close(platform::ErrorSlot /*error*/) override { return true; }

    WLHIDInputReportCallback callback;
};

// A bus with that one sensor.
class OneSensorBus final : public platform::HidFacility {
  public:
    explicit OneSensorBus(std::shared_ptr<WLIOHIDDeviceInterface> sensor)
        : _sensor(std::move(sensor)) {}

    std::shared_ptr<WLHIDManager> createManager() override {
        return std::make_shared<Manager>(_sensor);
    }

  private:
    struct Manager final : WLHIDManager {
        explicit Manager(std::shared_ptr<WLIOHIDDeviceInterface> only) : sensor(std::move(only)) {}
        void enumerateDevicesMatching(const std::vector<platform::Dictionary>& /*m*/) override {}
        std::vector<std::shared_ptr<WLIOHIDDeviceInterface>> devices() override { return {sensor}; }
        std::shared_ptr<WLIOHIDDeviceInterface> sensor;
    };

    const std::shared_ptr<WLIOHIDDeviceInterface> _sensor;
};

}  // namespace test

#endif
