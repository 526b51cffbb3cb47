// The decorator around the capture service.
#ifndef ZR_DEVICES_OBSERVED_CAPTURE_H
#define ZR_DEVICES_OBSERVED_CAPTURE_H

#include <cstddef>
#include <memory>

#include "devices/observed/reporter.h"
#include "platform/welkin/capture.h"

namespace observed {

class ObservedCapture : public WLISPCapturePlugIn {
  public:
    // The image buffers, over all devices and streams, that the client holds now. Any thread.
    virtual std::size_t lentBuffers() const = 0;
};

// Reports the frames and events that the primary scaler's handlers receive, the errors of every call,
// and these broken rules:
//
//   The client   a property written, or a stream started, without control of the stream
//                a stream started without a frame handler or while it runs, or stopped while it does not
//                a device or a stream used after invalidate()
//                image buffers held for more than five seconds: looked at when stop() is called
//                image buffers never given back: those still out one second after invalidate()
//   The device   a handler called after invalidate() had returned (once per stream)
//                two frame handlers of one stream called at once (once per stream)
//
// Waiting: invalidate() waits for buffers that are still out, at most a second, so that work that is
// queued already can give its own back. Inside a handler it neither waits nor reports them.
//
// Lifetime: each device() is a new wrapper. A device's stream has one wrapper while that is held, and
// what is known of it lasts as long as the stream. Wrappers may go on any thread, in any order, inside a
// handler as well. No lock is held while the device, a handler or the observer is called.
//
// Cost: a frame takes one allocation, the count of its buffer; an event none.
//
// Null for a null plug-in.
std::shared_ptr<ObservedCapture> observeCapture(std::shared_ptr<WLISPCapturePlugIn> plugIn,
                                                const Reporter& reporter);

}  // namespace observed

#endif
