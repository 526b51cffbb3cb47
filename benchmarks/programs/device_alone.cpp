// zr_device_alone FRAMES [handed-over]: the simulated infrared camera at its own pace, with handlers that do
// nothing but count. What a run costs beyond this is the bench's and the plug-in's. handed-over: each frame also
// wakes a thread at nice -5, which wakes one at nice 10, as a run's queues have it, on nothing but the system call.
// What a run costs beyond that is work.
#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <semaphore>
#include <thread>
#include <utility>

#include <sys/resource.h>
#include <unistd.h>

#include "devices/simulator/capture_service.h"
#include "platform/sync.h"

namespace {

// A thread that does one thing each time that it is woken.
class Sleeper {
  public:
    Sleeper(int nice, std::function<void()> body)
        : _thread([this, nice, body = std::move(body)] {
            setpriority(PRIO_PROCESS, static_cast<id_t>(gettid()), nice);
            while (true) {
                _word.sleepAt(kAsleep);
                const std::uint32_t state = _word.exchange(kAsleep, std::memory_order_acq_rel);
                if (state == kEnd) {
                    return;
                }
                if (state == kAwake) {
                    body();
                }
            }
        }) {}
    ~Sleeper() {
        _set(kEnd);
        _thread.join();
    }
    Sleeper(const Sleeper&) = delete;
    Sleeper& operator=(const Sleeper&) = delete;

    void wake() { _set(kAwake); }

  private:
    static constexpr std::uint32_t kAsleep = 0;
    static constexpr std::uint32_t kAwake = 1;
    static constexpr std::uint32_t kEnd = 2;

    void _set(std::uint32_t state) {
        _word.exchange(state, std::memory_order_acq_rel);
        _word.wakeOne();
    }

    platform::SleepWord _word{kAsleep};
    std::thread _thread;
};

int stream(unsigned long frames, const std::function<void()>& handOver) {
    simulator::CaptureProfile profile = simulator::healthyCapture();
    profile.streams = {profile.streams.back()};
    const auto progress = std::make_shared<simulator::StreamProgress>();
    const auto device = simulator::makeCapturePlugIn(profile, 1, progress)->device(nullptr);
    const WLRylCaptureStreamList streams = *device->streams(nullptr);
    std::binary_semaphore over(0);
    WLRylFrameHandler onFrame = [&over, frames, handOver, seen = 0UL](
                                    const platform::ImageBufferRef&, platform::MediaTime) mutable {
        handOver();
        if (++seen == frames) {
            over.release();
        }
    };
    WLRylEventHandler onEvent = [](std::int32_t, platform::MediaTime, std::int64_t) {};
    const platform::Dictionary handlers = {
        {kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler,
         platform::Value::opaque(std::move(onFrame))},
        {kRylCaptureStreamVideoOutputHandlerKey_EventHandler,
         platform::Value::opaque(std::move(onEvent))}};
    platform::ErrorRef error;
    if (!device->requestControlOfStreams(streams, &error) ||
        !streams[0]->setValue(
            platform::Dictionary{{kRylCaptureStreamVideoOutputID_PrimaryScaler, handlers}},
            kRylCaptureStreamProperty_VideoOutputHandlers, &error) ||
        !streams[0]->start(&error)) {
        std::fprintf(stderr, "zr_device_alone: the stream did not start\n");
        return 2;
    }
    over.acquire();
    streams[0]->stop(nullptr);
    device->invalidate(nullptr);
    return 0;
}

}  // namespace

int main(int count, char** arguments) {
    const unsigned long frames = count > 1 ? std::strtoul(arguments[1], nullptr, 10) : 0;
    const bool handsOver = count == 3 && std::strcmp(arguments[2], "handed-over") == 0;
    if (frames == 0 || count > (handsOver ? 3 : 2)) {
        std::fprintf(stderr, "usage: zr_device_alone FRAMES [handed-over]\n");
        return 64;
    }
    if (!handsOver) {
        return stream(frames, [] {});
    }
    Sleeper processing(10, [] {});
    Sleeper receiving(-5, [&processing] { processing.wake(); });
    return stream(frames, [&receiving] { receiving.wake(); });
}
