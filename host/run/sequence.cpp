#include "host/run/sequence.h"

#include <algorithm>
#include <chrono>
#include <condition_variable>
#include <exception>
#include <iterator>
#include <memory>
#include <mutex>
#include <thread>
#include <utility>

#include "host/record/uuid.h"
#include "host/run/judge.h"
#include "platform/run_loop.h"
#include "platform/run_tag.h"
#include "platform/sync.h"

namespace host {

namespace {

using Clock = std::chrono::steady_clock;

double secondsSince(Clock::time_point start) {
    return std::chrono::duration<double>(Clock::now() - start).count();
}

// One run in the making. Its thread calls the plug-in without a lock, and changes the record with one,
// so that another thread always finds the record whole.
class Sequence {
  public:
    Sequence(const Bench& bench, const RunPlan& plan, std::uint64_t number)
        : _bench(bench), _plan(plan), _tag(bench.recorder.begin()) {
        _run.uuid = newUuid();
        _run.plan = plan;
        _run.number = number;
        if (bench.judge != nullptr) {
            bench.judge->begin();
        }
    }

    // On the run's thread.
    void drive() {
        {
            const std::lock_guard lock(_endMutex);
            _loop = platform::RunLoop::forThisThread();
        }
        try {
            const platform::RunTagScope scope(_tag);
            _parts();
        } catch (...) {
            _exception = std::current_exception();
        }
        {
            const std::lock_guard lock(_endMutex);
            _hasEnded = true;
        }
        _end.notify_all();
    }

    // Waits for the end, or for a request to stop and then for as long as the grace. Whether the thread's
    // work has ended.
    bool await() {
        std::unique_lock lock(_endMutex);
        const auto hasEnded = [this] { return _hasEnded; };
        if (!_end.wait(lock, _bench.stop, hasEnded)) {
            if (_loop != nullptr) {
                _loop->stop();
            }
            _end.wait_for(lock, kStopGrace, hasEnded);
        }
        return _hasEnded;
    }

    // The record of a run that has ended. Throws what a listener threw.
    RunRecord take() {
        if (_exception != nullptr) {
            std::rethrow_exception(_exception);
        }
        const platform::MutexLock lock(_mutex);
        return std::move(_run);
    }

    // Gives the run up, unless it has just come to its end.
    RunRecord giveUp() {
        const platform::MutexLock lock(_mutex);
        _isGivenUp = true;
        if (!_isFinished) {
            _finish();
        }
        return std::move(_run);
    }

  private:
    // Ends the thread of a run that was given up, when the plug-in comes back after all.
    struct GivenUp {};

    // Changes the record, or calls the listeners with it.
    template <class Change>
    void _edit(Change&& change) {
        const platform::MutexLock lock(_mutex);
        if (_isGivenUp) {
            throw GivenUp();
        }
        change(_run);
    }

    template <class Call>
    void _report(Call&& call) ZR_REQUIRES(_mutex) {
        for (const auto& listener : _bench.listeners) {
            call(*listener, std::as_const(_run));
        }
    }

    bool _isToStop() const { return _bench.stop.stop_requested(); }

    void _parts() {
        _edit([this](RunRecord&) ZR_REQUIRES(_mutex) {
            _report([](RunListener& listener, const RunRecord& run) { listener.runStarted(run); });
        });
        ZRExperimentResultRef result;
        _part(Part::Experiment, [&] { result = _experiment(); });
        if (_plan.isDiagnostic() && result != nullptr && !_isToStop()) {
            _part(Part::Analysis, [&] { _analysis(*result); });
        }
        _edit([this](RunRecord&) ZR_REQUIRES(_mutex) { _finish(); });
    }

    void _finish() ZR_REQUIRES(_mutex) {
        _isFinished = true;
        _bench.recorder.end(_run);
        _run.seconds = secondsSince(_start);
        if (_bench.judge != nullptr) {
            _run.benchResults = _bench.judge->judge(_run);
        }
        _run.verdict = _isToStop() ? Verdict::Interrupted : verdictOf(_run);
        _report([](RunListener& listener, const RunRecord& run) { listener.runEnded(run); });
    }

    template <class Body>
    void _part(Part part, Body&& body) {
        const Clock::time_point start = Clock::now();
        _edit([&](RunRecord& record) ZR_REQUIRES(_mutex) {
            _secondsOf(part, record) = 0;
            _report([part](RunListener& listener, const RunRecord& run) {
                listener.partStarted(run, part);
            });
        });
        body();
        _edit([&](RunRecord& record) ZR_REQUIRES(_mutex) {
            _secondsOf(part, record) = secondsSince(start);
            _bench.recorder.takeFrames(record);
            _report([part](RunListener& listener, const RunRecord& run) {
                listener.partEnded(run, part);
            });
        });
    }

    static double& _secondsOf(Part part, RunRecord& run) {
        return part == Part::Experiment ? run.experimentSeconds : run.analysisSeconds.emplace();
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
        _fail(part, step, std::move(message), std::move(error));
        return {};
    }

    void _fail(Part part,
               std::string_view step,
               std::string message,
               platform::ErrorRef error = {}) {
        _edit([&](RunRecord& run) {
            if (!_isToStop()) {
                run.failures.push_back({part, step, std::move(error), std::move(message)});
            }
        });
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
            return _bench.lab.makeExperiment(_plan.experiment.name);
        });
        if (experiment == nullptr || !_setUp(kPart, experiment, _plan.experiment)) {
            return nullptr;
        }
        ZRExperimentResultRef result;
        if (!_isToStop()) {
            result = _step(kPart, kStepRun,
                           [&](platform::ErrorSlot error) { return experiment->run(error); });
        }
        _tearDown(kPart, *experiment);
        if (result == nullptr) {
            return nullptr;
        }
        for (const auto& [name, measurement] : result->measurements()) {
            if (measurement == nullptr) {
                _fail(kPart, kStepRun, "the measurement \"" + std::string(name) + "\" is null");
                return nullptr;
            }
            _edit([&, &key = name, &one = measurement](RunRecord& run) {
                run.measurements.push_back(
                    {std::string(key), one->doubleValue(), one->unit().symbol()});
            });
        }
        _edit([&](RunRecord& run) {
            run.auxiliaryData = platform::Dictionary(result->auxiliaryData());
        });
        return result;
    }

    void _analysis(const ZRExperimentResult& result) {
        constexpr Part kPart = Part::Analysis;
        const auto analysis = _step(kPart, kStepCreate, [&](platform::ErrorSlot) {
            return _bench.lab.makeAnalysis(_plan.analysis->name);
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
            _edit([&](RunRecord& run) { run.results.push_back(judge(*one)); });
        }
    }

    const Bench _bench;
    const RunPlan& _plan;
    const platform::RunTag _tag;
    const Clock::time_point _start = Clock::now();
    ZRDiagnosticHost _host;

    platform::Mutex _mutex;
    RunRecord _run ZR_GUARDED_BY(_mutex);
    bool _isFinished ZR_GUARDED_BY(_mutex) = false;
    bool _isGivenUp ZR_GUARDED_BY(_mutex) = false;

    // The end of the thread's work, which can be waited for together with a request to stop.
    std::mutex _endMutex;
    std::condition_variable_any _end;
    std::shared_ptr<platform::RunLoop> _loop;
    bool _hasEnded = false;
    std::exception_ptr _exception;  // what left the thread's work
};

}  // namespace

SequenceOutcome runOnce(const Bench& bench, const RunPlan& plan, std::uint64_t number) {
    const auto sequence = std::make_shared<Sequence>(bench, plan, number);
    std::thread thread([sequence] { sequence->drive(); });
    if (sequence->await()) {
        thread.join();
        return {sequence->take(), false};
    }
    thread.detach();
    return {sequence->giveUp(), true};
}

}  // namespace host
