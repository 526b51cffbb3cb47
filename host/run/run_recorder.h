// RunRecorder: records what happens during a run: log lines, frames, images and broken rules of the
// device's interfaces.
//
// It is the process's log sink and the device's observer for the whole session; begin() and end()
// enclose a run. Each run has a tag, which the work that it starts carries: what comes under the tag of
// a run that has ended does not enter the next one. A log line is then late, a broken rule becomes a late
// line, anything else is dropped. What comes under no tag between two runs belongs to the next one.
//
// Frames are handed on some at a time, on a background queue: the device's thread writes no report. It waits
// a moment, shorter than a camera's interval between two frames, when too many have not been taken yet: so a
// simulated device at full speed goes no faster than its report. Behind a reader that has stopped, frames
// wait in memory.
//
// Threads  Any. One run at a time.
#ifndef ZR_HOST_RUN_RUN_RECORDER_H
#define ZR_HOST_RUN_RUN_RECORDER_H

#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "devices/observed/observer.h"
#include "host/record/frame_gap.h"
#include "host/record/run_record.h"
#include "platform/log.h"
#include "platform/run_tag.h"
#include "platform/sync.h"
#include "platform/work_queue.h"

namespace host {

class RunRecorder final : public platform::LogSink, public observed::Observer {
  public:
    using FramesDelivered = std::function<void(const FrameBatch& batch)>;

    // `lineLogged` is called for every line, on the thread that logs it. `keepFrames`: whether a
    // report will draw the frames. `framesDelivered`, when there is one, is called with every frame of a
    // run, in their order, on one thread at a time; `withDetails`: also with their metadata and the stream's
    // events. Throws std::system_error when that thread cannot be started.
    RunRecorder(std::function<void(const LogRecord&)> lineLogged,
                bool keepFrames,
                FramesDelivered framesDelivered = nullptr,
                bool withDetails = false);
    ~RunRecorder() override;
    RunRecorder(const RunRecorder&) = delete;
    RunRecorder& operator=(const RunRecorder&) = delete;

    // Begins a run. The thread that drives it sets the tag.
    platform::RunTag begin();
    // Moves the frames recorded so far into the run's record: what was delivered, lost and kept. All of them
    // have been handed on then.
    void takeFrames(RunRecord& run);
    // Ends the run: moves what was recorded into its record.
    void end(RunRecord& run);

    // The late lines since the last call, each with the tag of its run.
    std::vector<std::pair<platform::RunTag, LogRecord>> takeLateLines();

    // Frames and images delivered since begin().
    std::uint64_t frames() const { return _frameCount.load(); }
    std::uint64_t images() const { return _imageCount.load(); }

    void write(const platform::LogLine& line) override;
    void frameDelivered(const observed::DeliveredFrame& frame) override;
    void eventDelivered(const observed::DeliveredEvent& event) override;
    void imageDelivered(std::uint64_t number) override;
    void misused(std::string_view what) override;

  private:
    const std::function<void(const LogRecord&)> _lineLogged;
    const bool _keepFrames;
    const FramesDelivered _framesDelivered;
    const bool _withDetails;
    platform::WorkQueue _queue{"zrlab.frames", platform::WorkQueue::Priority::Background};
    std::optional<platform::WorkQueue::Hold> _hold;  // while frames are handed on

    // Of the run in progress; zero between runs.
    std::atomic<platform::RunTag> _current{0};
    // Counted by the device's threads, read by the one that shows progress.
    std::atomic<std::uint64_t> _frameCount{0};
    std::atomic<std::uint64_t> _imageCount{0};

    // Whether work under this tag belongs to the run in progress, or to the next one.
    bool _isWanted(platform::RunTag tag) const { return tag == 0 || tag == _current.load(); }

    double _secondsSinceBegin(std::chrono::steady_clock::time_point moment) const
        ZR_REQUIRES(_mutex);

    // Queues what is to be handed on once there is enough of it.
    void _handOnWhenMany() ZR_REQUIRES(_mutex);
    // Queues what is to be handed on, if anything.
    void _handOn() ZR_REQUIRES(_mutex);
    void _awaitHandedOn() ZR_REQUIRES(_mutex);

    platform::Mutex _mutex;
    platform::Condition _handedOn;
    platform::RunTag _last ZR_GUARDED_BY(_mutex) = 0;
    std::chrono::steady_clock::time_point _began ZR_GUARDED_BY(_mutex);
    std::vector<LogRecord> _log ZR_GUARDED_BY(_mutex);
    std::uint64_t _linesLeftOut ZR_GUARDED_BY(_mutex) = 0;
    std::vector<std::pair<platform::RunTag, LogRecord>> _lateLines ZR_GUARDED_BY(_mutex);
    LostFrames _lostFrames ZR_GUARDED_BY(_mutex);
    std::vector<FrameRecord> _frames ZR_GUARDED_BY(_mutex);
    FrameBatch _toHandOn ZR_GUARDED_BY(_mutex);
    std::size_t _queued ZR_GUARDED_BY(_mutex) =
        0;  // calls of _framesDelivered that have not returned
    std::vector<std::string> _misuses ZR_GUARDED_BY(_mutex);
};

}  // namespace host

#endif
