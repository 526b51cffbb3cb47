// A capture service whose device is its one stream, the front infrared camera. It takes every value and keeps
// the handlers. A derived class plays the camera in start() and stop().
#ifndef ZR_TESTS_SUPPORT_ONE_STREAM_CAPTURE_H
#define ZR_TESTS_SUPPORT_ONE_STREAM_CAPTURE_H

#include <memory>
#include <optional>
#include <string_view>
#include <utility>

#include "platform/image_buffer.h"
#include "platform/welkin/capture.h"

namespace test {

// A frame's buffer; there may be anything in place of its metadata.
inline platform::ImageBufferRef bufferWith(platform::Value metadata) {
    return std::make_shared<const platform::ImageBuffer>(platform::Dictionary{
        {kRylCaptureSampleBufferAttachmentKey_MetadataDictionary, std::move(metadata)}});
}

class OneStreamCapture : public WLRylCaptureStream,
                         public WLRylCaptureDevice,
                         public WLISPCapturePlugIn,
                         public std::enable_shared_from_this<OneStreamCapture> {
  public:
    platform::Value valueForProperty(std::string_view property,
                                     platform::ErrorSlot /*error*/) override {
        if (property == kRylCaptureStreamProperty_PortType) {
            return kRylCapturePortType_FrontFacingInfraredCamera;
        }
        return platform::Dictionary();
    }
    bool setValue(const platform::Value& value,
                  std::string_view forProperty,
                  platform::ErrorSlot /*error*/) override {
        if (forProperty == kRylCaptureStreamProperty_VideoOutputHandlers) {
            _handlers = value;
        }
        return true;
    }

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
    bool invalidate(platform::ErrorSlot /*error*/) override { return true; }

  protected:
    // Must have been written.
    const WLRylFrameHandler& frameHandler() const {
        return *_handlers[kRylCaptureStreamVideoOutputID_PrimaryScaler]
                         [kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler]
                             .object<WLRylFrameHandler>();
    }

  private:
    platform::Value _handlers;
};

}  // namespace test

#endif
