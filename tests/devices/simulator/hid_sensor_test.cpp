// The simulated HID devices: which ones match, when they send and what, and what they refuse.
#include "devices/simulator/hid_sensor.h"

#include <chrono>
#include <cmath>
#include <functional>
#include <limits>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using platform::Dictionary;
using platform::ErrorRef;
using platform::RunLoop;
using platform::RunLoopOutcome;
using simulator::HidDeviceProfile;
using ::testing::ElementsAre;

constexpr std::string_view kMode = platform::kRunLoopDefaultMode;
constexpr double kGenerous = 60;  // seconds
using DeviceRef = std::shared_ptr<WLIOHIDDeviceInterface>;
using Data = std::vector<std::byte>;

std::int32_t word(const Data& data, std::size_t offset) {
    std::uint32_t word = 0;
    for (std::size_t at = 4; at-- > 0;) {
        word = (word << 8) | std::to_integer<std::uint32_t>(data.at(offset + at));
    }
    return static_cast<std::int32_t>(word);
}

class HidSensor : public ::testing::Test {
  protected:
    std::vector<DeviceRef> matching(const std::vector<Dictionary>& dictionaries) {
        const auto manager = simulator::makeHidFacility(hid, speed)->createManager();
        manager->enumerateDevicesMatching(dictionaries);
        return manager->devices();
    }
    // The sensor of the profile, open, its reports going to `arrived` and the loop stopping at the
    // one of that number.
    DeviceRef opened(std::size_t stopAt) {
        hid.devices = {profile};
        const DeviceRef sensor = matching({Dictionary()}).at(0);
        EXPECT_TRUE(sensor->open(nullptr));
        arrived.clear();
        sensor->setInputReportCallback([this, stopAt](std::int64_t id,
                                                      std::span<const std::byte> data,
                                                      const ErrorRef& error) {
            EXPECT_EQ(RunLoop::current(), runLoop);
            arrived.push_back(error != nullptr ? error->localizedDescription()
                              : id != 118      ? "ID " + std::to_string(id)
                                               : std::to_string(data.size()) + " bytes");
            reports.emplace_back(data.begin(), data.end());
            if (arrived.size() == stopAt) {
                runLoop->stop();
            }
        });
        return sensor;
    }
    static bool setMode(WLIOHIDDeviceInterface& sensor, int id, int value) {
        const std::byte data[] = {static_cast<std::byte>(id), static_cast<std::byte>(value)};
        return sensor.setFeatureReportWithID(id, data, nullptr);
    }
    DeviceRef streaming(std::size_t stopAt) {
        const DeviceRef sensor = opened(stopAt);
        EXPECT_TRUE(setMode(*sensor, 171, 1) && setMode(*sensor, 172, 1));
        sensor->scheduleWithRunLoop(runLoop, kMode);
        return sensor;
    }
    RunLoopOutcome run(double seconds = kGenerous) { return runLoop->run(kMode, seconds); }

    simulator::HidProfile hid = simulator::healthyHid();
    HidDeviceProfile profile;
    double speed = 0;
    const std::shared_ptr<RunLoop> runLoop = RunLoop::forThisThread();
    std::vector<std::string> arrived;
    std::vector<Data> reports;
};

TEST_F(HidSensor, IsMatchedByItsUsage) {
    const struct {
        std::vector<Dictionary> dictionaries;
        std::size_t devices;
    } kCases[] = {
        {{}, 0},
        {{{{"PrimaryUsagePage", std::uint16_t{0xFF00}}, {"PrimaryUsage", 36.0}}}, 1},
        {{{{"PrimaryUsagePage", 0xFF00}}, {{"PrimaryUsage", 36}}}, 2},  // each once
        {{{{"PrimaryUsagePage", 1}, {"PrimaryUsage", 36}}}, 0},
        {{{{"PrimaryUsage", "36"}}}, 0},
        {{{{"PrimaryUsage", 36}, {"Color", 1}}}, 0},
    };
    for (const auto& [dictionaries, devices] : kCases) {
        EXPECT_EQ(matching(dictionaries).size(), devices);
    }
}

TEST_F(HidSensor, SendsOnceItIsInItsModesAndScheduled) {
    const struct {
        std::vector<std::pair<int, int>> modes;
        bool sends;
    } kCases[] = {
        {{{171, 1}, {172, 1}}, true}, {{{172, 1}, {171, 1}}, true},  {{{171, 1}, {171, 1}}, false},
        {{{172, 1}}, false},          {{{171, 1}, {172, 0}}, false},
    };
    for (const auto& [modes, sends] : kCases) {
        for (const bool scheduledFirst : {true, false}) {
            const DeviceRef sensor = opened(1);
            if (scheduledFirst) {
                sensor->scheduleWithRunLoop(runLoop, kMode);
            }
            for (const auto& [id, value] : modes) {
                EXPECT_TRUE(setMode(*sensor, id, value));
            }
            if (!scheduledFirst) {
                EXPECT_EQ(run(), RunLoopOutcome::Finished);
                sensor->scheduleWithRunLoop(runLoop, kMode);
            }
            EXPECT_EQ(run(sends ? kGenerous : 0),
                      sends ? RunLoopOutcome::Stopped : RunLoopOutcome::TimedOut);
            sensor->unscheduleFromRunLoop(runLoop, "another mode");
            sensor->unscheduleFromRunLoop(nullptr, kMode);  // for a run loop that is gone
            EXPECT_EQ(run(0), RunLoopOutcome::TimedOut);
            sensor->unscheduleFromRunLoop(runLoop, kMode);
            EXPECT_EQ(run(), RunLoopOutcome::Finished);
            sensor->unscheduleFromRunLoop(nullptr, kMode);  // not scheduled
            sensor->scheduleWithRunLoop(runLoop, kMode);
            EXPECT_TRUE(sensor->close(nullptr));
            EXPECT_FALSE(sensor->close(nullptr));
            EXPECT_EQ(run(), RunLoopOutcome::Finished);
            sensor->scheduleWithRunLoop(runLoop, kMode);
            EXPECT_EQ(run(), RunLoopOutcome::Finished);
        }
    }
}

TEST_F(HidSensor, SendsWhatItsProfileSays) {
    const ErrorRef jam = std::make_shared<const platform::Error>("sensor", 1, "jam");
    const auto drop = [](std::uint64_t first, std::uint64_t last) {
        return simulator::ReportOverride{.reports = {first, last}, .dropped = true};
    };
    constexpr std::uint64_t kEnd = std::numeric_limits<std::uint64_t>::max();
    HidDeviceProfile healthy;
    healthy.unplugAtReport = 4;
    const struct {
        std::function<void(HidDeviceProfile&)> damage;
        std::vector<std::string> expected;
        RunLoopOutcome outcome = RunLoopOutcome::Finished;
    } kCases[] = {
        {[](auto& p) {
             p.overrides = {{.reports = {.last = 1}, .length = 791},
                            {.reports = {.first = 2}, .length = 793},
                            {.reports = {2, 2}, .reportID = 119}};
         },
         {"791 bytes", "ID 119", "793 bytes"}},
        {[&](auto& p) {
             p.overrides = {drop(2, 2), drop(1, 1)};
         },
         {"792 bytes"}},
        {[&](auto& p) {  // an error and the unplugging at the first report that is not dropped
             p.overrides = {drop(2, 3), drop(5, 9)};
             p.errorAtReport = {.report = 3, .error = jam};
             p.unplugAtReport = 6;
         },
         {"792 bytes", "jam"}},
        // For ever silent.
        {[&](auto& p) { p.overrides = {drop(1, kEnd)}; }, {}, RunLoopOutcome::TimedOut},
        {[](auto& p) { p.reportsPerSecond = -1; }, {}, RunLoopOutcome::TimedOut},
    };
    for (const auto& [damage, expected, outcome] : kCases) {
        profile = healthy;
        damage(profile);
        const DeviceRef sensor = streaming(0);
        EXPECT_EQ(run(outcome == RunLoopOutcome::Finished ? kGenerous : 0.01), outcome);
        EXPECT_EQ(arrived, expected);
        if (outcome == RunLoopOutcome::Finished) {
            // Unplugged, it refuses everything.
            sensor->scheduleWithRunLoop(runLoop, kMode);
            EXPECT_FALSE(sensor->open(nullptr) || setMode(*sensor, 171, 1) ||
                         sensor->close(nullptr));
        }
    }
}

TEST_F(HidSensor, SendsScansAtItsPace) {
    profile.reportsPerSecond = 40;
    profile.firstTimestamp = std::numeric_limits<std::uint32_t>::max() - 24;
    speed = 10;
    const auto started = std::chrono::steady_clock::now();
    for (int session = 0; session < 2; ++session) {
        const DeviceRef sensor = streaming(8);
        EXPECT_EQ(run(), RunLoopOutcome::Stopped);
    }
    EXPECT_GE(std::chrono::steady_clock::now() - started, std::chrono::milliseconds(40));
    ASSERT_EQ(reports.size(), 16U);
    for (int at = 0; at < 8; ++at) {
        const Data& report = reports[static_cast<std::size_t>(at)];
        EXPECT_EQ(report, reports[static_cast<std::size_t>(at) + 8]);  // the same in every session
        EXPECT_EQ(word(report, 12), 25 * at - 25);
        // An echo in the middle, and next to nothing at the ends; I and Q share its strength.
        double middle = 0;
        double ends = 0;
        for (std::size_t k = 0; k < 48; ++k) {
            const double strength = std::hypot(word(report, 16 + 4 * k), word(report, 208 + 4 * k));
            middle += k >= 14 && k < 26 ? strength / 12 : 0;
            ends += k < 2 || k > 40 ? strength / 9 : 0;
        }
        EXPECT_GT(middle, 0.7 * profile.scan.amplitude);
        EXPECT_LT(ends, 0.1 * profile.scan.amplitude);
    }
    EXPECT_NE(word(reports[0], 16), word(reports[1], 16));  // noise

    // Values and times beyond what the record and the clock can hold.
    profile.scan = {.amplitude = 1e300, .width = 0};
    profile.reportsPerSecond = 1e-300;
    const DeviceRef never = streaming(1);
    EXPECT_EQ(run(0), RunLoopOutcome::TimedOut);
    EXPECT_TRUE(never->close(nullptr));
}

// A callback may close the device, remove itself or drop the device.
TEST_F(HidSensor, MayBeChangedInsideItsCallback) {
    DeviceRef sensor;
    const std::pair<std::function<void()>, RunLoopOutcome> kChanges[] = {
        {[&] { sensor->close(nullptr); }, RunLoopOutcome::Finished},
        {[&] {
             sensor->setInputReportCallback({});
             runLoop->stop();
         },
         RunLoopOutcome::Stopped},
        {[&] { sensor = nullptr; }, RunLoopOutcome::Finished},
    };
    for (const auto& change : kChanges) {
        sensor = streaming(0);
        std::vector<int> calls;
        sensor->setInputReportCallback(
            [&, token = std::make_shared<int>(7)](auto, auto, const auto&) {
                change.first();
                calls.push_back(*token);  // still there
            });
        EXPECT_EQ(run(), change.second);
        EXPECT_THAT(calls, ElementsAre(7));
    }
}

// At any moment of the delivery: the run loop loses its source.
TEST_F(HidSensor, MayBeDroppedOnAnyThread) {
    for (int round = 0; round < 50; ++round) {
        DeviceRef sensor = streaming(0);
        std::thread other([last = std::move(sensor)]() mutable { last = nullptr; });
        EXPECT_EQ(run(), RunLoopOutcome::Finished);
        other.join();
    }
}

}  // namespace
