// What a client wrote as a stream's video output handlers, as a device looks it up.
#ifndef ZR_DEVICES_WRITTEN_HANDLERS_H
#define ZR_DEVICES_WRITTEN_HANDLERS_H

#include <string_view>

#include "platform/value.h"
#include "platform/welkin/capture.h"

namespace devices {

// The handler under that key of the primary scaler; null for none and for an empty one. Valid as long as
// `handlers`.
template <class Handler>
const Handler* handlerIn(const platform::Value& handlers, std::string_view key) {
    const platform::Value& value = handlers[kRylCaptureStreamVideoOutputID_PrimaryScaler][key];
    const auto* handler = value.object<Handler>();
    return handler != nullptr && *handler ? handler : nullptr;
}

inline const WLRylFrameHandler* frameHandlerIn(const platform::Value& handlers) {
    return handlerIn<WLRylFrameHandler>(handlers,
                                        kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler);
}

inline const WLRylEventHandler* eventHandlerIn(const platform::Value& handlers) {
    return handlerIn<WLRylEventHandler>(handlers,
                                        kRylCaptureStreamVideoOutputHandlerKey_EventHandler);
}

}  // namespace devices

#endif
