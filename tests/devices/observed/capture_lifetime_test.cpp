// Observed devices and streams that go on any thread, in any order, while frames arrive.
#include <chrono>
#include <functional>
#include <future>
#include <memory>
#include <mutex>
#include <thread>
#include <utility>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "devices/observed/capture.h"
#include "devices/simulator/capture_service.h"
#include "tests/devices/observed/fake_capture.h"
#include "tests/support/capture_witness.h"

namespace {

using platform::ImageBufferRef;
using platform::MediaTime;
using ::testing::IsEmpty;

constexpr int kRounds = 50;

class CaptureLifetime : public ::testing::Test {
  protected:
    CaptureLifetime() { profile.streams.back().events = {{.frame = 2, .code = 1}}; }
    ~CaptureLifetime() override { EXPECT_THAT(witness->waitForMisuses(0), IsEmpty()); }

    // A new device with a running stream.
    void start(
        WLRylFrameHandler frame, WLRylEventHandler event = [](auto, auto, auto) {}) {
        plugIn = observed::observeCapture(
            simulator::makeCapturePlugIn(profile, 0, std::make_shared<simulator::StreamProgress>()),
            observed::Reporter(witness));
        device = plugIn->device(nullptr);
        stream = device->streams(nullptr)->back();
        ASSERT_TRUE(device->requestControlOfStreams({stream}, nullptr));
        const auto ended = std::make_shared<std::promise<void>>();
        handlersEnd = ended->get_future();
        std::shared_ptr<void> token(nullptr, [ended](void*) { ended->set_value(); });
        ASSERT_TRUE(stream->setValue(
            test::captureHandlers(
                [frame = std::move(frame), token = std::move(token)](
                    const ImageBufferRef& buffer, MediaTime time) { frame(buffer, time); },
                std::move(event)),
            kRylCaptureStreamProperty_VideoOutputHandlers, nullptr));
        ASSERT_TRUE(stream->start(nullptr));
    }
    // The first buffer of a new device with a running stream.
    ImageBufferRef firstBuffer() {
        const auto first = std::make_shared<std::promise<ImageBufferRef>>();
        start([first, given = std::make_shared<std::once_flag>()](const auto& buffer, auto) {
            std::call_once(*given, [&] { first->set_value(buffer); });
        });
        return first->get_future().get();
    }
    // Waits until its handlers have been dropped: what they did is visible then.
    void awaitHandlersEnd() const { handlersEnd.wait(); }

    simulator::CaptureProfile profile = simulator::healthyCapture();
    std::shared_ptr<test::CaptureWitness> witness = std::make_shared<test::CaptureWitness>();
    std::shared_ptr<observed::ObservedCapture> plugIn;
    std::shared_ptr<WLRylCaptureDevice> device;
    std::shared_ptr<WLRylCaptureStream> stream;
    std::future<void> handlersEnd;
};

// The last references to everything go inside a frame handler, after a stop, or inside an event handler.
TEST_F(CaptureLifetime, EverythingGoesInsideAHandler) {
    for (int round = 0; round < kRounds; ++round) {
        struct Owned {
            std::shared_ptr<observed::ObservedCapture> plugIn;
            std::shared_ptr<WLRylCaptureDevice> device;
            std::shared_ptr<WLRylCaptureStream> stream;
        } owned;
        std::promise<void> handedOver;
        const auto isHandedOver = handedOver.get_future().share();
        const auto letGo = [&owned, isHandedOver](bool inFrame) {
            isHandedOver.wait();
            if (inFrame) {
                EXPECT_TRUE(owned.stream == nullptr || owned.stream->stop(nullptr));
            }
            std::exchange(owned, {});
        };
        const bool inFrame = round % 2 == 0;
        start([=](const auto&, auto) { inFrame ? letGo(true) : void(); },
              [=](auto, auto, auto) { inFrame ? void() : letGo(false); });
        owned = {std::move(plugIn), std::move(device), std::move(stream)};
        handedOver.set_value();
        awaitHandlersEnd();
    }
}

// invalidate() waits for the handler in progress, and none comes after it.
TEST_F(CaptureLifetime, IsInvalidatedWhileItDelivers) {
    for (int round = 0; round < kRounds; ++round) {
        const std::size_t before = witness->waitFor(0).size();
        std::size_t frames = 0;  // ordered by nothing but the end of invalidate()
        start([&](const auto&, auto) { ++frames; });
        witness->waitFor(before + static_cast<std::size_t>(round % 5));
        ASSERT_TRUE(device->invalidate(nullptr));
        EXPECT_EQ(handlersEnd.wait_for(std::chrono::seconds(0)), std::future_status::ready);
        EXPECT_EQ(witness->waitFor(0).size(), before + frames);
        EXPECT_EQ(plugIn->lentBuffers(), 0U);
    }
}

// stop() under a lock of the client's, on another thread than the one that starts, while buffers are
// given back on a third.
TEST_F(CaptureLifetime, IsStoppedOnAnotherThread) {
    for (int round = 0; round < kRounds; ++round) {
        std::mutex clients;
        std::thread giver([held = firstBuffer()]() mutable { held = nullptr; });
        std::thread stopper([&, stopped = stream] {
            const std::lock_guard lock(clients);
            EXPECT_TRUE(stopped->stop(nullptr));
        });
        stream = nullptr;
        {
            const std::lock_guard lock(clients);
            static_cast<void>(device->streams(nullptr));
        }
        stopper.join();
        giver.join();
        ASSERT_TRUE(device->invalidate(nullptr));
    }
}

// Buffers, the observer and the service end in every order.
TEST_F(CaptureLifetime, BuffersOutliveWhatTheyCameFrom) {
    for (int round = 0; round < kRounds; ++round) {
        ImageBufferRef buffer = firstBuffer();
        if (round % 2 == 0) {
            witness = std::make_shared<test::CaptureWitness>();
        }
        plugIn = nullptr;
        stream = nullptr;
        device = nullptr;
        constexpr auto kMetadata = kRylCaptureSampleBufferAttachmentKey_MetadataDictionary;
        EXPECT_TRUE(buffer->attachment(kMetadata).isPresent());
        buffer = nullptr;
        awaitHandlersEnd();
    }
}

}  // namespace
