// ZRKirraImageStream: finds the Kirra sensor on the HID bus, switches it to active power and to
// sending images only, and hands each image report, parsed, to its delegate.
//
// Owner    Make it with std::make_shared. Its user owns it; it owns the sensor from matching until it
//          is destroyed (a sensor that a failed open left open is closed then, by the sensor object).
//          It holds its delegate weakly; the sensor's callback holds the stream weakly.
// Threads  Everything on the thread of the run loop that it was opened on. No locks.
// States   Empty, then opened once. close() may be called in any state and any number of times.
#ifndef ZR_KIRRA_IMAGE_STREAM_H
#define ZR_KIRRA_IMAGE_STREAM_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>

#include "kirra/image_record.h"
#include "platform/error.h"
#include "platform/run_loop.h"
#include "platform/welkin/hid.h"

// Receives what a stream delivers, on the thread of its run loop.
class ZRKirraImageStreamDelegate {
  public:
    virtual ~ZRKirraImageStreamDelegate() = default;

    virtual void handleImage(ZRKirraMendraImage image) = 0;

    // The sensor reported an error, handed on unchanged. The stream has closed itself already.
    virtual void streamDidError(const platform::ErrorRef& error) = 0;
};

class ZRKirraImageStream final : public std::enable_shared_from_this<ZRKirraImageStream> {
  public:
    // Finds, opens, configures and schedules the sensor on `runLoop`, in its default mode. Call it
    // once, on the run loop's thread. A failure undoes nothing of what was done before it: the sensor
    // may be left open, but it is not scheduled, so no report comes.
    //
    // Errors (ZRKirraImageExperimentErrorDomain; the underlying error is the sensor's, if it gave one):
    //   3  "Kirra device match was ambiguous!"   not exactly one device matches; never underlying
    //   3  "Could not open Kirra device."
    //   4  "Failed to override power mode to active!"
    //   5  "Failed to set streaming mode to images only!"
    // Throws platform::InternalInconsistency, "No HID Manager available?!", when there is no manager.
    bool openWithRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                         platform::ErrorSlot error);

    // Removes the callback, unschedules and closes the sensor, ignoring the outcome: each call, also
    // once the run loop is gone. Does nothing before a sensor was matched. A callback in progress
    // finishes.
    void close();

    // The delegate, or null once it is gone.
    std::shared_ptr<ZRKirraImageStreamDelegate> delegate() const { return _delegate.lock(); }
    void setDelegate(const std::shared_ptr<ZRKirraImageStreamDelegate>& delegate) {
        _delegate = delegate;
    }

  private:
    // A report shorter than an image record is not an image and is dropped; of a longer one the first
    // 792 bytes count.
    void _processInputReportWithID(std::int64_t reportID,
                                   std::span<const std::byte> data,
                                   const platform::ErrorRef& error);

    std::shared_ptr<WLIOHIDDeviceInterface> _hidDevice;
    std::weak_ptr<platform::RunLoop> _runLoop;
    std::weak_ptr<ZRKirraImageStreamDelegate> _delegate;
};

#endif
