#include "host/zrlab/campaign_command.h"

#include <algorithm>
#include <chrono>
#include <functional>
#include <map>
#include <optional>
#include <string_view>
#include <thread>
#include <tuple>
#include <utility>
#include <vector>

#include <fmt/format.h>
#include <nlohmann/json.hpp>

#include "frame/host_interface.h"
#include "host/campaign/campaign_forms.h"
#include "host/campaign/campaign_record.h"
#include "host/campaign/trial.h"
#include "host/record/problem.h"
#include "host/record/run_text.h"
#include "host/run/planner.h"
#include "host/zrlab/interrupt.h"
#include "host/zrlab/output_file.h"
#include "host/zrlab/output_form.h"
#include "host/zrlab/terminal.h"
#include "host/zrlab/trial_process.h"

namespace host {

namespace {

using Clock = std::chrono::steady_clock;
using Json = nlohmann::json;

// Enough for a fault in the middle of a run to be in the middle, and for frames to come in time on a busy
// machine. A setting that is given comes after these.
constexpr std::pair<std::string_view, std::string_view> kSmallRuns[] = {
    {"frameCount", "30"}, {"images", "5"}, {kTimeoutParameter, "3"}};

// A run that takes longer than its own time-out by this hangs.
constexpr std::chrono::seconds kHangs{60};
// More than any run takes; the clock can count it.
constexpr double kLongestTimeout = 1e9;

std::vector<std::string> namesToRun(const std::vector<std::string>& given) {
    std::vector<std::string> names;
    for (const std::string& name : given) {
        if (std::find(names.begin(), names.end(), name) == names.end()) {
            names.push_back(name);
        }
    }
    if (!names.empty()) {
        return names;
    }
    const ZRLab& lab = ZRLab::defaultLab();
    names = runnableNames(lab);
    for (const auto& diagnostic : lab.diagnostics()) {
        std::erase(names, diagnostic.experimentName);
    }
    return names;
}

// Whether a part of the run declares the parameter.
bool takes(const ZRLab& lab, const std::string& name, std::string_view parameter) {
    for (const auto& [part, partName] : partsOf(lab, name)) {
        if (const auto description = describePart(lab, part, partName)) {
            const auto& declared = description->parameters();
            if (std::any_of(declared.begin(), declared.end(),
                            [&](const auto& one) { return one.first == parameter; })) {
                return true;
            }
        }
    }
    return false;
}

std::vector<RunPlan> plansOf(const std::vector<std::string>& names,
                             const std::vector<std::string>& given) {
    const ZRLab& lab = ZRLab::defaultLab();
    std::vector<std::string> settings;
    for (const auto& small : kSmallRuns) {
        if (std::any_of(names.begin(), names.end(),
                        [&](const auto& name) { return takes(lab, name, small.first); })) {
            settings.push_back(fmt::format("{}={}", small.first, small.second));
        }
    }
    settings.insert(settings.end(), given.begin(), given.end());
    return planRuns(lab, names, readSettings(settings));
}

// How long the process of a run may take.
std::chrono::seconds limitOf(const std::vector<RunPlan>& runs) {
    double longest = 0;
    for (const RunPlan& run : runs) {
        longest = std::max(longest, run.experiment.parameter(kTimeoutParameter).asDouble());
    }
    return kHangs +
           std::chrono::seconds(static_cast<std::int64_t>(std::min(longest, kLongestTimeout)));
}

// What a process of a trial returns, and back.
Json jsonOf(const TrialResult& result) {
    return {static_cast<int>(result.outcome), result.why};
}
TrialResult resultOf(const Json& json) {
    return {static_cast<TrialOutcome>(json.at(0).get<int>()), json.at(1)};
}
Json jsonOf(const StepFault& fault) {
    return {static_cast<int>(fault.fault.place.kind),
            fault.fault.place.number,
            static_cast<int>(fault.fault.way),
            fault.group,
            fault.kind,
            fault.subject};
}
StepFault stepFaultOf(const Json& json) {
    return {.fault = {.place = {static_cast<faulty::StepKind>(json.at(0).get<int>()), json.at(1)},
                      .way = static_cast<faulty::Way>(json.at(2).get<int>())},
            .group = json.at(3),
            .kind = json.at(4),
            .subject = json.at(5)};
}

// What a process that did not return anything says of its run.
std::optional<TrialResult> brokenResult(const Ended& ended) {
    if (ended.how == Ended::How::Done) {
        return std::nullopt;
    }
    return TrialResult{ended.how == Ended::How::Hung ? TrialOutcome::Hung : TrialOutcome::Crashed,
                       ended.text};
}

// How far the campaign is, on standard error: on a terminal as a status line, else as a line every ten seconds.
class CampaignProgress {
  public:
    ~CampaignProgress() { Terminal::shared().status(""); }

    void expect(std::size_t trials) { _expected += trials; }
    void ended() {
        ++_done;
        const auto now = Clock::now();
        const bool isTerminal = Terminal::shared().progressIsTerminal();
        if (now - _shown <
            (isTerminal ? std::chrono::milliseconds(100) : std::chrono::seconds(10))) {
            return;
        }
        _shown = now;
        const double seconds = std::chrono::duration<double>(now - _began).count();
        const auto left = static_cast<std::uint64_t>(seconds / static_cast<double>(_done) *
                                                     static_cast<double>(_expected - _done)) +
                          1;
        const std::string text =
            fmt::format("campaign  {} of {} runs, {} s left", _done, _expected, left);
        isTerminal ? Terminal::shared().status(text) : Terminal::shared().line(text);
    }

  private:
    const Clock::time_point _began = Clock::now();
    Clock::time_point _shown = _began;
    std::size_t _done = 0;
    std::size_t _expected = 0;
};

class Campaign {
  public:
    Campaign(const CampaignOptions& options, const SessionOptions& session) : _session(session) {
        _record.version = session.version;
        _record.commandLine = session.commandLine;
        _record.limits = session.limits;
        _record.runs = plansOf(namesToRun(session.names), session.settings);
        if (!session.limits.empty()) {
            _limits = readBenchLimits(session.limits, runnableNames(ZRLab::defaultLab()));
        }
        _processes.limit = limitOf(_record.runs);
        _device = session.device;
        if (!_device.speed.has_value() && takesSpeed(_device)) {
            _device.speed = "max";
        }
        const devices::Device device = openDevice(_device);
        _record.deviceName = device.name;
        _record.deviceSummary = device.summary;
        _dataFaults = dataFaults(_device);
        const std::size_t processors = std::max(1U, std::thread::hardware_concurrency());
        _processes.most = options.jobs != 0 ? options.jobs : 2 * processors;
    }

    // Nothing when the program was asked to stop.
    std::optional<CampaignRecord> run() {
        _processes.stop = interrupt::deferFirst();
        if (!_findSteps() || !_runServiceFaults() || !_runOtherFaults()) {
            return std::nullopt;
        }
        // Those of services that no run uses.
        std::erase_if(_record.faults, [](const CampaignFault& fault) {
            return std::none_of(fault.runs.begin(), fault.runs.end(),
                                [](const auto& run) { return run.has_value(); });
        });
        _record.seconds = std::chrono::duration<double>(Clock::now() - _began).count();
        return std::move(_record);
    }

  private:
    // A run on the device with a fault: of the record's, on the record's run.
    struct Job {
        std::size_t fault;
        std::size_t run;
        Trial trial;
    };

    Trial _trial(std::size_t run) const {
        return {.plan = &_record.runs[run],
                .makeServices = [this] { return openDevice(_device).services; },
                .limits = _session.limits.empty() ? nullptr : &_limits};
    }

    // The place in the record of a fault, which the runs share.
    std::size_t _faultAt(const std::string& group,
                         const std::string& kind,
                         const std::string& subject) {
        const auto [place, isNew] =
            _places.try_emplace({group, kind, subject}, _record.faults.size());
        if (isNew) {
            CampaignFault& fault =
                _record.faults.emplace_back(CampaignFault{group, kind, subject, {}});
            fault.runs.resize(_record.runs.size());
        }
        return place->second;
    }

    // Each run on the device as it is: it must pass, and says which steps can fail.
    bool _findSteps() {
        _progress.expect(_record.runs.size());
        std::vector<std::vector<StepFault>> steps(_record.runs.size());
        const auto healthy = [this](std::size_t run) {
            const auto [result, faults] = runHealthy(_trial(run));
            Json json = {jsonOf(result), Json::array()};
            for (const StepFault& fault : faults) {
                json[1].push_back(jsonOf(fault));
            }
            return json.dump();
        };
        const auto ended = [&](std::size_t run, const Ended& of) {
            _progress.ended();
            auto result = brokenResult(of);
            const Json json = result.has_value() ? Json() : Json::parse(of.text);
            if (!result.has_value()) {
                result = resultOf(json.at(0));
            }
            if (result->outcome != TrialOutcome::NotCaught) {
                throw Problem(kExitError,
                              fmt::format("campaign: {} does not pass on {}, without a fault: {}",
                                          _record.runs[run].name, _record.deviceName, result->why));
            }
            for (const Json& fault : json.at(1)) {
                steps[run].push_back(stepFaultOf(fault));
            }
        };
        const bool isWhole = inProcesses(_processes, _record.runs.size(), healthy, ended);
        for (std::size_t run = 0; run < steps.size(); ++run) {
            for (const StepFault& step : steps[run]) {
                Job job{_faultAt(step.group, step.kind, step.subject), run, _trial(run)};
                job.trial.faults = {step.fault};
                const bool isService = step.fault.place.kind == faulty::StepKind::Service;
                (isService ? _services : _others).push_back(std::move(job));
            }
        }
        return isWhole;
    }

    // A run that passes without a service does not use it.
    bool _runServiceFaults() {
        const bool isWhole = _run(_services);
        for (const Job& job : _services) {
            auto& result = _record.faults[job.fault].runs[job.run];
            if (result.has_value() && result->outcome == TrialOutcome::NotCaught) {
                result.reset();
            }
        }
        return isWhole;
    }

    bool _uses(std::size_t run, const std::string& service) const {
        return service.empty() ||
               std::any_of(_services.begin(), _services.end(), [&](const Job& job) {
                   const CampaignFault& fault = _record.faults[job.fault];
                   return job.run == run && fault.subject.ends_with(": " + service) &&
                          fault.runs[run].has_value();
               });
    }

    bool _runOtherFaults() {
        for (const devices::DataFault& fault : _dataFaults) {
            for (std::size_t run = 0; run < _record.runs.size(); ++run) {
                if (_uses(run, fault.service)) {
                    Job job{_faultAt(fault.group, fault.kind, fault.subject), run, _trial(run)};
                    job.trial.makeServices = [&fault, speed = speedOf(_device)] {
                        return fault.open(speed).services;
                    };
                    _others.push_back(std::move(job));
                }
            }
        }
        return _run(_others);
    }

    bool _run(const std::vector<Job>& jobs) {
        _progress.expect(jobs.size());
        return inProcesses(
            _processes, jobs.size(),
            [&](std::size_t number) { return jsonOf(runTrial(jobs[number].trial)).dump(); },
            [&](std::size_t number, const Ended& ended) {
                _progress.ended();
                auto result = brokenResult(ended);
                if (!result.has_value()) {
                    result = resultOf(Json::parse(ended.text));
                }
                _record.faults[jobs[number].fault].runs[jobs[number].run] = std::move(result);
            });
    }

    const SessionOptions& _session;
    const Clock::time_point _began = Clock::now();
    DeviceChoice _device;
    std::vector<BenchLimit> _limits;
    std::vector<devices::DataFault> _dataFaults;
    TrialProcesses _processes{.most = 1, .limit = {}, .stop = {}};
    CampaignProgress _progress;
    CampaignRecord _record;
    std::map<std::tuple<std::string, std::string, std::string>, std::size_t> _places;
    std::vector<Job> _services;
    std::vector<Job> _others;
};

}  // namespace

int campaignCommand(const CampaignOptions& options, const SessionOptions& session) {
    const std::string name =
        formOfOutput("campaign", options.format, options.output, [](const auto& file) {
            const CampaignForm* form = campaignFormOf(file);
            return form != nullptr ? std::string(form->name) : "";
        });
    const CampaignForm& form = *campaignFormNamed(name);
    if (goesToFile(options.output)) {
        requireWritable(options.output);
    }
    const auto record = Campaign(options, session).run();
    if (!record.has_value()) {
        return interrupt::exitStatus();
    }
    std::string shown = form.write(*record);
    if (goesToFile(options.output)) {
        writeFile(options.output, shown);
        shown = campaignHeadline(*record) + "\n";
    }
    if (!Terminal::shared().output(shown)) {
        throw Problem(kExitError, "cannot write standard output");
    }
    return countsOf(*record).broken == 0 ? kExitPassed : kExitFailed;
}

}  // namespace host
