#include "devices/simulator/capture_service.h"

#include <chrono>
#include <cmath>
#include <limits>
#include <thread>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "devices/observed/capture.h"
#include "devices/simulator/due_time.h"
#include "devices/simulator/frame_metadata.h"
#include "platform/sync.h"
#include "tests/devices/observed/fake_capture.h"
#include "tests/support/capture_witness.h"

namespace {

using platform::MediaTime;
using platform::Value;
using ::testing::IsEmpty;

constexpr auto kLight = kRylCaptureStreamMetadata_InfraredLightSource;

class CaptureService : public ::testing::Test {
  protected:
    ~CaptureService() override { EXPECT_THAT(witness->waitForMisuses(0), IsEmpty()); }

    simulator::StreamProfile& camera() { return profile.streams.back(); }

    // Connects to a device of the profile and takes control of its infrared camera, which is to run
    // at that many frames per second.
    void connect(int rate = 100) {
        plugIn = observed::observeCapture(simulator::makeCapturePlugIn(profile, speed, progress),
                                          observed::Reporter(witness));
        device = plugIn->device(nullptr);
        stream = device->streams(nullptr)->back();
        ASSERT_TRUE(device->requestControlOfStreams({stream}, nullptr));
        ASSERT_TRUE(write(kRylCaptureStreamProperty_MaximumFrameRate, rate));
    }
    bool write(std::string_view property, const Value& value) {
        return stream->setValue(value, property, nullptr);
    }
    void start(WLRylFrameHandler frame) {
        ASSERT_TRUE(
            write(kRylCaptureStreamProperty_VideoOutputHandlers, test::captureHandlers(frame)));
        ASSERT_TRUE(stream->start(nullptr));
    }

    simulator::CaptureProfile profile = simulator::healthyCapture();
    double speed = 0;
    std::shared_ptr<test::CaptureWitness> witness = std::make_shared<test::CaptureWitness>();
    std::shared_ptr<simulator::StreamProgress> progress =
        std::make_shared<simulator::StreamProgress>();
    std::shared_ptr<observed::ObservedCapture> plugIn;
    std::shared_ptr<WLRylCaptureDevice> device;
    std::shared_ptr<WLRylCaptureStream> stream;
};

const auto kIgnore = [](const platform::ImageBufferRef&, MediaTime) {};

TEST_F(CaptureService, DeliversLitFramesAtTheirTimeAndWarmsUp) {
    speed = 20;
    camera().stallAfterFrame = 40;
    camera().jitterMicroseconds = 400'000;
    ASSERT_GT(frameDelay(camera(), 1), 0);
    connect(50);
    const auto started = std::chrono::steady_clock::now();
    start(kIgnore);
    const auto frames = witness->waitFor(40);
    ASSERT_EQ(frames.size(), 40U);
    for (std::uint64_t number = 1; number <= 40; ++number) {
        const auto& frame = frames[number - 1];
        EXPECT_EQ(frame.number, number);
        EXPECT_DOUBLE_EQ(frame.time.seconds(), static_cast<double>(number) / 50);
        const double due = static_cast<double>(number) / 50 + frameDelay(camera(), number);
        EXPECT_GE(std::chrono::duration<double>(frame.delivered - started).count(), due / speed);
        EXPECT_EQ(frame.metadata.size(), 19U);
        EXPECT_EQ(frame.metadata["FrameNumber"], Value(number));
        EXPECT_EQ(frame.metadata[kLight], Value(number % 2 == 1 ? 1 : 2));
    }
    EXPECT_GT(frames.back().metadata.number("DIETemperatureActive").asDouble(),
              frames.front().metadata.number("DIETemperatureActive").asDouble());
    EXPECT_EQ(progress->frames, 40U);
    EXPECT_EQ(progress->microseconds, 800'000U);
}

TEST_F(CaptureService, WaitsForABufferWhenAllAreHeld) {
    connect();
    platform::Mutex mutex;
    std::vector<platform::ImageBufferRef> held;
    start([&](const platform::ImageBufferRef& buffer, MediaTime) {
        const platform::MutexLock lock(mutex);
        held.push_back(buffer);
    });
    for (const std::size_t frames : {16U, 32U, 48U}) {
        EXPECT_EQ(witness->waitFor(frames).size(), frames);
        const platform::MutexLock lock(mutex);
        EXPECT_EQ(held.size(), 16U);
        EXPECT_EQ(plugIn->lentBuffers(), 16U);
        held.clear();
    }
    EXPECT_TRUE(stream->stop(nullptr));
    const platform::MutexLock lock(mutex);
    held.clear();
}

// Nothing but the end of stop() orders the handlers' writes before the read.
TEST_F(CaptureService, StopsAndStartsAgain) {
    connect();
    std::uint64_t delivered = 0;
    start([&delivered](const platform::ImageBufferRef&, MediaTime) { ++delivered; });
    witness->waitFor(10);
    EXPECT_TRUE(stream->stop(nullptr));
    const std::size_t before = witness->waitFor(0).size();
    EXPECT_GE(before, 10U);
    EXPECT_EQ(delivered, before);

    EXPECT_TRUE(stream->start(nullptr));
    EXPECT_EQ(witness->waitFor(before + 1)[before].number, 1U);
    EXPECT_TRUE(device->invalidate(nullptr));
}

TEST_F(CaptureService, DeliversTheFramesThatWereOnTheirWay) {
    camera().framesAfterStop = 4;
    connect();
    start([&, frames = 0](const platform::ImageBufferRef&, MediaTime) mutable {
        if (++frames == 3) {
            EXPECT_TRUE(stream->stop(nullptr));
        }
    });
    EXPECT_EQ(witness->waitFor(7).size(), 7U);
    EXPECT_TRUE(device->invalidate(nullptr));
    EXPECT_EQ(witness->waitFor(0).size(), 7U);
}

// The frame that would follow the event does not reach its handler any more.
TEST_F(CaptureService, CanBeInvalidatedInsideAnEventHandler) {
    camera().events = {{.frame = 3}};
    connect();
    auto token = std::make_shared<int>();
    const std::weak_ptr<int> handler = token;
    ASSERT_TRUE(
        write(kRylCaptureStreamProperty_VideoOutputHandlers,
              test::captureHandlers(kIgnore, [this, token = std::move(token)](auto, auto, auto) {
                  EXPECT_TRUE(device->invalidate(nullptr));
              })));
    ASSERT_TRUE(stream->start(nullptr));
    while (!handler.expired()) {
        std::this_thread::yield();
    }
    EXPECT_EQ(witness->waitFor(0).size(), 2U);
}

TEST_F(CaptureService, GrantsControlOfTheDevicesOwnStreamsOnly) {
    connect();
    const auto other = plugIn->device(nullptr)->streams(nullptr)->back();
    EXPECT_FALSE(device->requestControlOfStreams({other}, nullptr));
}

TEST(DueTime, IsNeverBeyondTheClocksEnd) {
    using TimePoint = std::chrono::steady_clock::time_point;
    constexpr double kInfinity = std::numeric_limits<double>::infinity();
    const TimePoint started = std::chrono::steady_clock::now();
    const struct {
        double seconds;
        double speed;
        TimePoint due;
    } kCases[] = {
        {1.5, 100, started + std::chrono::milliseconds(15)},
        {1.5, 0, started},
        {1.5, kInfinity, started},
        {1.5, std::nan(""), started},
        {1.0 / 30, 1e-300, TimePoint::max()},
        {1e300, 1e-300, TimePoint::max()},
        {9.2233720368e9, 1, TimePoint::max()},  // fits the clock, but not from now on
    };
    for (const auto& [seconds, speed, due] : kCases) {
        EXPECT_EQ(simulator::dueTime(started, seconds, speed), due) << seconds << ' ' << speed;
    }
}

}  // namespace
