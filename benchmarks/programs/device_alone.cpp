// zr_device_alone FRAMES: the simulated infrared camera at its own pace, with handlers that do nothing but
// count. What a run costs beyond this is the bench's and the plug-in's.
#include <cstdio>
#include <cstdlib>
#include <semaphore>

#include "devices/simulator/capture_service.h"

namespace {

int stream(unsigned long frames) {
    simulator::CaptureProfile profile = simulator::healthyCapture();
    profile.streams = {profile.streams.back()};
    const auto progress = std::make_shared<simulator::StreamProgress>();
    const auto device = simulator::makeCapturePlugIn(profile, 1, progress)->device(nullptr);
    const WLRylCaptureStreamList streams = *device->streams(nullptr);
    std::binary_semaphore over(0);
    WLRylFrameHandler onFrame = [&over, frames, seen = 0UL](const platform::ImageBufferRef&,
                                                            platform::MediaTime) mutable {
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
    const unsigned long frames = count == 2 ? std::strtoul(arguments[1], nullptr, 10) : 0;
    if (frames == 0) {
        std::fprintf(stderr, "usage: zr_device_alone FRAMES\n");
        return 64;
    }
    return stream(frames);
}
