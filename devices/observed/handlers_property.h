// The handlers of a stream's primary scaler, as a decorator exchanges them for its own.
#ifndef ZR_DEVICES_OBSERVED_HANDLERS_PROPERTY_H
#define ZR_DEVICES_OBSERVED_HANDLERS_PROPERTY_H

#include <string_view>
#include <utility>

#include "platform/value.h"
#include "platform/welkin/capture.h"

namespace observed {

inline constexpr std::string_view kOutput = kRylCaptureStreamVideoOutputID_PrimaryScaler;
inline constexpr std::string_view kFrameHandler =
    kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler;
inline constexpr std::string_view kEventHandler =
    kRylCaptureStreamVideoOutputHandlerKey_EventHandler;

namespace detail {

// The handlers property with another frame and event handler of the output, if it has those.
template <class ReplaceFrameHandler, class ReplaceEventHandler>
platform::Value replaceHandlers(const platform::Value& handlers,
                                ReplaceFrameHandler replaceFrameHandler,
                                ReplaceEventHandler replaceEventHandler) {
    const platform::Dictionary* output = handlers[kOutput].dictionary();
    if (output == nullptr) {
        return handlers;
    }
    platform::MutableDictionary replaced = output->entries();
    if (const auto* handler = (*output)[kFrameHandler].object<WLRylFrameHandler>()) {
        replaced.set(kFrameHandler, replaceFrameHandler((*output)[kFrameHandler], *handler));
    }
    if (const auto* handler = (*output)[kEventHandler].object<WLRylEventHandler>()) {
        replaced.set(kEventHandler, replaceEventHandler((*output)[kEventHandler], *handler));
    }
    platform::MutableDictionary outputs = handlers.dictionary()->entries();
    outputs.set(kOutput, platform::Dictionary(std::move(replaced)));
    return platform::Dictionary(std::move(outputs));
}

template <class Handler, class Wrapper, class Shared>
auto wrapping(const Shared& shared) {
    return [&shared](const platform::Value& client, const Handler& handler) {
        return handler ? platform::Value::opaque(Handler(Wrapper(client, shared))) : client;
    };
}

template <class Handler, class Wrapper>
platform::Value clientOf(const platform::Value& value, const Handler& handler) {
    const auto* wrapper = handler.template target<Wrapper>();
    return wrapper != nullptr ? wrapper->client() : value;
}

}  // namespace detail

// The value of the handlers property as the device gets it: the frame and the event handler of the primary
// scaler become a FrameWrapper and an EventWrapper, made from the Value that holds the client's handler and
// `shared`. (A copy of the function would be another object, with a state of its own.) Every other entry,
// and what is not a handler, stays as it is.
template <class FrameWrapper, class EventWrapper, class Shared>
platform::Value wrapHandlers(const platform::Value& handlers, const Shared& shared) {
    return detail::replaceHandlers(handlers,
                                   detail::wrapping<WLRylFrameHandler, FrameWrapper>(shared),
                                   detail::wrapping<WLRylEventHandler, EventWrapper>(shared));
}

// What the client wrote, from the value that the device returned: the wrappers' client().
template <class FrameWrapper, class EventWrapper>
platform::Value unwrapHandlers(const platform::Value& handlers) {
    return detail::replaceHandlers(handlers, detail::clientOf<WLRylFrameHandler, FrameWrapper>,
                                   detail::clientOf<WLRylEventHandler, EventWrapper>);
}

}  // namespace observed

#endif
