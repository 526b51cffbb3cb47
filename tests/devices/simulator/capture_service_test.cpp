#include "devices/simulator/capture_service.h"

#include <chrono>
#include <functional>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/mutex.h"
#include "tests/support/capture_witness.h"

namespace {

using platform::Dictionary;
using platform::MediaTime;
using platform::Value;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr auto kLight = kRylCaptureStreamMetadata_InfraredLightSource;

Value handlers(
    WLRylFrameHandler frame,
    WLRylEventHandler event = [](std::int32_t, MediaTime, std::int64_t) {}) {
    return Dictionary{{kRylCaptureStreamVideoOutputID_PrimaryScaler,
                       Dictionary{{kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler,
                                   Value::opaque(std::move(frame))},
                                  {kRylCaptureStreamVideoOutputHandlerKey_EventHandler,
                                   Value::opaque(std::move(event))}}}};
}

class CaptureService : public ::testing::Test {
  protected:
    ~CaptureService() override {
        device = nullptr;
        plugIn = nullptr;
        EXPECT_THAT(witness->waitForMisuses(0), IsEmpty());
    }

    simulator::StreamProfile& camera() { return profile.streams.back(); }

    // Connects to a device of the profile and takes control of its infrared camera, which is to run
    // at that many frames a second.
    void connect(int rate = 100) {
        plugIn = std::dynamic_pointer_cast<simulator::SimulatedCapture>(
            simulator::makeCapturePlugIn(profile, speed, progress, witness));
        device = plugIn->device(nullptr);
        stream = device->streams(nullptr)->back();
        ASSERT_TRUE(device->requestControlOfStreams({stream}, nullptr));
        ASSERT_TRUE(write(kRylCaptureStreamProperty_MaximumFrameRate, rate));
    }
    bool write(std::string_view property, const Value& value) {
        return stream->setValue(value, property, nullptr);
    }
    void start(WLRylFrameHandler frame) {
        ASSERT_TRUE(write(kRylCaptureStreamProperty_VideoOutputHandlers, handlers(frame)));
        ASSERT_TRUE(stream->start(nullptr));
    }

    simulator::CaptureProfile profile = simulator::healthyCapture();
    double speed = 0;
    std::shared_ptr<test::CaptureWitness> witness = std::make_shared<test::CaptureWitness>();
    std::shared_ptr<simulator::StreamProgress> progress =
        std::make_shared<simulator::StreamProgress>();
    std::shared_ptr<simulator::SimulatedCapture> plugIn;
    std::shared_ptr<WLRylCaptureDevice> device;
    std::shared_ptr<WLRylCaptureStream> stream;
};

const auto kIgnore = [](const platform::ImageBufferRef&, MediaTime) {};

TEST_F(CaptureService, DeliversLitFramesAtTheirTimeAndWarmsUp) {
    speed = 20;
    camera().stallAfterFrame = 40;
    connect(50);
    const auto started = std::chrono::steady_clock::now();
    start(kIgnore);
    const auto frames = witness->waitFor(40);
    ASSERT_EQ(frames.size(), 40U);
    for (std::uint64_t number = 1; number <= 40; ++number) {
        const auto& frame = frames[number - 1];
        EXPECT_EQ(frame.number, number);
        EXPECT_DOUBLE_EQ(frame.time.seconds(), static_cast<double>(number) / 50);
        EXPECT_GE(frame.delivered - started,
                  std::chrono::milliseconds(number));  // 50 x 20 a second
        EXPECT_EQ(frame.metadata.size(), 18U);
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
        EXPECT_EQ(plugIn->liveBuffers(), 16U);
        held.clear();
    }
    EXPECT_TRUE(stream->stop(nullptr));
    const platform::MutexLock lock(mutex);
    held.clear();
}

// Nothing but the end of stop() and invalidate() orders the handlers' writes before these reads.
TEST_F(CaptureService, StopsAndStartsAgainAndEnds) {
    connect();
    std::uint64_t delivered = 0;
    std::weak_ptr<int> handler;
    {
        const auto owned = std::make_shared<int>();
        handler = owned;
        start([&delivered, owned](const platform::ImageBufferRef&, MediaTime) { ++delivered; });
    }
    witness->waitFor(10);
    EXPECT_TRUE(stream->stop(nullptr));
    const std::size_t before = witness->waitFor(0).size();
    EXPECT_GE(before, 10U);
    EXPECT_EQ(delivered, before);

    EXPECT_TRUE(stream->start(nullptr));
    EXPECT_EQ(witness->waitFor(before + 1)[before].number, 1U);
    EXPECT_TRUE(device->invalidate(nullptr));
    EXPECT_EQ(delivered, witness->waitFor(0).size());
    EXPECT_TRUE(handler.expired());
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

// Stopping, invalidating and letting go of everything inside a handler.
TEST_F(CaptureService, CanBeGivenUpInsideAHandler) {
    const std::function<void()> kWays[] = {
        [&] { EXPECT_TRUE(stream->stop(nullptr)); },
        [&] { EXPECT_TRUE(device->invalidate(nullptr)); },
        [&] {
            stream = nullptr;
            device = nullptr;
        },
    };
    for (const auto& giveUp : kWays) {
        connect();
        const std::size_t before = witness->waitFor(0).size();
        start([&, given = false](const platform::ImageBufferRef&, MediaTime) mutable {
            if (!std::exchange(given, true)) {
                giveUp();
            }
        });
        EXPECT_EQ(witness->waitFor(before + 1).size(), before + 1);
    }
}

class CaptureMisuse : public CaptureService {
  protected:
    ~CaptureMisuse() override { witness = std::make_shared<test::CaptureWitness>(); }
};

TEST_F(CaptureMisuse, IsReportedInOneLine) {
    const std::string handlersKey(kRylCaptureStreamProperty_VideoOutputHandlers);
    connect();
    const auto other = plugIn->device(nullptr)->streams(nullptr)->back();
    EXPECT_FALSE(device->requestControlOfStreams({other}, nullptr));
    EXPECT_FALSE(stream->stop(nullptr));
    EXPECT_FALSE(stream->start(nullptr));
    start(kIgnore);
    EXPECT_FALSE(stream->start(nullptr));
    EXPECT_TRUE(stream->stop(nullptr));
    EXPECT_FALSE(stream->stop(nullptr));
    const auto uncontrolled = device->streams(nullptr)->front();
    EXPECT_FALSE(uncontrolled->setValue(handlers(kIgnore), handlersKey, nullptr));
    EXPECT_FALSE(uncontrolled->start(nullptr));
    EXPECT_TRUE(device->invalidate(nullptr));
    EXPECT_FALSE(device->invalidate(nullptr));
    EXPECT_FALSE(device->streams(nullptr).has_value());
    EXPECT_FALSE(stream->valueForProperty(handlersKey, nullptr).isPresent());
    EXPECT_FALSE(stream->stop(nullptr));
    EXPECT_THAT(witness->waitForMisuses(0),
                ElementsAre("a stream was stopped that does not run",
                            "a stream was started without a frame handler",
                            "a stream was started that runs already",
                            "a stream was stopped that does not run",
                            handlersKey + " was written without control of the stream",
                            "start was asked without control of the stream",
                            "a device was asked for its invalidation after it was invalidated",
                            "a device was asked for its streams after it was invalidated",
                            handlersKey + " was read after its device was invalidated",
                            "stop was asked after its device was invalidated"));
}

TEST_F(CaptureMisuse, IncludesBuffersThatAreNotGivenBack) {
    connect();
    std::vector<platform::ImageBufferRef> kept;
    start([&](const platform::ImageBufferRef& buffer, MediaTime) { kept.push_back(buffer); });
    EXPECT_THAT(witness->waitForMisuses(1),
                ElementsAre("no image buffer was given back for five seconds"));
    EXPECT_TRUE(stream->stop(nullptr));
    kept.resize(2);
    plugIn = nullptr;
    EXPECT_THAT(witness->waitForMisuses(2),
                ElementsAre(::testing::_, "2 image buffers were never given back"));
}

}  // namespace
