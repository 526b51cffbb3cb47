// Trial: one run on a device with at most one fault. It is meant for a process of its own, which it may leave in
// any state: the log, the services and threads of the run stay behind.
#ifndef ZR_HOST_CAMPAIGN_TRIAL_H
#define ZR_HOST_CAMPAIGN_TRIAL_H

#include <string>
#include <utility>
#include <vector>

#include "devices/faulty/faulty_device.h"
#include "host/campaign/campaign_record.h"
#include "host/run/bench_limits.h"

namespace host {

struct Trial {
    const RunPlan* plan;  // must outlive the trial
    // Makes the device. What it throws as a std::exception is the run's reason not to pass.
    faulty::FaultyDevice::Factory makeServices;
    std::vector<faulty::Fault> faults = {};  // of the device's calls and deliveries
    // The limits of the bench; null when there are none.
    const std::vector<BenchLimit>* limits = nullptr;
};

// Runs the plan once.
TrialResult runTrial(const Trial& trial);

// A fault that a call or a delivery of a device can have.
struct StepFault {
    faulty::Fault fault;
    std::string group;  // these three as in devices::DataFault
    std::string kind;
    std::string subject;
};

// The same on the device without a fault, and which faults its steps can have. Of the deliveries only those that
// the run waits for are among them: how many more come is a matter of threads.
std::pair<TrialResult, std::vector<StepFault>> runHealthy(const Trial& trial);

}  // namespace host

#endif
