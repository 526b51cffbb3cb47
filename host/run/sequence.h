// The host sequence: drives an experiment, and the analysis of its diagnostic, through one run.
#ifndef ZR_HOST_RUN_SEQUENCE_H
#define ZR_HOST_RUN_SEQUENCE_H

#include <cstdint>
#include <memory>
#include <vector>

#include "frame/host_interface.h"
#include "host/record/run_listener.h"
#include "host/record/run_plan.h"
#include "host/run/run_recorder.h"

namespace host {

// Runs the plan once on the calling thread, which must have a run loop:
//   a new experiment; its setup, when it has one; its run; its teardown, when it has one and its
//   setup did not fail; for a diagnostic with a result, a new analysis; its setup, when it has one;
//   the analysis of the result; its teardown, as for an experiment.
// A step that fails is recorded with its error, and so are an exception that leaves a step and a result
// without a measurement; a failed
// teardown does not keep the result from being analysed, but there is no verdict then. The listeners
// are called in order.
RunRecord runOnce(const ZRLab& lab,
                  const RunPlan& plan,
                  std::uint64_t number,
                  RunRecorder& recorder,
                  const std::vector<std::shared_ptr<RunListener>>& listeners);

}  // namespace host

#endif
