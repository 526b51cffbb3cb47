// A capture service whose one stream takes everything; who holds it plays the device in `onStart`, which
// is called with the frame handler.
#ifndef ZR_FUZZ_ONE_STREAM_H
#define ZR_FUZZ_ONE_STREAM_H

#include <functional>
#include <memory>
#include <utility>

#include "devices/simulator/meterix_facility.h"
#include "platform/services.h"
#include "platform/welkin/capture.h"
#include "tests/support/hand_fed_camera.h"

namespace fuzz {

struct OneStream final : test::HandFedCapture {
    OneStream() : HandFedCapture([](std::int64_t /*frame*/) { return nullptr; }) {}

    bool setValue(const platform::Value& value,
                  std::string_view forProperty,
                  platform::ErrorSlot /*error*/) override {
        if (forProperty == kRylCaptureStreamProperty_VideoOutputHandlers) {
            handlers = value;
        }
        return true;
    }
    bool start(platform::ErrorSlot /*error*/) override {
        onStart(*handlers[kRylCaptureStreamVideoOutputID_PrimaryScaler]
                         [kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler]
                             .object<WLRylFrameHandler>());
        return true;
    }

    std::function<void(const WLRylFrameHandler& handler)> onStart;
    platform::Value handlers;
};

// Installs a new one, and a facility with one counter.
inline std::shared_ptr<OneStream> installOneStream() {
    auto stream = std::make_shared<OneStream>();
    simulator::MeterixProfile counters;
    counters.channels.push_back({"Q71ISP", "Q71ISP Events", "one"});
    platform::installServices(
        {.capture = stream,
         .meterix = simulator::makeMeterixFacility(std::move(counters),
                                                   std::make_shared<simulator::StreamProgress>())});
    return stream;
}

inline platform::ImageBufferRef bufferWith(platform::Value metadata) {
    return std::make_shared<const platform::ImageBuffer>(platform::Dictionary{
        {kRylCaptureSampleBufferAttachmentKey_MetadataDictionary, std::move(metadata)}});
}

}  // namespace fuzz

#endif
