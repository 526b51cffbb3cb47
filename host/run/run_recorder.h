// RunRecorder: records what happens during a run: log lines, frames, images and broken rules of the
// device's interfaces.
//
// It is the process's log sink and the device's observer for the whole session; begin() and end()
// enclose a run. What happens between two runs (such as the log line of a time-out that outlived its run)
// belongs to the next one.
//
// Threads  begin() and end() on the session's thread; everything else on any.
#ifndef ZR_HOST_RUN_RUN_RECORDER_H
#define ZR_HOST_RUN_RUN_RECORDER_H

#include <atomic>
#include <chrono>
#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "devices/observed/observer.h"
#include "host/record/frame_gap.h"
#include "host/record/run_record.h"
#include "platform/log.h"
#include "platform/mutex.h"

namespace host {

class RunRecorder final : public platform::LogSink, public observed::Observer {
  public:
    // `lineLogged` is called for every line, on the thread that logs it. `keepFrames`: whether a
    // report will draw the frames.
    RunRecorder(std::function<void(const LogRecord&)> lineLogged, bool keepFrames);

    void begin();
    // Moves the frames recorded so far into the run's record: what was delivered, lost and kept.
    void takeFrames(RunRecord& run);
    // Moves what was recorded into the run's record.
    void end(RunRecord& run);

    // Frames and images delivered since begin().
    std::uint64_t frames() const { return _frameCount.load(); }
    std::uint64_t images() const { return _imageCount.load(); }

    void write(const platform::LogLine& line) override;
    void frameDelivered(const observed::DeliveredFrame& frame) override;
    void imageDelivered(std::uint64_t number) override;
    void misused(std::string_view what) override;

  private:
    const std::function<void(const LogRecord&)> _lineLogged;
    const bool _keepFrames;

    // Counted by the device's threads, read by the one that shows progress.
    std::atomic<std::uint64_t> _frameCount{0};
    std::atomic<std::uint64_t> _imageCount{0};

    platform::Mutex _mutex;
    std::chrono::steady_clock::time_point _began ZR_GUARDED_BY(_mutex);
    std::vector<LogRecord> _log ZR_GUARDED_BY(_mutex);
    std::uint64_t _linesLeftOut ZR_GUARDED_BY(_mutex) = 0;
    LostFrames _lostFrames ZR_GUARDED_BY(_mutex);
    std::vector<FrameRecord> _frames ZR_GUARDED_BY(_mutex);
    std::vector<std::string> _misuses ZR_GUARDED_BY(_mutex);
};

}  // namespace host

#endif
