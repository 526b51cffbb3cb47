#include "host/campaign/trial.h"

#include <algorithm>
#include <cstdint>
#include <exception>
#include <iterator>

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/record/plugin_data.h"
#include "host/record/run_text.h"
#include "host/run/lone_run.h"

namespace host {

namespace {

// In the order of faulty::StepKind.
constexpr std::string_view kGroups[] = {"services", "calls", "frames", "events", "reports"};

// The errors or the results that kept the run from passing; no values, which differ from run to run.
std::string reason(const RunRecord& run, bool isBench) {
    std::vector<std::string> found;
    for (const FailureRecord& failure : run.failures) {
        if ((failure.step == kStepDevice) == isBench) {
            found.push_back(symptomText(failure, " ") + ": " + failureText(failure));
        }
    }
    if (isBench) {
        for (const BenchResult& result : run.benchResults) {
            if (isBenchFinding(result)) {
                found.push_back("bench limit: " + result.name);
            }
        }
    } else if (found.empty()) {
        for (const ResultRecord& result : run.results) {
            if (result.judgement == Judgement::Outside) {
                found.push_back("limit: " + result.name);
            }
        }
    }
    found.erase(std::unique(found.begin(), found.end()), found.end());
    return plainLine(fmt::format("{}", fmt::join(found, "; ")));
}

TrialResult resultOf(const RunRecord& run) {
    if (std::string why = reason(run, false); !why.empty()) {
        return {TrialOutcome::Caught, std::move(why)};
    }
    std::string why = reason(run, true);
    return {why.empty() ? TrialOutcome::NotCaught : TrialOutcome::BenchCaught, std::move(why)};
}

// The runs share the services. Calls and deliveries are numbered in each run on its own.
std::string groupOf(faulty::StepKind kind, const std::string& run) {
    return std::string(kGroups[static_cast<std::size_t>(kind)]) +
           (kind == faulty::StepKind::Service ? "" : " in " + run);
}

// Whether the run ends only after the step, if the step is a delivery.
bool isWaitedFor(const faulty::Place& place, const RunPlan& plan) {
    if (place.kind == faulty::StepKind::Service || place.kind == faulty::StepKind::Call) {
        return true;
    }
    return std::any_of(std::begin(kCountParameters), std::end(kCountParameters),
                       [&](const CountParameter& count) {
                           const auto wanted = plan.experiment.parameter(count.parameter);
                           return wanted.isPresent() && place.number <= wanted.as<std::uint64_t>();
                       });
}

// What a device throws when it cannot be opened is the run's reason not to pass.
template <class Run>
TrialResult guarded(const Run& run) {
    try {
        return run();
    } catch (const std::exception& problem) {
        return {TrialOutcome::Caught, plainLine(problem.what())};
    }
}

}  // namespace

TrialResult runTrial(const Trial& trial) {
    return guarded([&] {
        const faulty::FaultyDevice device(trial.makeServices, trial.faults);
        TrialResult result = resultOf(runAlone(device.services(), *trial.plan, trial.limits));
        if (result.outcome == TrialOutcome::NotCaught && !trial.faults.empty() &&
            device.strikes().empty()) {
            result.outcome = TrialOutcome::NotReached;
        }
        return result;
    });
}

std::pair<TrialResult, std::vector<StepFault>> runHealthy(const Trial& trial) {
    std::vector<StepFault> faults;
    const TrialResult result = guarded([&] {
        const faulty::FaultyDevice device(trial.makeServices);
        TrialResult healthy = resultOf(runAlone(device.services(), *trial.plan, trial.limits));
        for (const faulty::Step& step : device.steps()) {
            if (!isWaitedFor(step.place, *trial.plan)) {
                continue;
            }
            const std::string text = step.text();
            for (const faulty::Way way : step.ways) {
                faults.push_back({{step.place, way},
                                  groupOf(step.place.kind, trial.plan->name),
                                  step.text(way).substr(text.size() + 1),
                                  text});
            }
        }
        return healthy;
    });
    return {result, std::move(faults)};
}

}  // namespace host
