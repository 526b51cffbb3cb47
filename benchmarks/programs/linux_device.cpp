// zr_linux_device DESCRIPTION frames FRAMES PER_SECOND
// zr_linux_device DESCRIPTION reports REPORTS
//
// The Linux device alone: what its services spend on each frame of a camera, or each report of a sensor, with a client
// that looks at a number in it and lets it go. zr_linux_calls is the peer.
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <semaphore>

#include "benchmarks/programs/item_costs.h"
#include "devices/linux/kind.h"
#include "platform/run_loop.h"
#include "platform/welkin/capture.h"
#include "platform/welkin/hid.h"

namespace {

using platform::Dictionary;
using platform::ErrorRef;
using platform::Value;

[[noreturn]] void fail(const char* what, const ErrorRef& error) {
    std::fprintf(stderr, "zr_linux_device: %s: %s\n", what,
                 error != nullptr ? error->localizedDescription().c_str() : "no reason given");
    std::exit(1);
}

void stream(WLISPCapturePlugIn& plugIn, unsigned long frames, int perSecond) {
    ErrorRef error;
    ItemCosts costs(frames);
    std::binary_semaphore over(0);
    WLRylFrameHandler onFrame = [&](const platform::ImageBufferRef& buffer, platform::MediaTime) {
        const Value& metadata =
            buffer->attachment(kRylCaptureSampleBufferAttachmentKey_MetadataDictionary);
        if (!metadata[kRylCaptureStreamMetadata_InfraredLightSource].asNumber().isPresent()) {
            fail("a frame without light source", nullptr);
        }
        if (costs.count()) {
            over.release();
        }
    };
    const Dictionary handlers = {{kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler,
                                  Value::opaque(std::move(onFrame))}};
    const auto device = plugIn.device(&error);
    const WLRylCaptureStreamList streams = *device->streams(&error);
    WLRylCaptureStream& stream = *streams[0];
    if (!device->requestControlOfStreams(streams, &error) ||
        !stream.setValue(0, kRylCaptureStreamProperty_FormatIndex, &error) ||
        !stream.setValue(perSecond, kRylCaptureStreamProperty_MaximumFrameRate, &error) ||
        !stream.setValue(Dictionary{{kRylCaptureStreamVideoOutputID_PrimaryScaler, handlers}},
                         kRylCaptureStreamProperty_VideoOutputHandlers, &error) ||
        !stream.start(&error)) {
        fail("the stream did not start", error);
    }
    over.acquire();
    // The description calls the lost frames so.
    const Value counters = stream.valueForProperty(kRylCaptureStreamProperty_ErrorCounters, &error);
    const platform::Number lost = counters[kRylCaptureStreamPropertyValue_I2CErrorCount].asNumber();
    if (!stream.stop(&error) || !device->invalidate(&error) || !lost.isPresent()) {
        fail("the stream did not end well", error);
    }
    costs.print(lost.as<std::uint64_t>());
}

void read(platform::HidFacility& facility, unsigned long reports) {
    ErrorRef error;
    ItemCosts costs(reports);
    const auto runLoop = platform::RunLoop::forThisThread();
    const auto manager = facility.createManager();
    manager->enumerateDevicesMatching(
        {{{platform::kHidPrimaryUsagePage, 0xFF00}, {platform::kHidPrimaryUsage, 0x24}}});
    const auto sensors = manager->devices();
    if (sensors.size() != 1 || !sensors[0]->open(&error)) {
        fail("the sensor did not open", error);
    }
    WLIOHIDDeviceInterface& sensor = *sensors[0];
    std::uint32_t first = 0;
    std::uint32_t last = 0;
    sensor.setInputReportCallback(
        [&](std::int64_t, std::span<const std::byte> data, const ErrorRef& problem) {
            if (problem != nullptr) {
                fail("a report", problem);
            }
            std::memcpy(&last, data.data() + 4, sizeof last);
            first = first == 0 ? last : first;
            if (costs.count(latencyOf(data.data()))) {
                runLoop->stop();
            }
        });
    sensor.scheduleWithRunLoop(runLoop, platform::kRunLoopDefaultMode);
    for (const std::uint8_t id : {171, 172}) {
        const std::byte report[] = {std::byte{id}, std::byte{1}};
        if (!sensor.setFeatureReportWithID(id, report, &error)) {
            fail("switching the sensor on", error);
        }
    }
    constexpr double kPatience = 100;  // seconds
    if (runLoop->run(platform::kRunLoopDefaultMode, kPatience) !=
        platform::RunLoopOutcome::Stopped) {
        fail("the reports did not come", nullptr);
    }
    costs.print(last - first + 1 - costs.seen());
}

}  // namespace

int main(int count, char** arguments) {
    const bool isStream = count == 5 && std::strcmp(arguments[2], "frames") == 0;
    const bool isSensor = count == 4 && std::strcmp(arguments[2], "reports") == 0;
    const unsigned long items = isStream || isSensor ? std::strtoul(arguments[3], nullptr, 10) : 0;
    if (items == 0) {
        std::fprintf(stderr,
                     "usage: zr_linux_device DESCRIPTION frames FRAMES PER_SECOND\n"
                     "       zr_linux_device DESCRIPTION reports REPORTS\n");
        return 64;
    }
    try {
        const devices::Device device =
            linux_device::openDevice(arguments[1], linux_device::Machine());
        if (isStream) {
            stream(*device.services.capture, items, std::atoi(arguments[4]));
        } else {
            read(*device.services.hid, items);
        }
        return 0;
    } catch (const std::exception& problem) {
        std::fprintf(stderr, "zr_linux_device: %s\n", problem.what());
        return 1;
    }
}
