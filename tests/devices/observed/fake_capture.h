// A capture service in which the test plays the device.
#ifndef ZR_TESTS_DEVICES_OBSERVED_FAKE_CAPTURE_H
#define ZR_TESTS_DEVICES_OBSERVED_FAKE_CAPTURE_H

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <utility>

#include "platform/welkin/capture.h"

namespace test {

// The handlers property of a client with these two handlers.
inline platform::Value captureHandlers(WLRylFrameHandler frame, WLRylEventHandler event = {}) {
    using platform::Dictionary;
    using platform::Value;
    return Dictionary{{kRylCaptureStreamVideoOutputID_PrimaryScaler,
                       Dictionary{{kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler,
                                   Value::opaque(std::move(frame))},
                                  {kRylCaptureStreamVideoOutputHandlerKey_EventHandler,
                                   Value::opaque(std::move(event))}}}};
}

inline platform::ImageBufferRef imageBuffer() {
    return std::make_shared<const platform::ImageBuffer>(
        platform::Dictionary{{kRylCaptureSampleBufferAttachmentKey_MetadataDictionary,
                              platform::Dictionary{{"Key", 7}}}});
}

// Takes everything, or fails every call with `error`, and keeps its handlers for ever.
struct FakeStream final : WLRylCaptureStream {
    bool outcome(platform::ErrorSlot slot) const {
        if (fails) {
            static_cast<void>(platform::failWith(slot, error));
        }
        return !fails;
    }
    platform::Value valueForProperty(std::string_view property, platform::ErrorSlot slot) override {
        return outcome(slot) ? values[std::string(property)] : platform::Value();
    }
    bool setValue(const platform::Value& value,
                  std::string_view forProperty,
                  platform::ErrorSlot slot) override {
        if (outcome(slot)) {
            values[std::string(forProperty)] = value;
        }
        return !fails;
    }
    bool start(platform::ErrorSlot slot) override { return outcome(slot); }
    bool stop(platform::ErrorSlot slot) override { return outcome(slot); }

    const platform::Value& handlers() {
        return values[std::string(kRylCaptureStreamProperty_VideoOutputHandlers)];
    }
    template <class Handler>
    const Handler& handler(std::string_view key) {
        return *handlers()[kRylCaptureStreamVideoOutputID_PrimaryScaler][key].object<Handler>();
    }
    void deliverFrame(const platform::ImageBufferRef& buffer, platform::MediaTime time = {}) {
        handler<WLRylFrameHandler>(kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler)(
            buffer, time);
    }
    void deliverEvent(std::int32_t code, platform::MediaTime time, std::int64_t info) {
        handler<WLRylEventHandler>(kRylCaptureStreamVideoOutputHandlerKey_EventHandler)(code, time,
                                                                                        info);
    }

    std::map<std::string, platform::Value> values;
    bool fails = false;
    platform::ErrorRef error;
};

struct FakeCapture final : WLISPCapturePlugIn,
                           WLRylCaptureDevice,
                           std::enable_shared_from_this<FakeCapture> {
    std::shared_ptr<WLRylCaptureDevice> device(platform::ErrorSlot /*slot*/) override {
        return shared_from_this();
    }
    std::optional<WLRylCaptureStreamList> streams(platform::ErrorSlot /*slot*/) override {
        return WLRylCaptureStreamList{stream};
    }
    bool requestControlOfStreams(const WLRylCaptureStreamList& streams,
                                 platform::ErrorSlot /*slot*/) override {
        requested = streams;
        return true;
    }
    bool invalidate(platform::ErrorSlot /*slot*/) override {
        if (invalidated) {
            invalidated();
        }
        return true;
    }

    std::shared_ptr<FakeStream> stream = std::make_shared<FakeStream>();
    WLRylCaptureStreamList requested;
    std::function<void()> invalidated;
};

}  // namespace test

#endif
