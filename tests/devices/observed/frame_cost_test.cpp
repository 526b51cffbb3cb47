// What the decorator adds to a frame and to an event. Every allocation of this program comes here.
#include <cstdlib>
#include <new>

#include <gtest/gtest.h>

#include "devices/observed/capture.h"
#include "tests/devices/observed/fake_capture.h"

namespace {

thread_local int allocations = 0;

}  // namespace

// Not inlined: g++ takes the pair for a mismatch otherwise.
[[gnu::noinline]] void* operator new(std::size_t size) {
    ++allocations;
    void* memory = std::malloc(size);
    return memory != nullptr ? memory : throw std::bad_alloc();
}
[[gnu::noinline]] void operator delete(void* memory) noexcept {
    std::free(memory);
}
[[gnu::noinline]] void operator delete(void* memory, std::size_t /*size*/) noexcept {
    std::free(memory);
}

namespace {

class CountingObserver final : public observed::Observer {
  public:
    void frameDelivered(const observed::DeliveredFrame& /*frame*/) override { ++frames; }
    int frames = 0;
};

TEST(FrameCost, IsOneAllocation) {
    const auto observer = std::make_shared<CountingObserver>();
    const auto fake = std::make_shared<test::FakeCapture>();
    const auto plugIn = observed::observeCapture(fake, observed::Reporter(observer));
    const auto stream = plugIn->device(nullptr)->streams(nullptr)->back();
    ASSERT_TRUE(
        stream->setValue(test::captureHandlers([](const auto&, auto) {}, [](auto, auto, auto) {}),
                         kRylCaptureStreamProperty_VideoOutputHandlers, nullptr));
    const auto buffer = test::imageBuffer();
    fake->stream->deliverFrame(
        buffer);  // the first use of a dictionary makes what all of them share
    fake->stream->deliverEvent(1, {}, 2);
    const int before = allocations;
    for (int frame = 0; frame < 100; ++frame) {
        fake->stream->deliverFrame(buffer);
        fake->stream->deliverEvent(1, {}, 2);
    }
    // The fake looks its handlers up by a key of its own, which takes as many for both.
    const int after = allocations;
    EXPECT_EQ(observer->frames, 101);
    static_cast<void>(fake->stream->handlers());
    const int lookUp = allocations - after;
    EXPECT_EQ(after - before, 100 * (1 + 2 * lookUp));
}

}  // namespace
