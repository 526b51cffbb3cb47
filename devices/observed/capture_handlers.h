// The handlers that a client writes to a stream, wrapped so that each call of them is observed.
#ifndef ZR_DEVICES_OBSERVED_CAPTURE_HANDLERS_H
#define ZR_DEVICES_OBSERVED_CAPTURE_HANDLERS_H

#include <memory>

#include "devices/observed/capture_watch.h"
#include "platform/value.h"

namespace observed {

// The value of the handlers property as the device gets it: the frame and the event handler of the
// primary scaler are watched.
platform::Value watchHandlers(const platform::Value& handlers,
                              const std::shared_ptr<StreamWatch>& stream);

// What the client wrote, from the value that the device returned.
platform::Value unwatchHandlers(const platform::Value& handlers);

// Whether one of the outputs has a frame handler.
bool hasFrameHandler(const platform::Value& handlers);

// Whether a watched handler, of any stream, is running on this thread.
bool isInsideHandler();

}  // namespace observed

#endif
