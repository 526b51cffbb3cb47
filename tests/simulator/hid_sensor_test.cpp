// The simulated HID devices, as a client sees them: which ones match, when they send and what, what
// they refuse, and what they report as misuse.
#include "simulator/hid_sensor.h"

#include <bit>
#include <chrono>
#include <cmath>
#include <cstdlib>
#include <functional>
#include <limits>
#include <map>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/support/is_error.h"

namespace {

using platform::Dictionary;
using platform::ErrorRef;
using platform::RunLoop;
using platform::RunLoopOutcome;
using simulator::Fault;
using simulator::HidDeviceProfile;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

constexpr std::string_view kMode = platform::kRunLoopDefaultMode;
constexpr double kGenerous = 60;  // seconds
using DeviceRef = std::shared_ptr<WLIOHIDDeviceInterface>;

// A report as it arrived.
struct Arrived {
    std::int64_t id;
    std::vector<std::byte> data;
    ErrorRef error;

    std::uint32_t word(std::size_t offset) const {
        std::uint32_t word = 0;
        for (std::size_t at = 4; at-- > 0;) {
            word = (word << 8) | std::to_integer<std::uint32_t>(data.at(offset + at));
        }
        return word;
    }
    std::int32_t sample(std::size_t offset, std::size_t k) const {
        return static_cast<std::int32_t>(word(offset + 4 * k));
    }
    // "frame 3", "id 119", "791 bytes", "error": what it is.
    std::string text() const {
        if (error != nullptr) {
            return "error";
        }
        if (id != 118) {
            return "id " + std::to_string(id);
        }
        return data.size() < 792 ? std::to_string(data.size()) + " bytes"
                                 : "frame " + std::to_string(word(4));
    }
};

class HidSensor : public ::testing::Test, public simulator::Observer {
  protected:
    ~HidSensor() override { EXPECT_THAT(misuses, IsEmpty()); }

    void misused(std::string_view what) override { misuses.emplace_back(what); }
    void imageDelivered(std::uint64_t number) override { images.push_back(number); }

    std::vector<DeviceRef> matching(const std::vector<Dictionary>& dictionaries) {
        const auto observer = std::shared_ptr<simulator::Observer>(self, this);
        const auto manager = simulator::makeHidFacility(hid, speed, observer)->createManager();
        manager->enumerateDevicesMatching(dictionaries);
        return manager->devices();
    }
    // The sensor of the profile, made anew.
    DeviceRef device() {
        hid.devices = {profile};
        return matching({{{"PrimaryUsage", 36}}}).at(0);
    }
    static bool setMode(WLIOHIDDeviceInterface& sensor,
                        int id,
                        std::vector<std::byte> data,
                        ErrorRef* error = nullptr) {
        data.insert(data.begin(), static_cast<std::byte>(id));
        return sensor.setFeatureReportWithID(id, data, error);
    }
    // A device that was opened, set to its modes and scheduled here; its reports go to `arrived`, and
    // the run loop stops at the report of that number.
    DeviceRef streaming(std::size_t stopAt) {
        DeviceRef sensor = device();
        EXPECT_TRUE(sensor->open(nullptr));
        listen(*sensor, stopAt);
        EXPECT_TRUE(setMode(*sensor, 171, {std::byte{1}}) && setMode(*sensor, 172, {std::byte{1}}));
        sensor->scheduleWithRunLoop(runLoop, kMode);
        return sensor;
    }
    void listen(WLIOHIDDeviceInterface& sensor, std::size_t stopAt) {
        arrived.clear();
        sensor.setInputReportCallback([this, stopAt](std::int64_t id,
                                                     std::span<const std::byte> data,
                                                     const ErrorRef& error) {
            EXPECT_EQ(RunLoop::current(), runLoop);
            arrived.push_back({id, {data.begin(), data.end()}, error});
            if (arrived.size() == stopAt) {
                runLoop->stop();
            }
        });
    }
    // What a sensor sends, up to so many reports or until it is unplugged.
    std::vector<std::string> sent(std::size_t count) {
        const DeviceRef sensor = streaming(count);
        runLoop->run(kMode, kGenerous);
        std::vector<std::string> texts;
        for (const Arrived& report : arrived) {
            texts.push_back(report.text());
        }
        return texts;
    }

    simulator::HidProfile hid = simulator::healthyHid();
    HidDeviceProfile profile;
    double speed = 0;
    const std::shared_ptr<RunLoop> runLoop = RunLoop::forThisThread();
    std::vector<Arrived> arrived;
    std::vector<std::string> misuses;
    std::vector<std::uint64_t> images;

  private:
    const std::shared_ptr<int> self = std::make_shared<int>();  // as long as the test
};

TEST_F(HidSensor, IsMatchedByItsUsage) {
    const struct {
        std::vector<Dictionary> dictionaries;
        std::size_t devices;
    } kCases[] = {
        {{}, 0},
        {{Dictionary()}, 3},  // asks for nothing
        {{{{"PrimaryUsagePage", 0xFF00}, {"PrimaryUsage", 36}}}, 1},
        {{{{"PrimaryUsagePage", std::uint16_t{0xFF00}}, {"PrimaryUsage", 36.0}}}, 1},
        {{{{"PrimaryUsagePage", 0xFF00}}}, 2},
        {{{{"PrimaryUsagePage", 1}, {"PrimaryUsage", 36}}}, 0},
        {{{{"PrimaryUsagePage", 1}}, {{"PrimaryUsage", 6}}}, 1},  // once, though both match
        {{{{"PrimaryUsagePage", 1}}, {{"PrimaryUsage", 36}}}, 2},
        {{{{"PrimaryUsage", "36"}}}, 0},
        {{{{"PrimaryUsage", 36}, {"Color", 1}}}, 0},
    };
    for (const auto& [dictionaries, devices] : kCases) {
        EXPECT_EQ(matching(dictionaries).size(), devices);
    }
    hid.managerAvailable = false;
    EXPECT_EQ(simulator::makeHidFacility(hid, 0, {})->createManager(), nullptr);
}

TEST_F(HidSensor, SendsOnceItIsInItsModesAndScheduled) {
    const std::byte on{1};
    const std::byte off{0};
    const struct {
        std::vector<std::pair<int, std::vector<std::byte>>> features;
        bool needsFeatureReports;
        bool sends;
    } kCases[] = {
        {{{171, {on}}, {172, {on}}}, true, true},
        {{{172, {on}}, {171, {on}}}, true, true},
        {{{172, {on}}}, true, false},
        {{{171, {on}}, {171, {on}}}, true, false},
        {{{171, {on}}, {172, {off}}}, true, false},
        {{{171, {on, on}}, {172, {on}}}, true, false},
        {{}, true, false},
        {{}, false, true},
    };
    for (const auto& [features, needsFeatureReports, sends] : kCases) {
        for (const bool scheduledFirst : {true, false}) {
            profile.needsFeatureReports = needsFeatureReports;
            const DeviceRef sensor = device();
            ASSERT_TRUE(sensor->open(nullptr));
            listen(*sensor, 1);
            if (scheduledFirst) {
                sensor->scheduleWithRunLoop(runLoop, kMode);
            }
            for (const auto& [id, data] : features) {
                EXPECT_TRUE(setMode(*sensor, id, data));
            }
            if (!scheduledFirst) {
                EXPECT_EQ(runLoop->run(kMode, kGenerous), RunLoopOutcome::Finished);
                sensor->scheduleWithRunLoop(runLoop, kMode);
            }
            EXPECT_EQ(runLoop->run(kMode, sends ? kGenerous : 0),
                      sends ? RunLoopOutcome::Stopped : RunLoopOutcome::TimedOut);
        }
    }
}

// From where they were, and only to the run loop that it is scheduled on; anew after an open.
TEST_F(HidSensor, NumbersItsReportsFromEachOpen) {
    const DeviceRef sensor = streaming(2);
    EXPECT_EQ(runLoop->run(kMode, kGenerous), RunLoopOutcome::Stopped);
    sensor->unscheduleFromRunLoop(runLoop, "another mode");
    sensor->unscheduleFromRunLoop(runLoop, kMode);
    EXPECT_EQ(runLoop->run(kMode, kGenerous), RunLoopOutcome::Finished);
    EXPECT_EQ(arrived.size(), 2U);
    sensor->scheduleWithRunLoop(runLoop, kMode);
    listen(*sensor, 1);
    EXPECT_EQ(runLoop->run(kMode, kGenerous), RunLoopOutcome::Stopped);
    EXPECT_GT(arrived[0].word(4), 2U);

    EXPECT_TRUE(sensor->close(nullptr));
    EXPECT_FALSE(sensor->close(nullptr));
    EXPECT_TRUE(sensor->open(nullptr));
    sensor->scheduleWithRunLoop(runLoop, kMode);
    EXPECT_EQ(runLoop->run(kMode, 0), RunLoopOutcome::TimedOut);  // its modes are off again
    EXPECT_THAT(images, ElementsAre(1, 2, 3));
    images.clear();
    EXPECT_THAT(sent(2), ElementsAre("frame 1", "frame 2"));
    EXPECT_THAT(images, ElementsAre(1, 2));
}

TEST_F(HidSensor, SendsWhatItsProfileSays) {
    const ErrorRef reported = std::make_shared<const platform::Error>("sensor", 1, "jammed");
    constexpr std::uint64_t kEnd = std::numeric_limits<std::uint64_t>::max();
    const auto drop = [](std::uint64_t first, std::uint64_t last) {
        return simulator::ReportOverride{.firstReport = first, .lastReport = last, .dropped = true};
    };
    const struct {
        std::function<void(HidDeviceProfile&)> damage;
        std::vector<std::string> expected;
        std::vector<std::uint64_t> images;
    } kCases[] = {
        {[](auto& p) { p.firstFrameId = std::numeric_limits<std::uint32_t>::max(); },
         {"frame 4294967295", "frame 0", "frame 1"},
         {1, 2, 3}},
        {[](auto& p) {
             p.overrides = {{.lastReport = 1, .length = 791},
                            {.firstReport = 2, .length = 793},
                            {.firstReport = 2, .lastReport = 2, .reportID = 119}};
         },
         {"791 bytes", "id 119", "frame 3"},
         {1}},
        {[&](auto& p) {
             p.overrides = {drop(4, 5), drop(1, 2)};
         },
         {"frame 3", "frame 6", "frame 7"},
         {1, 2, 3}},
        {[&](auto& p) {
             p.errorAtReport = {.report = 2, .error = reported};
             p.unplugAtReport = 4;
         },
         {"frame 1", "error", "frame 3"},
         {1, 2}},
        {[&](auto& p) {  // at the first report that is not dropped
             p.overrides = {drop(2, 3), drop(5, 9)};
             p.errorAtReport = {.report = 3, .error = reported};
             p.unplugAtReport = 6;
         },
         {"frame 1", "error"},
         {1}},
        {[&](auto& p) {
             p.maxReports = 2;
             p.unplugAtReport = 2;
         },
         {"frame 1"},
         {1}},
        {[&](auto& p) { p.unplugAtReport = 1; }, {}, {}},
    };
    for (const auto& [damage, expected, expectedImages] : kCases) {
        profile = {};
        damage(profile);
        images.clear();
        EXPECT_EQ(sent(3), expected);
        EXPECT_EQ(images, expectedImages);
    }
    // Silent for ever: scheduled, and nothing comes.
    for (const auto& silence : std::vector<std::function<void(HidDeviceProfile&)>>{
             [&](auto& p) { p.overrides = {drop(1, kEnd)}; }, [](auto& p) { p.maxReports = 0; },
             [](auto& p) { p.reportsPerSecond = 0; }, [](auto& p) { p.reportsPerSecond = -1; }}) {
        profile = {};
        silence(profile);
        const DeviceRef sensor = streaming(1);
        EXPECT_EQ(runLoop->run(kMode, 0.02), RunLoopOutcome::TimedOut);
        EXPECT_THAT(arrived, IsEmpty());
    }
}

TEST_F(HidSensor, SendsScans) {
    profile.reportsPerSecond = 40;
    profile.firstTimestamp = std::numeric_limits<std::uint32_t>::max() - 24;
    profile.startTemperature = 30;
    profile.temperaturePerReport = 0.5;
    sent(3);
    const std::vector<Arrived> first = arrived;
    sent(3);
    ASSERT_EQ(first.size(), 3U);
    for (std::size_t at = 0; at < first.size(); ++at) {
        EXPECT_EQ(first[at].data, arrived[at].data);  // the same in every run
        EXPECT_EQ(std::bit_cast<float>(first[at].word(788)), 30 + 0.5F * static_cast<float>(at));
        EXPECT_EQ(first[at].word(12), 25 * static_cast<std::uint32_t>(at) - 25);
        // An echo in the middle, and next to nothing at the ends; I and Q share its strength.
        double middle = 0;
        double ends = 0;
        for (std::size_t k = 0; k < 48; ++k) {
            const double strength = std::hypot(first[at].sample(16, k), first[at].sample(208, k));
            middle += k >= 14 && k < 26 ? strength / 12 : 0;
            ends += k < 2 || k > 40 ? strength / 9 : 0;
        }
        EXPECT_GT(middle, 0.7 * profile.scan.amplitude);
        EXPECT_LT(ends, 0.1 * profile.scan.amplitude);
    }
    EXPECT_NE(first[0].sample(16, 0), first[1].sample(16, 0));  // noise
    profile.scan = {.amplitude = 1e300, .width = 0};
    EXPECT_THAT(sent(1), ElementsAre("frame 1"));  // saturated
}

TEST_F(HidSensor, KeepsItsPace) {
    profile.reportsPerSecond = 50;
    speed = 10;
    const auto started = std::chrono::steady_clock::now();
    EXPECT_EQ(sent(20).size(), 20U);
    EXPECT_GE(std::chrono::steady_clock::now() - started, std::chrono::milliseconds(40));

    // Slower than the clock can tell: nothing comes, and closing does not wait for it.
    profile.reportsPerSecond = 1e-300;
    const DeviceRef never = streaming(1);
    EXPECT_EQ(runLoop->run(kMode, 0), RunLoopOutcome::TimedOut);
    EXPECT_TRUE(never->close(nullptr));
}

TEST_F(HidSensor, RefusesWhatItsProfileSays) {
    for (const ErrorRef& reported :
         {ErrorRef(), ErrorRef(std::make_shared<const platform::Error>("sensor", 2, "no"))}) {
        profile = {};
        profile.open = Fault::failing(reported);
        ErrorRef error;
        EXPECT_FALSE(device()->open(&error));
        EXPECT_EQ(error, reported);

        profile = {};
        profile.featureReports[172] = profile.close = Fault::failing(reported);
        const DeviceRef sensor = device();
        error = nullptr;
        EXPECT_TRUE(sensor->open(&error) && setMode(*sensor, 171, {std::byte{1}}, &error));
        EXPECT_EQ(error, nullptr);
        EXPECT_FALSE(setMode(*sensor, 172, {std::byte{1}}, &error));
        EXPECT_EQ(error, reported);
        error = nullptr;
        EXPECT_FALSE(sensor->close(&error));
        EXPECT_EQ(error, reported);
    }
    // Unplugged, it refuses everything, and nothing of that is misuse.
    profile = {};
    profile.unplugAtReport = 1;
    const DeviceRef sensor = streaming(1);
    EXPECT_EQ(runLoop->run(kMode, kGenerous), RunLoopOutcome::Finished);
    EXPECT_FALSE(sensor->open(nullptr) || setMode(*sensor, 171, {std::byte{1}}) ||
                 sensor->close(nullptr));
    sensor->scheduleWithRunLoop(runLoop, kMode);
    EXPECT_EQ(runLoop->run(kMode, kGenerous), RunLoopOutcome::Finished);
}

TEST_F(HidSensor, TellsOfMisuse) {
    const DeviceRef sensor = device();
    EXPECT_FALSE(setMode(*sensor, 171, {std::byte{1}}));
    sensor->scheduleWithRunLoop(runLoop, kMode);
    EXPECT_THAT(misuses, ElementsAre("HID device Kirra: sent a feature report while it is not open",
                                     "HID device Kirra: scheduled while it is not open"));
    misuses.clear();
    EXPECT_TRUE(sensor->open(nullptr));
    EXPECT_FALSE(sensor->open(nullptr));
    EXPECT_FALSE(sensor->setFeatureReportWithID(171, {}, nullptr));
    const std::byte other[] = {std::byte{172}, std::byte{1}};
    EXPECT_FALSE(sensor->setFeatureReportWithID(171, other, nullptr));
    EXPECT_THAT(misuses, ElementsAre(HasSubstr("opened while it is open"),
                                     HasSubstr("does not begin with its ID"),
                                     HasSubstr("does not begin with its ID")));
    misuses.clear();
    std::thread([&] { sensor->scheduleWithRunLoop(runLoop, kMode); }).join();
    std::thread([&] {
        const auto itsOwn = RunLoop::forThisThread();
        setMode(*sensor, 171, {std::byte{1}});
        sensor->setInputReportCallback({});
        sensor->unscheduleFromRunLoop(itsOwn, kMode);  // not the one
        sensor->close(nullptr);
    }).join();
    EXPECT_EQ(misuses.size(), 5U);
    EXPECT_THAT(misuses, ::testing::Each(HasSubstr("on another thread than its run loop's")));
    EXPECT_EQ(runLoop->run(kMode, kGenerous), RunLoopOutcome::Finished);
    misuses.clear();
}

// A callback may close the device, replace itself or drop the device; a stop holds the next one back.
TEST_F(HidSensor, MayBeChangedInsideItsCallback) {
    enum { Close, Remove, Drop };
    for (const int change : {Close, Remove, Drop}) {
        DeviceRef sensor = streaming(0);
        std::vector<int> calls;
        sensor->setInputReportCallback(
            [&, token = std::make_shared<int>(7)](auto, auto, const auto&) {
                if (change == Close) {
                    sensor->close(nullptr);
                } else if (change == Remove) {
                    sensor->setInputReportCallback({});
                    runLoop->stop();
                } else {
                    sensor = nullptr;
                }
                calls.push_back(*token);  // still there
            });
        EXPECT_EQ(runLoop->run(kMode, kGenerous),
                  change == Remove ? RunLoopOutcome::Stopped : RunLoopOutcome::Finished);
        EXPECT_THAT(calls, ElementsAre(7));
    }
}

// Dropped on another thread at any moment of the delivery: the run loop loses its source.
TEST_F(HidSensor, MayBeDroppedOnAnyThread) {
    for (std::size_t round = 0; round < 50; ++round) {
        DeviceRef sensor = streaming(0);
        std::thread other([last = std::move(sensor)]() mutable { last = nullptr; });
        EXPECT_EQ(runLoop->run(kMode, kGenerous), RunLoopOutcome::Finished);
        other.join();
    }
}

}  // namespace
