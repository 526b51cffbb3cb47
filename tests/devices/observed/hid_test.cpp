// The observed HID bus: what reaches the observer, and which rules are watched.
#include "devices/observed/hid.h"

#include <functional>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "devices/simulator/hid_sensor.h"
#include "platform/run_loop.h"
#include "tests/support/hand_fed_sensor.h"

namespace {

using platform::RunLoop;
using platform::RunLoopOutcome;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr std::string_view kMode = platform::kRunLoopDefaultMode;
using DeviceRef = std::shared_ptr<WLIOHIDDeviceInterface>;

struct Journal final : observed::Observer {
    void imageDelivered(std::uint64_t number) override {
        lines.push_back("image " + std::to_string(number));
    }
    void errorReported(std::string_view call, const platform::ErrorRef& error) override {
        lines.push_back(std::string(call) + ": " + error->localizedDescription());
    }
    void misused(std::string_view what) override { lines.emplace_back(what); }
    std::vector<std::string> lines;
};

const auto kIgnoreReports =
    [](std::int64_t, std::span<const std::byte>, const platform::ErrorRef&) {};

class ObservedHid : public ::testing::Test {
  protected:
    DeviceRef firstOn(std::shared_ptr<platform::HidFacility> bus) {
        manager =
            observed::observeHid(std::move(bus), observed::Reporter(journal))->createManager();
        manager->enumerateDevicesMatching({platform::Dictionary()});
        return manager->devices().at(0);
    }
    DeviceRef simulated() { return firstOn(simulator::makeHidFacility({.devices = {profile}}, 0)); }
    static bool setMode(WLIOHIDDeviceInterface& sensor, int id, int first) {
        const std::byte data[] = {static_cast<std::byte>(first), std::byte{1}};
        return sensor.setFeatureReportWithID(id, data, nullptr);
    }
    std::vector<std::string> lines() { return std::exchange(journal->lines, {}); }

    simulator::HidDeviceProfile profile;
    const std::shared_ptr<Journal> journal = std::make_shared<Journal>();
    std::shared_ptr<WLHIDManager> manager;
    const std::shared_ptr<RunLoop> runLoop = RunLoop::forThisThread();
};

TEST_F(ObservedHid, ReportsTheClientsMisuses) {
    DeviceRef sensor;
    const auto elsewhere = [](const std::function<void()>& use) { std::thread(use).join(); };
    const auto schedule = [&] { sensor->scheduleWithRunLoop(runLoop, kMode); };
    const auto scheduledElsewhere = [&](const std::function<void()>& use) {
        return [&, use] {
            schedule();
            elsewhere(use);
        };
    };
    const struct {
        std::string expected;
        std::function<void()> misuse;  // of an open device
    } kCases[] = {
        {"open() was called on a HID device that is open",
         [&] { EXPECT_FALSE(sensor->open(nullptr)); }},
        {"setFeatureReportWithID() was called with data that does not begin with the report ID",
         [&] { EXPECT_FALSE(setMode(*sensor, 171, 172)); }},
        {"setFeatureReportWithID() was called with data that does not begin with the report ID",
         [&] { EXPECT_FALSE(sensor->setFeatureReportWithID(171, {}, nullptr)); }},
        {"setFeatureReportWithID() was called on a HID device that is not open",
         [&] {
             EXPECT_TRUE(sensor->close(nullptr));
             EXPECT_FALSE(setMode(*sensor, 171, 171));
         }},
        {"scheduleWithRunLoop() was called on a HID device that is not open",
         [&] {
             EXPECT_TRUE(sensor->close(nullptr));
             EXPECT_FALSE(sensor->close(nullptr));
             schedule();
         }},
        {"scheduleWithRunLoop() was called on another thread than the run loop's",
         [&] { elsewhere(schedule); }},
        {"setInputReportCallback() was called on another thread than the run loop's",
         scheduledElsewhere([&] { sensor->setInputReportCallback(kIgnoreReports); })},
        {"setFeatureReportWithID() was called on another thread than the run loop's",
         scheduledElsewhere([&] { setMode(*sensor, 171, 171); })},
        {"unscheduleFromRunLoop() was called on another thread than the run loop's",
         scheduledElsewhere([&] { sensor->unscheduleFromRunLoop(nullptr, kMode); })},
        {"close() was called on another thread than the run loop's", scheduledElsewhere([&] {
             const auto itsOwn = RunLoop::forThisThread();
             sensor->close(nullptr);
         })},
    };
    for (const auto& [expected, misuse] : kCases) {
        sensor = simulated();
        ASSERT_TRUE(sensor->open(nullptr));
        misuse();
        EXPECT_THAT(lines(), ElementsAre(expected));
    }

    // What is not scheduled, or on a run loop that is gone, is free for any thread; so is dropping it.
    sensor = simulated();
    ASSERT_TRUE(sensor->open(nullptr));
    schedule();
    sensor->unscheduleFromRunLoop(runLoop, kMode);
    elsewhere([&] { sensor->scheduleWithRunLoop(RunLoop::forThisThread(), kMode); });
    sensor->setInputReportCallback(kIgnoreReports);
    sensor->unscheduleFromRunLoop(nullptr, kMode);
    schedule();
    elsewhere([last = std::move(sensor)]() mutable { last = nullptr; });
    manager = nullptr;
    EXPECT_THAT(lines(), IsEmpty());
}

TEST_F(ObservedHid, ReportsImagesOnceTheirCallbackReturnedAndErrors) {
    profile.overrides = {{.reports = {2, 2}, .length = 791}, {.reports = {3, 3}, .reportID = 119}};
    profile.errorAtReport = {.report = 4,
                             .error = std::make_shared<const platform::Error>("sensor", 1, "jam")};
    profile.close = simulator::Fault::failing(profile.errorAtReport->error);
    const DeviceRef sensor = simulated();
    ASSERT_TRUE(sensor->open(nullptr));
    sensor->setInputReportCallback([&, reports = 0](auto, auto, const auto&) mutable {
        journal->lines.push_back("report");
        if (++reports == 5) {
            runLoop->stop();
        }
    });
    EXPECT_TRUE(setMode(*sensor, 171, 171) && setMode(*sensor, 172, 172));
    sensor->scheduleWithRunLoop(runLoop, kMode);
    EXPECT_EQ(runLoop->run(kMode, 60), RunLoopOutcome::Stopped);
    EXPECT_FALSE(sensor->close(nullptr));
    EXPECT_TRUE(sensor->open(nullptr));  // not blamed after a close() that failed
    EXPECT_THAT(lines(), ElementsAre("report", "image 1", "report", "report", "input report: jam",
                                     "report", "report", "image 2", "close(): jam"));
}

TEST_F(ObservedHid, ReportsACallbackOnAnotherThreadOnce) {
    const auto fake = std::make_shared<test::HandFedSensor>();
    DeviceRef sensor = firstOn(std::make_shared<test::OneSensorBus>(fake));
    ASSERT_TRUE(sensor->open(nullptr));
    EXPECT_EQ(manager->devices().at(0), sensor);
    sensor = nullptr;
    sensor = manager->devices().at(0);  // still open
    sensor->setInputReportCallback(kIgnoreReports);
    sensor->scheduleWithRunLoop(runLoop, kMode);
    const std::vector<std::byte> image(792);
    fake->callback(118, image, nullptr);
    std::thread([&] {
        fake->callback(118, image, nullptr);
        fake->callback(118, image, nullptr);
    }).join();
    EXPECT_THAT(lines(),
                ElementsAre("image 1",
                            "the report callback was called on another thread than the run loop's",
                            "image 2", "image 3"));
    sensor->setInputReportCallback({});
    EXPECT_FALSE(fake->callback);
}

// The device goes inside its callback; the call still finishes and is reported.
TEST_F(ObservedHid, MayBeDroppedInsideItsCallback) {
    DeviceRef sensor = simulated();
    manager = nullptr;
    ASSERT_TRUE(sensor->open(nullptr));
    sensor->setInputReportCallback([&](auto, auto, const auto&) { sensor = nullptr; });
    EXPECT_TRUE(setMode(*sensor, 171, 171) && setMode(*sensor, 172, 172));
    sensor->scheduleWithRunLoop(runLoop, kMode);
    EXPECT_EQ(runLoop->run(kMode, 60), RunLoopOutcome::Finished);
    EXPECT_THAT(lines(), ElementsAre("image 1"));
}

}  // namespace
