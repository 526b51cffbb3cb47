// ZRVantorFaultExperiment: streams the infrared camera of the Vantor depth module with its projector
// in the dense-interleaved structured-light mode, at a fixed 30 frames per second, until the requested
// number of frames was validated or the time-out expires. Its result holds the number of frames
// received, the camera's hardware error counters and how far the image signal processor's event
// counters moved meanwhile.
//
// A frame's road: the capture service's thread only takes a reference on the buffer and queues a
// receipt; the receiving queue (highest priority) counts the frame, makes its description and gives
// the buffer back; the processing queue (lowest priority) checks that the projector lit the frame.
// An unlit frame, bad metadata, the last frame and the time-out all ask for the same stop, which
// happens once: the first to ask decides the outcome.
//
//     configured -> streaming -> stopped -> torn down      one run per instance
//
// Owner    Make it with std::make_shared. The host owns it; a queued processing item and the pending
//          time-out own it too, so it outlives a finished run until its time-out has passed; its
//          threads do not. Handlers and receipts do not own it. The last reference may go on any
//          thread, also inside one of its items or a handler.
// Threads  The public operations: the host's thread, one at a time. run() blocks that thread until
//          streaming is over.
//          The threads of both queues start before the stream does and end after its stop. When they
//          cannot be started, run() throws std::system_error and the stream never starts. A frame or
//          an event that is delivered after the stop and finds no thread is dropped.
// Locks    The stop runs under the experiment's lock, the capture service's stop() included. The
//          handlers never take it, so a service may wait for a handler inside stop().
#ifndef ZR_VANTOR_FAULT_FAULT_EXPERIMENT_H
#define ZR_VANTOR_FAULT_FAULT_EXPERIMENT_H

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "frame/host_interface.h"
#include "platform/sync.h"
#include "platform/welkin/capture.h"
#include "platform/welkin/meterix.h"
#include "platform/work_queue.h"

class ZRVantorFrameDescription;

class ZRVantorFaultExperiment final : public ZRExperiment,
                                      public ZRSetup,
                                      public ZRTeardown,
                                      public std::enable_shared_from_this<ZRVantorFaultExperiment> {
  public:
    // Uses the front infrared camera.
    ZRVantorFaultExperiment();
    // Uses the first stream of that port type.
    explicit ZRVantorFaultExperiment(std::string_view capturePort);

    ZRDescription experimentDescription() const override;

    // Parameters: "frameCount", the number of frames to validate (0: the first lit frame ends the
    // run), and "timeout" in seconds (NaN counts as 0, infinity as never). Missing ones read as 0.
    // Errors (ZRErrorDomain 5, no underlying error): "%@ cannot be negative!", "frameCount" first.
    // A frame count that was accepted is kept when the time-out is not.
    bool setupWithParameters(const platform::Dictionary& parameters,
                             ZRDiagnosticHost* host,
                             platform::ErrorSlot error) override;

    // Configures, streams and builds the result. A run that ended by its time-out has a result too:
    // the frame count in it is the host's to judge. On success the slot may hold "Failed to get
    // stream port type!": a stream without a readable port type is reported and passed over.
    //
    // ZRCapturePlugInErrorDomain, with what the capture service reported last as underlying error:
    //   200 no device                          207 minimum or maximum frame rate refused
    //   202 no streams, no port type,          208 outputs or handlers refused
    //       no such stream (never underlying)  209 format index refused
    //   203 no control of the stream           211 automatic exposure not switched off
    //   204 stream did not start               212 light source refused
    // ZRMeterixErrorDomain, with what was reported last as underlying error:
    //   100 no counter baseline, no counter difference
    // ZRCapturePlugInErrorDomain, raised while streaming, without underlying error:
    //   205 stream did not stop                210 error counters cannot be read
    //   206 metadata missing or wrong, frame   213 frame not lit for safety
    //       not lit for an unknown reason
    // A failed run undoes nothing: teardown() gives the device up.
    ZRExperimentResultRef run(platform::ErrorSlot error) override;

    // Invalidates the device. Error (ZRCapturePlugInErrorDomain 200): "Failed to invalidate the
    // capture device.", with what the service reported as underlying error; without a device too.
    bool teardown(platform::ErrorSlot error) override;

    // The port type of the stream to use.
    const std::string& port() const { return _port; }
    void setPort(std::string_view port) { _port = port; }

    // The sensor format that is written to the stream.
    std::uint64_t formatIndex() const { return _formatIndex; }
    void setFormatIndex(std::uint64_t formatIndex) { _formatIndex = formatIndex; }

    // The device and the stream in use; null until run() has found them.
    const std::shared_ptr<WLRylCaptureDevice>& device() const { return _device; }
    void setDevice(std::shared_ptr<WLRylCaptureDevice> device) { _device = std::move(device); }
    const std::shared_ptr<WLRylCaptureStream>& stream() const { return _stream; }
    void setStream(std::shared_ptr<WLRylCaptureStream> stream) { _stream = std::move(stream); }

  private:
    // The phases of run(). `reported` is the run's one variable for what services report: a call
    // that fails without an error object leaves the last one in it.
    bool _selectStream(platform::ErrorRef& reported, platform::ErrorSlot error);
    bool _configureStream(platform::ErrorRef& reported, platform::ErrorSlot error);
    platform::Value _videoOutputHandlers();
    ZRExperimentResultRef _buildResult() const;

    // The capture service's threads. They queue one item and return.
    void _handlePixelBuffer(platform::ImageBufferRef buffer, platform::MediaTime withTimeStamp);
    void _handleEvent(std::int32_t event, platform::MediaTime withTimeStamp, std::int64_t info);

    // The receiving queue.
    void _receiveFrame(platform::ImageBufferRef buffer, platform::MediaTime time);
    // The processing queue.
    void _processFrame(const ZRVantorFrameDescription& description, std::uint64_t ordinal);

    // Both queues. Stops the stream, records the outcome and wakes run(), the first time; nothing
    // afterwards. `error` is null for a stop that nothing went wrong with.
    void _stopWithError(platform::ErrorRef error);

    // The host's thread; streaming begins after the last write.
    std::uint64_t _stopCount = 0;
    double _timeout = 0;  // seconds
    std::string _port;
    std::uint64_t _formatIndex = 0;
    std::shared_ptr<WLRylCaptureDevice> _device;
    std::shared_ptr<WLRylCaptureStream> _stream;
    WLMeterixSnapshot _meterixDelta;

    // Held for the whole of a stop.
    platform::Mutex _stopMutex;
    // Set under the lock. Atomic because the receiving queue reads it without.
    platform::Atomic<bool> _stop{false};
    // Counted by the receiving queue. Atomic because a frame that passed the test of `_stop` just
    // before the stop may be counted while the result is built.
    platform::Atomic<std::uint64_t> _frameCount{0};

    // The outcome: written once, by the stop, before the semaphore is signalled; read after the wait.
    platform::ErrorRef _error;
    std::optional<platform::Dictionary> _errorCounters;
    platform::Semaphore _done_semaphore{0};

    platform::WorkQueue _receivingQueue;
    platform::WorkQueue _processingQueue;
};

#endif
