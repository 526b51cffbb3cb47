// The decorator itself: what passes through it, what it damages, and how it counts.
#include "devices/faulty/faulty_device.h"

#include <atomic>
#include <thread>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/welkin/meterix.h"
#include "tests/devices/observed/fake_capture.h"
#include "tests/support/is_error.h"

namespace {

using faulty::Fault;
using faulty::FaultyDevice;
using faulty::Step;
using faulty::StepKind;
using faulty::Way;
using platform::ErrorRef;
using platform::ImageBufferRef;
using platform::Value;

constexpr auto kHandlers = kRylCaptureStreamProperty_VideoOutputHandlers;
constexpr auto kMetadata = kRylCaptureSampleBufferAttachmentKey_MetadataDictionary;

class FaultyCapture : public ::testing::Test {
  protected:
    // The fake's stream as a client of the faulty device gets it.
    std::shared_ptr<WLRylCaptureStream> stream(std::vector<Fault> faults = {}) {
        device.emplace([this] { return platform::Services{.capture = fake}; }, std::move(faults));
        connection = device->services().capture->device(nullptr);
        return connection->streams(nullptr)->front();
    }

    const std::shared_ptr<test::FakeCapture> fake = std::make_shared<test::FakeCapture>();
    std::optional<FaultyDevice> device;
    std::shared_ptr<WLRylCaptureDevice> connection;
};

TEST_F(FaultyCapture, PassesThroughWhatDoesNotFail) {
    const auto wrapper = stream();
    EXPECT_EQ(connection->streams(nullptr)->front(), wrapper);
    EXPECT_TRUE(connection->requestControlOfStreams({wrapper}, nullptr));
    EXPECT_THAT(fake->requested, ::testing::ElementsAre(fake->stream));

    int events = 0;
    ImageBufferRef frame;
    const Value written =
        test::captureHandlers([&](const ImageBufferRef& buffer, auto) { frame = buffer; },
                              [&](auto, auto, auto) { ++events; });
    EXPECT_TRUE(wrapper->setValue(written, kHandlers, nullptr));
    EXPECT_NE(fake->stream->handlers(), written);
    EXPECT_EQ(wrapper->valueForProperty(kHandlers, nullptr), written);
    const auto buffer = test::imageBuffer();
    fake->stream->deliverFrame(buffer);
    fake->stream->deliverEvent(1, {}, 2);
    EXPECT_EQ(frame, buffer);
    EXPECT_EQ(events, 1);

    fake->stream->fails = true;
    fake->stream->error = std::make_shared<const platform::Error>("fake", 1, "of the device");
    ErrorRef error;
    EXPECT_FALSE(wrapper->start(&error));
    EXPECT_EQ(error, fake->stream->error);
    EXPECT_THAT(device->strikes(), ::testing::IsEmpty());
}

// A frame that is damaged keeps the device's buffer out, as the device's own would.
TEST_F(FaultyCapture, DamagesAFrame) {
    const Value kNumber = 7;
    const Value kText = "of the wrong kind";
    const struct {
        Way way;
        bool hasBuffer;
        Value metadata;
    } kCases[] = {
        {Way::AbsentObject, false, {}},
        {Way::AbsentValue, true, {}},
        {Way::Empty, true, platform::Dictionary()},
        {Way::WrongKind, true, kText},
        {Way::WrongEntries, true, platform::Dictionary{{"Key", kText}}},
    };
    for (const auto& [way, hasBuffer, metadata] : kCases) {
        const auto wrapper = stream({{{StepKind::Frame, 2}, way}});
        std::vector<ImageBufferRef> frames;
        wrapper->setValue(
            test::captureHandlers([&](const auto& buffer, auto) { frames.push_back(buffer); }),
            kHandlers, nullptr);
        auto buffer = test::imageBuffer();
        const std::weak_ptr<const platform::ImageBuffer> out = buffer;
        fake->stream->deliverFrame(test::imageBuffer());
        fake->stream->deliverFrame(buffer);
        fake->stream->deliverFrame(test::imageBuffer());
        buffer = nullptr;
        ASSERT_EQ(frames.size(), 3U);
        EXPECT_EQ(frames[0]->attachment(kMetadata)["Key"], kNumber);
        EXPECT_EQ(frames[1] != nullptr, hasBuffer);
        EXPECT_EQ(out.expired(), !hasBuffer);
        if (hasBuffer) {
            EXPECT_EQ(frames[1]->attachment(kMetadata), metadata);
        }
        frames.clear();
        EXPECT_TRUE(out.expired());
    }
}

TEST_F(FaultyCapture, NamesWhatFails) {
    const auto wrapper = stream({{{StepKind::Call, 4}, Way::WithError},
                                 {{StepKind::Call, 5}, Way::Lost},  // no call of a stream is lost
                                 {{StepKind::Call, 6}, Way::WithoutError},
                                 {{StepKind::Event, 1}, Way::Lost}});
    int events = 0;
    wrapper->setValue(test::captureHandlers({}, [&](auto, auto, auto) { ++events; }), kHandlers,
                      nullptr);
    ErrorRef error;
    EXPECT_FALSE(wrapper->setValue(30, kRylCaptureStreamProperty_MinimumFrameRate, &error));
    constexpr auto kText = "4th call: setValue MinimumFrameRate fails with an error object";
    EXPECT_THAT(error, test::IsPlainError("faulty", 4, kText));
    error = nullptr;
    EXPECT_TRUE(wrapper->setValue(1, "port.own-key", &error));
    EXPECT_FALSE(wrapper->stop(&error));
    EXPECT_EQ(error, nullptr);
    fake->stream->deliverEvent(1, {}, 2);
    EXPECT_EQ(events, 0);

    const auto strikes = device->strikes();
    ASSERT_EQ(strikes.size(), 3U);
    EXPECT_EQ(strikes[0].text, kText);
    EXPECT_EQ(strikes[1].text, "6th call: stop fails without an error object");
    EXPECT_EQ(strikes[2].text, "1st event is lost");
    std::vector<std::string> steps;
    for (const Step& step : device->steps()) {
        steps.push_back(step.text());
    }
    EXPECT_THAT(steps,
                ::testing::ElementsAre(
                    "1st service: capture", "1st call: device", "2nd call: streams",
                    "3rd call: setValue VideoOutputHandlers", "4th call: setValue MinimumFrameRate",
                    "5th call: setValue port.own-key", "6th call: stop", "1st event"));
    EXPECT_EQ((Step{.place = {StepKind::Frame, 111}}).text(), "111th frame");
    EXPECT_EQ((Step{.place = {StepKind::Report, 1023}}).text(), "1023rd report");
}

TEST_F(FaultyCapture, LivesAsLongAsAClientHoldsAPart) {
    auto wrapper = stream();
    wrapper->setValue(test::captureHandlers([](const auto&, auto) {}), kHandlers, nullptr);
    const auto lifetime = device->lifetime();
    device.reset();
    connection = nullptr;
    wrapper = nullptr;
    EXPECT_FALSE(lifetime.expired()) << "the fake still has the handler";
    fake->stream->values.clear();
    EXPECT_TRUE(lifetime.expired());
}

struct NoCounters final : platform::MeterixFacility {
    using Samples = std::shared_ptr<const platform::MeterixSamples>;
    std::shared_ptr<const platform::MeterixChannels> simpleChannels(
        platform::ErrorSlot /*error*/) override {
        return std::make_shared<const platform::MeterixChannels>();
    }
    Samples sample(const platform::MeterixChannels& /*channels*/,
                   platform::ErrorSlot /*error*/) override {
        return nullptr;
    }
    Samples difference(const platform::MeterixSamples& /*later*/,
                       const platform::MeterixSamples& /*baseline*/,
                       platform::ErrorSlot /*error*/) override {
        return nullptr;
    }
};

TEST(FaultyDevice, NumbersTheCallsOfManyThreadsWithoutAGap) {
    constexpr int kThreads = 4;
    constexpr int kCallsEach = 500;
    const FaultyDevice device(
        [] { return platform::Services{.meterix = std::make_shared<NoCounters>()}; },
        {{{StepKind::Call, 1000}, Way::WithError}});
    std::atomic<int> failed{0};
    std::vector<std::thread> threads;
    for (int thread = 0; thread < kThreads; ++thread) {
        threads.emplace_back([&] {
            for (int call = 0; call < kCallsEach; ++call) {
                ErrorRef error;
                const auto channels = device.services().meterix->simpleChannels(&error);
                EXPECT_EQ(channels == nullptr, error != nullptr);
                failed += channels == nullptr ? 1 : 0;
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(failed, 1);
    EXPECT_EQ(device.strikes().size(), 1U);
    const std::vector<Step> steps = device.steps();
    ASSERT_EQ(steps.size(), 1U + kThreads * kCallsEach);
    for (std::size_t at = 1; at < steps.size(); ++at) {
        EXPECT_EQ(steps[at].place.number, at);
    }
}

}  // namespace
