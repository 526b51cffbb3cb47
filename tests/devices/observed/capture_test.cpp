// The observed capture service: what reaches the observer, which rules are watched, and that the client
// and the device see each other as if there was nothing between them.
#include "devices/observed/capture.h"

#include <chrono>
#include <functional>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "devices/observed/observe.h"
#include "devices/simulator/capture_service.h"
#include "platform/run_tag.h"
#include "tests/devices/observed/fake_capture.h"
#include "tests/support/capture_witness.h"

namespace {

using platform::Dictionary;
using platform::MediaTime;
using platform::Value;
using test::captureHandlers;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Pair;

constexpr auto kHandlers = kRylCaptureStreamProperty_VideoOutputHandlers;
constexpr auto kFormat = kRylCaptureStreamProperty_FormatIndex;
const auto kIgnore = [](const platform::ImageBufferRef&, MediaTime) {};

class ObservedCapture : public ::testing::Test {
  protected:
    // Connects to the device and takes control of its last stream.
    void connect(std::shared_ptr<WLISPCapturePlugIn> inner) {
        witness = std::make_shared<test::CaptureWitness>();
        plugIn = observed::observeCapture(std::move(inner), observed::Reporter(witness));
        device = plugIn->device(nullptr);
        stream = device->streams(nullptr)->back();
        ASSERT_TRUE(device->requestControlOfStreams({stream}, nullptr));
    }
    static std::shared_ptr<WLISPCapturePlugIn> simulated() {
        return simulator::makeCapturePlugIn(simulator::healthyCapture(), 0,
                                            std::make_shared<simulator::StreamProgress>());
    }
    bool write(const Value& handlers) { return stream->setValue(handlers, kHandlers, nullptr); }
    bool run() { return write(captureHandlers(kIgnore)) && stream->start(nullptr); }
    std::vector<std::string> misuses() { return witness->waitForMisuses(0); }

    std::shared_ptr<test::FakeCapture> fake = std::make_shared<test::FakeCapture>();
    std::shared_ptr<test::CaptureWitness> witness;
    std::shared_ptr<observed::ObservedCapture> plugIn;
    std::shared_ptr<WLRylCaptureDevice> device;
    std::shared_ptr<WLRylCaptureStream> stream;
};

TEST_F(ObservedCapture, ReportsTheClientsMisuses) {
    const auto uncontrolled = [&] { return device->streams(nullptr)->front(); };
    const auto ended = [&] { return device->invalidate(nullptr); };
    const struct {
        std::string expected;
        std::function<bool()> misuse;  // refused by the device
    } kCases[] = {
        {"setValue() of ryl.stream.format-index was called without control of the stream",
         [&] { return uncontrolled()->setValue(1, kFormat, nullptr); }},
        {"start() was called without control of the stream",
         [&] { return uncontrolled()->start(nullptr); }},
        {"start() was called without a frame handler", [&] { return stream->start(nullptr); }},
        {"start() was called without a frame handler",
         [&] { return write(captureHandlers(nullptr)) && stream->start(nullptr); }},
        {"start() was called on a stream that is running",
         [&] { return run() && stream->start(nullptr); }},
        {"stop() was called on a stream that is not running",
         [&] { return run() && stream->stop(nullptr) && stream->stop(nullptr); }},
        {"setValue() of ryl.stream.output-handlers was called after the device was invalidated",
         [&] { return ended() && write({}); }},
        {"valueForProperty() of ryl.stream.port-type was called after the device was invalidated",
         [&] {
             return ended() && stream->valueForProperty(kRylCaptureStreamProperty_PortType, nullptr)
                                   .isPresent();
         }},
        {"start() was called after the device was invalidated",
         [&] { return ended() && stream->start(nullptr); }},
        {"stop() was called after the device was invalidated",
         [&] { return run() && ended() && stream->stop(nullptr); }},
        {"streams() was called on an invalidated device",
         [&] { return ended() && device->streams(nullptr).has_value(); }},
        {"requestControlOfStreams() was called on an invalidated device",
         [&] { return ended() && device->requestControlOfStreams({stream}, nullptr); }},
        {"invalidate() was called on an invalidated device", [&] { return ended() && ended(); }},
    };
    for (const auto& [expected, misuse] : kCases) {
        SCOPED_TRACE(expected);
        const auto inside = std::make_shared<test::CaptureWitness>();
        for (const bool twice : {false, true}) {  // observed, and observed again
            auto inner = simulated();
            if (twice) {
                inner = observed::observe({.capture = std::move(inner)}, inside).capture;
            }
            connect(std::move(inner));
            EXPECT_FALSE(misuse());
            EXPECT_THAT(misuses(), ElementsAre(expected));
        }
        EXPECT_THAT(inside->waitForMisuses(0), ElementsAre(expected));
    }
}

TEST_F(ObservedCapture, ReportsTheDevicesMisusesOncePerStream) {
    connect(fake);
    const auto nested = [&, inside = false](const auto&, auto) mutable {
        if (!std::exchange(inside, true)) {
            fake->stream->deliverFrame(nullptr);
            inside = false;
        }
    };
    ASSERT_TRUE(write(captureHandlers(nested, [](auto, auto, auto) {})));
    fake->stream->deliverFrame(nullptr);
    fake->stream->deliverFrame(nullptr);
    EXPECT_THAT(misuses(), ElementsAre("two frame handlers of one stream were called at once"));

    const std::pair<std::string, std::function<void()>> kLate[] = {
        {"a frame handler", [&] { fake->stream->deliverFrame(nullptr); }},
        {"an event handler", [&] { fake->stream->deliverEvent(1, {}, 2); }},
    };
    for (const auto& [handler, deliver] : kLate) {
        connect(fake);
        ASSERT_TRUE(write(captureHandlers(kIgnore, [](auto, auto, auto) {})));
        fake->invalidated = deliver;  // before invalidate() has returned
        ASSERT_TRUE(device->invalidate(nullptr));
        EXPECT_THAT(misuses(), IsEmpty());
        deliver();
        deliver();
        EXPECT_THAT(misuses(),
                    ElementsAre(handler + " was called after invalidate() had returned"));
    }
}

TEST_F(ObservedCapture, ReportsFramesAndEventsOnceTheirHandlerReturned) {
    connect(fake);
    std::chrono::steady_clock::time_point inside;
    std::size_t reported = 0;
    ASSERT_TRUE(write(captureHandlers(
        [&](const auto&, auto) {
            inside = std::chrono::steady_clock::now();
            EXPECT_EQ(witness->waitFor(0).size(), reported++);
        },
        [&](auto, auto, auto) { EXPECT_THAT(witness->events(), IsEmpty()); })));
    const auto before = std::chrono::steady_clock::now();
    ASSERT_TRUE(stream->start(nullptr));
    fake->stream->deliverFrame(test::imageBuffer(), {.value = 5, .timescale = 2});
    EXPECT_GE(witness->waitFor(1).at(0).delivered, before);
    EXPECT_LE(witness->waitFor(1).at(0).delivered, inside);
    fake->stream->deliverFrame(std::make_shared<const platform::ImageBuffer>(
        Dictionary{{kRylCaptureSampleBufferAttachmentKey_MetadataDictionary, "corrupt"}}));
    fake->stream->deliverEvent(-4, {.value = 3}, 99);
    ASSERT_TRUE(stream->stop(nullptr));
    ASSERT_TRUE(stream->start(nullptr));
    fake->stream->deliverFrame(nullptr);

    const auto frames = witness->waitFor(3);
    ASSERT_EQ(frames.size(), 3U);
    EXPECT_THAT((std::vector{frames[0].number, frames[1].number, frames[2].number}),
                ElementsAre(1, 2, 1));
    EXPECT_EQ(frames[0].time.seconds(), 2.5);
    EXPECT_EQ(frames[0].metadata, (Dictionary{{"Key", 7}}));
    EXPECT_TRUE(frames[1].metadata.empty() && frames[2].metadata.empty());
    const auto events = witness->events();
    ASSERT_EQ(events.size(), 1U);
    EXPECT_EQ(std::tuple(events[0].code, events[0].time.value, events[0].info),
              std::tuple(-4, 3, 99));
}

TEST_F(ObservedCapture, CallsAHandlerForTheRunThatWroteIt) {
    connect(fake);
    std::vector<platform::RunTag> tags;
    const auto note = [&tags](const auto&...) { tags.push_back(platform::currentRunTag()); };
    {
        const platform::RunTagScope scope(5);
        ASSERT_TRUE(write(captureHandlers(note, note)));
    }
    fake->stream->deliverFrame(test::imageBuffer());
    fake->stream->deliverEvent(1, MediaTime(), 2);
    EXPECT_THAT(tags, ElementsAre(5, 5));
}

TEST_F(ObservedCapture, ReportsTheErrorsOfCallsAndHandsThemOn) {
    const auto jam = std::make_shared<const platform::Error>("service", 7, "jam");
    const auto earlier = std::make_shared<const platform::Error>("service", 1, "earlier");
    connect(fake);
    platform::ErrorRef error = earlier;
    ASSERT_TRUE(write(captureHandlers(kIgnore)) && stream->start(&error));
    fake->stream->fails = true;
    EXPECT_FALSE(stream->stop(&error));  // without an error object
    EXPECT_EQ(error, earlier);
    fake->stream->error = jam;
    EXPECT_FALSE(stream->stop(nullptr));
    EXPECT_FALSE(stream->setValue(1, kFormat, &error));
    EXPECT_EQ(error, jam);
    EXPECT_THAT(witness->errors(), ElementsAre(Pair("stop()", jam),
                                               Pair("setValue() of ryl.stream.format-index", jam)));
    EXPECT_THAT(misuses(), IsEmpty());  // it runs on, so that stop() may be tried again
}

TEST_F(ObservedCapture, WrapsTheTwoHandlersOnly) {
    connect(fake);
    constexpr auto kPrimary = kRylCaptureStreamVideoOutputID_PrimaryScaler;
    constexpr auto kFrame = kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler;
    constexpr auto kEvent = kRylCaptureStreamVideoOutputHandlerKey_EventHandler;
    const Value frame = Value::opaque(WLRylFrameHandler(kIgnore));
    const Value event = Value::opaque(WLRylEventHandler([](auto, auto, auto) {}));
    const Value handlers =
        Dictionary{{kPrimary, Dictionary{{kFrame, frame}, {kEvent, event}, {"own", frame}}},
                   {"another output", Dictionary{{kFrame, frame}}}};
    ASSERT_TRUE(write(handlers));
    const Value& seen = fake->stream->handlers();
    EXPECT_FALSE(seen[kPrimary][kFrame] == frame || seen[kPrimary][kEvent] == event);
    EXPECT_EQ(seen[kPrimary]["own"], frame);
    EXPECT_EQ(seen["another output"], handlers["another output"]);
    EXPECT_EQ(stream->valueForProperty(kHandlers, nullptr), handlers);

    for (const Value& odd :
         {Value(), Value(3), Value(Dictionary{{kPrimary, 3}}),
          Value(Dictionary{{kPrimary, Dictionary{{kFrame, event}, {kEvent, "text"}}}}),
          captureHandlers(nullptr, nullptr)}) {
        ASSERT_TRUE(write(odd));
        EXPECT_EQ(fake->stream->handlers(), odd);
        EXPECT_EQ(stream->valueForProperty(kHandlers, nullptr), odd);
    }
}

TEST_F(ObservedCapture, HasOneWrapperPerStreamAndRemembersWhatIsKnownOfIt) {
    connect(fake);
    EXPECT_THAT(fake->requested, ElementsAre(fake->stream));
    EXPECT_EQ(device->streams(nullptr)->back(), stream);
    const auto foreign = std::make_shared<test::FakeStream>();
    EXPECT_TRUE(device->requestControlOfStreams({foreign, nullptr, stream}, nullptr));
    EXPECT_THAT(fake->requested, ElementsAre(foreign, nullptr, fake->stream));
    ASSERT_TRUE(run());
    stream = nullptr;
    stream = device->streams(nullptr)->back();
    EXPECT_TRUE(stream->stop(nullptr));
    EXPECT_THAT(misuses(), IsEmpty());
}

// Takes five seconds, and one.
TEST_F(ObservedCapture, ReportsBuffersThatAreNotGivenBack) {
    connect(simulated());
    std::vector<platform::ImageBufferRef> kept;
    const auto keepTwo = [&](const platform::ImageBufferRef& buffer, MediaTime) {
        if (kept.size() < 2) {
            kept.push_back(buffer);
        }
    };
    ASSERT_TRUE(write(captureHandlers(keepTwo)));
    const auto started = std::chrono::steady_clock::now();
    do {
        const std::size_t frames = witness->waitFor(0).size();
        ASSERT_TRUE(stream->start(nullptr));
        witness->waitFor(frames + 2);
        ASSERT_TRUE(stream->stop(nullptr));
        std::this_thread::sleep_for(std::chrono::milliseconds(20));
    } while (misuses().empty() && std::chrono::steady_clock::now() - started < test::kGenerous);
    EXPECT_GE(std::chrono::steady_clock::now() - started, std::chrono::seconds(5));
    EXPECT_THAT(misuses(), ElementsAre(::testing::EndsWith("held for more than five seconds")));
    kept.resize(1);
    EXPECT_TRUE(device->invalidate(nullptr));
    EXPECT_THAT(misuses(), ElementsAre(::testing::_, "1 image buffer was never given back"));
    EXPECT_EQ(plugIn->lentBuffers(), 1U);
}

TEST_F(ObservedCapture, FollowsBuffersWithoutACopyAndWaitsForThemButNotInsideAHandler) {
    connect(fake);
    platform::ImageBufferRef kept;
    ASSERT_TRUE(write(captureHandlers([&](const auto& buffer, auto) { kept = buffer; })));
    const auto buffer = test::imageBuffer();
    fake->stream->deliverFrame(buffer);
    EXPECT_EQ(kept.get(), buffer.get());
    EXPECT_EQ(buffer.use_count(), 2);
    EXPECT_EQ(plugIn->lentBuffers(), 1U);
    std::thread client;
    fake->invalidated = [&] { client = std::thread([held = std::move(kept)]() mutable {}); };
    ASSERT_TRUE(device->invalidate(nullptr));
    client.join();
    EXPECT_EQ(buffer.use_count(), 1);
    EXPECT_EQ(plugIn->lentBuffers(), 0U);

    fake->invalidated = nullptr;
    connect(fake);
    ASSERT_TRUE(write(captureHandlers([&](const auto& buffer, auto) {
        kept = buffer;
        const auto before = std::chrono::steady_clock::now();
        EXPECT_TRUE(device->invalidate(nullptr));
        EXPECT_LT(std::chrono::steady_clock::now() - before, std::chrono::milliseconds(900));
    })));
    fake->stream->deliverFrame(test::imageBuffer());
    EXPECT_THAT(misuses(), IsEmpty());
}

TEST(Observe, LeavesWhatIsNotThere) {
    const auto services = observed::observe({}, {});
    EXPECT_EQ(services.capture, nullptr);
    EXPECT_EQ(services.meterix, nullptr);
    EXPECT_EQ(services.hid, nullptr);
}

}  // namespace
