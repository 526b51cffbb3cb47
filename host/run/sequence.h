// The host sequence: drives an experiment, and the analysis of its diagnostic, through one run.
#ifndef ZR_HOST_RUN_SEQUENCE_H
#define ZR_HOST_RUN_SEQUENCE_H

#include <chrono>
#include <cstdint>
#include <memory>
#include <stop_token>
#include <vector>

#include "frame/host_interface.h"
#include "host/record/run_listener.h"
#include "host/record/run_plan.h"
#include "host/run/bench_judge.h"
#include "host/run/run_recorder.h"

namespace host {

// How long a run may go on after a request to stop before it is given up.
inline constexpr std::chrono::seconds kStopGrace{1};

// What a run needs besides its plan.
struct Bench {
    const ZRLab& lab;
    RunRecorder& recorder;
    const std::vector<std::shared_ptr<RunListener>>& listeners;
    // Asks the run to stop.
    std::stop_token stop = {};
    // Judges each run by the bench's limits; null when there are none.
    BenchJudge* judge = nullptr;
};

struct SequenceOutcome {
    RunRecord run;
    // The run did not end within the grace: its thread is still inside the plug-in. The process must then
    // end without destroying what that thread uses (_exit), or see it end first.
    bool isGivenUp = false;
};

// Runs the plan once, on a thread of its own that has a run loop, and waits for its end:
//   a new experiment; its setup, when it has one; its run; its teardown, when it has one and its
//   setup did not fail; for a diagnostic with a result, a new analysis; its setup, when it has one;
//   the analysis of the result; its teardown, as for an experiment.
// A step that fails is recorded with its error, and so are an exception that leaves a step and a result
// without a measurement; a failed teardown does not keep the result from being analysed, but there is no
// verdict then.
//
// The plug-in's interface has no way to stop a run. After a request to stop, the run loop is stopped, no
// analysis is started, and a run that has not ended kStopGrace later is given up: its record holds what
// was seen until then. Either way the verdict is Interrupted, and a step that fails after the request is
// not recorded: the request may have made it fail.
//
// The listeners are called in order, on the run's thread or, when it is given up, on the caller's; never
// on both at once. Throws std::system_error when no thread can be started.
SequenceOutcome runOnce(const Bench& bench, const RunPlan& plan, std::uint64_t number);

}  // namespace host

#endif
