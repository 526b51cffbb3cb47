#include "host/run/sequence.h"

#include <algorithm>
#include <chrono>
#include <exception>
#include <iterator>
#include <memory>
#include <utility>

#include "host/run/judge.h"

namespace host {

namespace {

using Clock = std::chrono::steady_clock;

double secondsSince(Clock::time_point start) {
    return std::chrono::duration<double>(Clock::now() - start).count();
}

// One run in the making.
class Sequence {
  public:
    Sequence(const ZRLab& lab,
             const RunPlan& plan,
             const std::vector<std::shared_ptr<RunListener>>& listeners)
        : _lab(lab), _plan(plan), _listeners(listeners) {}

    RunRecord run(std::uint64_t number, RunRecorder& recorder) {
        const Clock::time_point start = Clock::now();
        _run.plan = _plan;
        _run.number = number;
        recorder.begin();
        _tell([](RunListener& listener, const RunRecord& run) { listener.runStarted(run); });

        ZRExperimentResultRef result;
        _part(Part::Experiment, _run.experimentSeconds, [&] {
            result = _experiment();
            recorder.takeFrames(_run);
        });
        if (_plan.isDiagnostic() && result != nullptr) {
            _part(Part::Analysis, _run.analysisSeconds.emplace(), [&] { _analysis(*result); });
        }
        recorder.end(_run);
        _run.seconds = secondsSince(start);
        _run.verdict = verdictOf(_run);
        _tell([](RunListener& listener, const RunRecord& run) { listener.runEnded(run); });
        return std::move(_run);
    }

  private:
    template <class Call>
    void _tell(Call&& call) {
        for (const auto& listener : _listeners) {
            call(*listener, _run);
        }
    }

    template <class Body>
    void _part(Part part, double& seconds, Body&& body) {
        const Clock::time_point start = Clock::now();
        _tell([part](RunListener& listener, const RunRecord& run) {
            listener.partStarted(run, part);
        });
        body();
        seconds = secondsSince(start);
        _tell(
            [part](RunListener& listener, const RunRecord& run) { listener.partEnded(run, part); });
    }

    // Makes one call into the plug-in. `call(slot)` yields something that is false for a failure;
    // that, or an exception, becomes a failure record.
    template <class Call>
    auto _step(Part part, std::string_view step, Call&& call) -> decltype(call(nullptr)) {
        platform::ErrorRef error;
        std::string message;
        try {
            auto outcome = call(&error);
            if (outcome) {
                return outcome;
            }
        } catch (const std::exception& exception) {
            message = exception.what();
        } catch (...) {
            message = "an exception of an unknown kind";
        }
        _run.failures.push_back({part, step, std::move(error), std::move(message)});
        return {};
    }

    // Records a failure that the part did not report itself.
    void _fail(Part part, std::string_view step, std::string message) {
        _run.failures.push_back({part, step, nullptr, std::move(message)});
    }

    template <class Instance>
    bool _setUp(Part part, const std::shared_ptr<Instance>& instance, const PartPlan& plan) {
        auto* setup = dynamic_cast<ZRSetup*>(instance.get());
        return setup == nullptr || _step(part, kStepSetup, [&](platform::ErrorSlot error) {
                   return setup->setupWithParameters(plan.asDictionary(), &_host, error);
               });
    }

    template <class Instance>
    void _tearDown(Part part, Instance& instance) {
        if (auto* teardown = dynamic_cast<ZRTeardown*>(&instance)) {
            _step(part, kStepTeardown,
                  [&](platform::ErrorSlot error) { return teardown->teardown(error); });
        }
    }

    ZRExperimentResultRef _experiment() {
        constexpr Part kPart = Part::Experiment;
        const auto experiment = _step(kPart, kStepCreate, [&](platform::ErrorSlot) {
            return _lab.makeExperiment(_plan.experiment.name);
        });
        if (experiment == nullptr || !_setUp(kPart, experiment, _plan.experiment)) {
            return nullptr;
        }
        auto result = _step(kPart, kStepRun,
                            [&](platform::ErrorSlot error) { return experiment->run(error); });
        _tearDown(kPart, *experiment);
        if (result != nullptr) {
            for (const auto& [name, measurement] : result->measurements()) {
                if (measurement == nullptr) {
                    _fail(kPart, kStepRun, "the measurement \"" + name + "\" is null");
                    return nullptr;
                }
                _run.measurements.push_back(
                    {name, measurement->doubleValue(), measurement->unit().symbol()});
            }
            _run.auxiliaryData = platform::Dictionary(result->auxiliaryData());
        }
        return result;
    }

    void _analysis(const ZRExperimentResult& result) {
        constexpr Part kPart = Part::Analysis;
        const auto analysis = _step(kPart, kStepCreate, [&](platform::ErrorSlot) {
            return _lab.makeAnalysis(_plan.analysis->name);
        });
        if (analysis == nullptr || !_setUp(kPart, analysis, *_plan.analysis)) {
            return;
        }
        const auto analysed = _step(kPart, kStepAnalyze, [&](platform::ErrorSlot error) {
            return analysis->analyzeExperimentResult(result, error);
        });
        _tearDown(kPart, *analysis);
        if (analysed == nullptr) {
            return;
        }
        for (const ZRMeasuredResultRef& one : analysed->measuredResults()) {
            if (one == nullptr || one->measurement() == nullptr) {
                _fail(kPart, kStepAnalyze,
                      one == nullptr
                          ? "a measured result is null"
                          : "the measured result \"" + one->name() + "\" has no measurement");
                return;
            }
            _run.results.push_back(judge(*one));
        }
    }

    const ZRLab& _lab;
    const RunPlan& _plan;
    const std::vector<std::shared_ptr<RunListener>>& _listeners;
    ZRDiagnosticHost _host;
    RunRecord _run;
};

}  // namespace

RunRecord runOnce(const ZRLab& lab,
                  const RunPlan& plan,
                  std::uint64_t number,
                  RunRecorder& recorder,
                  const std::vector<std::shared_ptr<RunListener>>& listeners) {
    return Sequence(lab, plan, listeners).run(number, recorder);
}

}  // namespace host
