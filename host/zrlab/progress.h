// Progress: shows how far a run has come while it runs, on standard error.
#ifndef ZR_HOST_ZRLAB_PROGRESS_H
#define ZR_HOST_ZRLAB_PROGRESS_H

#include <chrono>
#include <string>
#include <thread>

#include "host/record/plugin_data.h"
#include "host/record/run_plan.h"
#include "host/run/run_recorder.h"
#include "platform/sync.h"

namespace host {

// From construction to destruction, shows frames or images of the requested count, their rate and the
// time left until the time-out: on a terminal as a status line ten times a second, elsewhere as a
// plain line every five seconds, so that a short run prints none. A plan without a parameter
// that counts something shows nothing.
class Progress {
  public:
    // `prefix` stands before the line; "run 3 of 100", say. The recorder must outlive the progress.
    Progress(const RunPlan& plan, const RunRecorder& recorder, std::string prefix);
    ~Progress();
    Progress(const Progress&) = delete;
    Progress& operator=(const Progress&) = delete;

  private:
    void _show();
    std::string _text() const;

    const RunRecorder& _recorder;
    const std::string _prefix;
    const std::chrono::steady_clock::time_point _began = std::chrono::steady_clock::now();
    const CountParameter* _count = nullptr;  // null when there is nothing to show
    double _wanted = 0;
    double _timeout = 0;  // seconds

    platform::Mutex _mutex;
    platform::Condition _changed;
    bool _over ZR_GUARDED_BY(_mutex) = false;
    std::thread _thread;
};

}  // namespace host

#endif
