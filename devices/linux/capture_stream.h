// A camera's stream.
#ifndef ZR_DEVICES_LINUX_CAPTURE_STREAM_H
#define ZR_DEVICES_LINUX_CAPTURE_STREAM_H

#include <cstdint>
#include <functional>
#include <memory>
#include <string_view>
#include <thread>
#include <utility>
#include <vector>

#include "devices/linux/counters.h"
#include "devices/linux/description.h"
#include "devices/linux/frame_pairs.h"
#include "devices/linux/image_buffers.h"
#include "devices/linux/machine.h"
#include "devices/linux/system_problem.h"
#include "devices/linux/video_device.h"
#include "devices/linux/waker.h"
#include "platform/sync.h"
#include "platform/welkin/capture.h"

namespace linux_device {

// What a plug-in, its devices and their streams share.
struct CaptureContext {
    std::vector<StreamDescription> streams;
    Machine machine;
    std::shared_ptr<StreamStarts> starts;
    // Throws a SystemProblem.
    std::function<Camera(const Machine&, const StreamDescription&)> open = openCamera;
};

// A thread of the stream's takes the buffers of the kernel from start() to stop(). It also ends the kernel's stream:
// that may take as long as a camera does not answer, and stop() does not wait for it. What must (the next start(),
// invalidate()) does.
//
// A stream that breaks (a fatal error, an unplugged camera) delivers nothing any more; the log says why, and stop()
// fails with that error.
//
// Owner    Its device and the client; while it streams also its thread, so the last reference may go there.
// Threads  Any; no lock is held while a handler runs or the kernel is called.
class CaptureStream final : public WLRylCaptureStream,
                            public std::enable_shared_from_this<CaptureStream> {
  public:
    // `described` lies in the context.
    CaptureStream(std::shared_ptr<const CaptureContext> context, const StreamDescription& described)
        : _context(std::move(context)), _described(described) {}

    platform::Value valueForProperty(std::string_view property, platform::ErrorSlot error) override;
    // What the description does not name is refused.
    bool setValue(const platform::Value& value,
                  std::string_view forProperty,
                  platform::ErrorSlot error) override;
    bool start(platform::ErrorSlot error) override;

    // Waits for a handler in progress, unless a handler calls it.
    bool stop(platform::ErrorSlot error) override;

    // Control of the stream is an open node.
    bool grantControl(platform::ErrorSlot error);

    // Ends the stream for good and drops its handlers. invalidate() waits for a handler in progress and for the end
    // of the kernel's stream, unless a handler calls it; abandon() never waits.
    void invalidate();
    void abandon();

  private:
    enum class State { Idle, Starting, Running, Broken, Invalid };

    // One start to its stop.
    struct Run {
        Camera camera;
        std::shared_ptr<ImageBuffers> buffers;
        std::vector<std::pair<std::uint32_t, std::int32_t>>
            controlEvents;  // control, code of the event
        Waker end;
    };
    using RunRef = std::shared_ptr<Run>;
    // What the capture thread knows of its frames.
    struct Progress;

    Camera _camera();
    void _writeAll(VideoDevice& video, std::string_view property, const platform::Value& value);
    void _write(VideoDevice& video, const PropertyTarget& property, const platform::Value& value);
    const PropertyTarget& _targetOf(std::string_view name) const;
    platform::Value _errorCounters();

    void _beginStart();
    RunRef _startKernel(const Camera& camera);
    void _startThread(const RunRef& run);
    std::pair<platform::Value, Camera> _end() ZR_REQUIRES(_mutex);
    bool _isCaptureThread() ZR_REQUIRES(_mutex);
    void _waitForHandler() ZR_REQUIRES(_mutex);

    // The capture thread.
    void _capture(const RunRef& run);
    void _captureUntilEnd(Run& run, Progress& progress);
    void _takeEvents(Run& run);
    void _takeMetadata(Run& run, Progress& progress);
    void _takePictures(Run& run, Progress& progress);
    void _deliver(Run& run, Progress& progress, const FramePairs::Frame& frame);
    void _report(Run& run, EventCause cause, std::int64_t microseconds, std::int64_t info);
    void _callEventHandler(const Run& run,
                           std::int32_t code,
                           std::int64_t microseconds,
                           std::int64_t info);
    platform::Value _beginTurn(const Run& run);
    void _endTurn();
    void _break(const Run& run, const SystemProblem& problem);

    const std::shared_ptr<const CaptureContext> _context;
    const StreamDescription& _described;

    platform::Mutex _mutex;
    platform::Condition _changed;
    State _state ZR_GUARDED_BY(_mutex) = State::Idle;
    Camera _opened ZR_GUARDED_BY(_mutex);  // null until control of the stream is granted
    platform::MutableDictionary _properties ZR_GUARDED_BY(_mutex);
    RunRef _run ZR_GUARDED_BY(_mutex);  // the one that is delivering, or null
    platform::ErrorRef _breakage ZR_GUARDED_BY(_mutex);
    bool _isCapturing ZR_GUARDED_BY(_mutex) = false;  // the capture thread has not ended
    std::thread::id _captureThread ZR_GUARDED_BY(_mutex);
    bool _isInHandler ZR_GUARDED_BY(_mutex) = false;
    std::uint64_t _lostFrames ZR_GUARDED_BY(_mutex) = 0;  // these since the last start
    std::uint64_t _errorBuffers ZR_GUARDED_BY(_mutex) = 0;
    std::vector<platform::Number> _countersAtStart ZR_GUARDED_BY(_mutex);
};

}  // namespace linux_device

#endif
