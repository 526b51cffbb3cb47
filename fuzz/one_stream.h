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

namespace fuzz {

struct OneStream final : WLISPCapturePlugIn,
                         WLRylCaptureDevice,
                         WLRylCaptureStream,
                         std::enable_shared_from_this<OneStream> {
    std::shared_ptr<WLRylCaptureDevice> device(platform::ErrorSlot /*error*/) override {
        return shared_from_this();
    }
    std::optional<WLRylCaptureStreamList> streams(platform::ErrorSlot /*error*/) override {
        return WLRylCaptureStreamList{shared_from_this()};
    }
    bool requestControlOfStreams(const WLRylCaptureStreamList& /*streams*/,
                                 platform::ErrorSlot /*error*/) override {
        return true;
    }
    bool invalidate(platform::ErrorSlot /*error*/) override {
        handler = nullptr;
        return true;
    }
    platform::Value valueForProperty(std::string_view property,
                                     platform::ErrorSlot /*error*/) override {
        return property == kRylCaptureStreamProperty_PortType
                   ? platform::Value(kRylCapturePortType_FrontFacingInfraredCamera)
                   : platform::Value(platform::Dictionary());
    }
    bool setValue(const platform::Value& value,
                  std::string_view forProperty,
                  platform::ErrorSlot /*error*/) override {
        if (forProperty == kRylCaptureStreamProperty_VideoOutputHandlers) {
            handler = *value[kRylCaptureStreamVideoOutputID_PrimaryScaler]
                            [kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler]
                                .object<WLRylFrameHandler>();
        }
        return true;
    }
    bool start(platform::ErrorSlot /*error*/) override {
        onStart(handler);
        return true;
    }
    bool stop(platform::ErrorSlot /*error*/) override { return true; }

    std::function<void(const WLRylFrameHandler& handler)> onStart;
    WLRylFrameHandler handler;
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
