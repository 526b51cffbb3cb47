// A Kirra sensor on a run loop: `turn` is called at each turn of the loop that follows a signal of `source`.
#ifndef ZR_FUZZ_LOOP_SENSOR_H
#define ZR_FUZZ_LOOP_SENSOR_H

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <functional>
#include <memory>
#include <vector>

#include "devices/simulator/display_service.h"
#include "kirra/image_record.h"
#include "platform/run_loop.h"
#include "tests/support/hand_fed_sensor.h"

namespace fuzz {

struct LoopSensor final : test::HandFedSensor {
    void scheduleWithRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                             std::string_view mode) override {
        source = std::make_shared<platform::RunLoopSource>([this] { turn(); });
        runLoop->addSource(source, mode);
        source->signal();
    }
    void unscheduleFromRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                               std::string_view mode) override {
        if (source != nullptr) {
            runLoop->removeSource(std::exchange(source, nullptr), mode);
        }
    }
    bool close(platform::ErrorSlot /*error*/) override {
        isClosed = true;
        return true;
    }

    std::function<void()> turn;
    std::shared_ptr<platform::RunLoopSource> source;  // null while it is not scheduled
    bool isClosed = false;
};

// Installs a new one, and a display that is on.
inline std::shared_ptr<LoopSensor> installLoopSensor() {
    auto sensor = std::make_shared<LoopSensor>();
    const simulator::DisplayProfile display;
    platform::installServices({.hid = std::make_shared<test::OneSensorBus>(sensor),
                               .display = simulator::makeDisplayService(display),
                               .registry = simulator::makeDeviceRegistry(display)});
    return sensor;
}

// A report of this length: its ID, then zeros but for the frame's number. No byte more is allocated, so that
// the sanitizer sees a read beyond it.
inline std::vector<std::byte> reportBytes(std::size_t length,
                                          std::uint8_t id,
                                          std::uint32_t frame) {
    std::vector<std::byte> bytes(length);
    const std::byte head[] = {std::byte{id},        {}, {}, {}, std::byte(frame & 0xFF),
                              std::byte(frame >> 8)};
    std::copy_n(head, std::min(length, sizeof head), bytes.begin());
    return bytes;
}

}  // namespace fuzz

#endif
