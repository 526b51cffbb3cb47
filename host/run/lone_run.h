// A run without a session: nobody follows it, and no report is written.
#ifndef ZR_HOST_RUN_LONE_RUN_H
#define ZR_HOST_RUN_LONE_RUN_H

#include <vector>

#include "host/record/run_record.h"
#include "host/run/bench_limits.h"
#include "platform/services.h"

namespace host {

// Runs the plan once on these services, observed, and judges it by the limits of the bench unless they are null.
// The services and the log's sink stay installed when it returns. Throws as runOnce() does.
RunRecord runAlone(platform::Services services,
                   const RunPlan& plan,
                   const std::vector<BenchLimit>* limits = nullptr);

}  // namespace host

#endif
