#include "simulator/capture_service.h"

#include <chrono>
#include <functional>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/deadline.h"
#include "platform/mutex.h"

namespace {

using platform::Dictionary;
using platform::MediaTime;
using platform::Value;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr std::chrono::seconds kGenerous{60};
constexpr auto kLight = kRylCaptureStreamMetadata_InfraredLightSource;

// Sees what the device says it delivered.
class Witness final : public simulator::Observer {
  public:
    void frameDelivered(const simulator::DeliveredFrame& frame) override {
        const platform::MutexLock lock(_mutex);
        _frames.push_back(frame);
        _changed.notifyAll();
    }
    void misused(std::string_view what) override {
        const platform::MutexLock lock(_mutex);
        _misuses.emplace_back(what);
    }
    // The first `count` frames, as soon as they are there; fewer when they do not come.
    std::vector<simulator::DeliveredFrame> waitFor(std::size_t count) {
        const auto deadline = platform::deadlineAfter(kGenerous);
        const platform::MutexLock lock(_mutex);
        while (_frames.size() < count && std::chrono::steady_clock::now() < deadline) {
            _changed.waitUntil(_mutex, deadline);
        }
        return _frames;
    }
    std::vector<std::string> misuses() {
        const platform::MutexLock lock(_mutex);
        return _misuses;
    }

  private:
    platform::Mutex _mutex;
    platform::Condition _changed;
    std::vector<simulator::DeliveredFrame> _frames ZR_GUARDED_BY(_mutex);
    std::vector<std::string> _misuses ZR_GUARDED_BY(_mutex);
};

Value handlers(WLRylFrameHandler frame, WLRylEventHandler event = nullptr) {
    Dictionary output{{kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler,
                       Value::opaque(std::move(frame))}};
    if (event != nullptr) {
        platform::MutableDictionary both = output.entries();
        both.set(kRylCaptureStreamVideoOutputHandlerKey_EventHandler,
                 Value::opaque(std::move(event)));
        output = Dictionary(std::move(both));
    }
    return Dictionary{{kRylCaptureStreamVideoOutputID_PrimaryScaler, output}};
}

class CaptureService : public ::testing::Test {
  protected:
    ~CaptureService() override {
        device = nullptr;
        plugIn = nullptr;
        EXPECT_THAT(witness->misuses(), IsEmpty());
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
    void start(WLRylFrameHandler frame, WLRylEventHandler event = nullptr) {
        ASSERT_TRUE(write(kRylCaptureStreamProperty_VideoOutputHandlers,
                          handlers(std::move(frame), std::move(event))));
        ASSERT_TRUE(stream->start(nullptr));
    }

    simulator::CaptureProfile profile = simulator::healthyCapture();
    double speed = 0;
    std::shared_ptr<Witness> witness = std::make_shared<Witness>();
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

TEST_F(CaptureService, DeliversWhatTheProfileMakesOfItsFrames) {
    camera().metadata = {};
    camera().metadata.set("A", 1);
    camera().metadata.set("B", 2);
    camera().warming = {};
    camera().lightSources = {};
    camera().stallAfterFrame = 7;
    const auto covering = [&](std::uint64_t first, std::uint64_t last) -> auto& {
        simulator::FrameOverride& range = camera().overrides.emplace_back();
        range.firstFrame = first;
        range.lastFrame = last;
        return range;
    };
    covering(1, 7).remove = {"B"};
    covering(2, 3).set.set("C", "x");
    covering(3, 3).set.set("A", 5);
    covering(4, 4).noMetadata = true;
    covering(5, 5).metadataIsNoDictionary = true;
    covering(6, 6).dropped = true;
    camera().events = {{.frame = 3, .code = -7, .info = 1LL << 40}, {.frame = 6, .code = 8}};
    connect();
    std::vector<std::string> seen;
    start(
        [&](const platform::ImageBufferRef& buffer, MediaTime time) {
            const Value& metadata =
                buffer->attachment(kRylCaptureSampleBufferAttachmentKey_MetadataDictionary);
            std::string text = std::to_string(time.value / 10'000) + ":";
            if (metadata.dictionary() != nullptr) {
                for (const auto& [key, value] : metadata.dictionary()->entries()) {
                    text += key + (value.string() ? *value.string() : value.asNumber().text());
                }
            } else {
                text += metadata.isPresent() ? "wrong" : "none";
            }
            seen.push_back(text);
        },
        [&](std::int32_t code, MediaTime time, std::int64_t info) {
            seen.push_back(std::to_string(time.value / 10'000) + " event " + std::to_string(code) +
                           " " + std::to_string(info));
        });
    witness->waitFor(6);
    EXPECT_TRUE(stream->stop(nullptr));
    EXPECT_THAT(seen, ElementsAre("1:A1", "2:A1Cx", "3 event -7 1099511627776", "3:A5Cx", "4:none",
                                  "5:wrong", "6 event 8 0", "7:A1"));
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
    ~CaptureMisuse() override { witness = std::make_shared<Witness>(); }
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
    EXPECT_THAT(witness->misuses(),
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

TEST_F(CaptureMisuse, IncludesBuffersThatAreNeverGivenBack) {
    camera().stallAfterFrame = 2;
    connect();
    std::vector<platform::ImageBufferRef> kept;
    start([&](const platform::ImageBufferRef& buffer, MediaTime) { kept.push_back(buffer); });
    witness->waitFor(2);
    EXPECT_TRUE(stream->stop(nullptr));
    plugIn = nullptr;
    EXPECT_THAT(witness->misuses(), ElementsAre("2 image buffers were never given back"));
}

}  // namespace
