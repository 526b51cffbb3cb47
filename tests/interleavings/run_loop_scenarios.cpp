// The run loop's wake-up.
#include <memory>
#include <string>
#include <vector>

#include "platform/run_loop.h"
#include "tools/explore/scenario.h"
#include "tools/explore/scheduler.h"

namespace interleavings {

namespace {

using platform::RunLoop;
using platform::RunLoopOutcome;
using platform::RunLoopSource;

constexpr double kNoLimit = 1e18;  // seconds

// A source that counts its runs, and ends the run with the last of them.
struct Counter {
    explicit Counter(int lastRun) : last(lastRun) {}

    const int last;
    int runs = 0;
    int prepared = 0;  // by signallers, before their signals
    int seen = 0;      // of that, by the callback
    std::shared_ptr<RunLoopSource> source = std::make_shared<RunLoopSource>([this] {
        ++runs;
        seen = prepared;
        if (runs == last) {
            RunLoop::current()->stop();
        }
    });
};

std::function<void()> expectStopped(RunLoopOutcome outcome) {
    return [outcome] { expect(outcome == RunLoopOutcome::Stopped, "the run was not stopped"); };
}

// A signal that comes at any moment of a run wakes it.
std::function<void()> signalWakes() {
    const auto loop = RunLoop::forThisThread();
    const auto counter = std::make_shared<Counter>(1);
    loop->addSource(counter->source, platform::kRunLoopDefaultMode);
    platform::startThread([counter] {
        ++counter->prepared;
        counter->source->signal();
    });
    return expectStopped(loop->run(platform::kRunLoopDefaultMode, kNoLimit));
}

// Two signallers: their signals may merge, but the last is never lost.
std::function<void()> signalsMerge() {
    const auto loop = RunLoop::forThisThread();
    const auto counter = std::make_shared<Counter>(-1);
    loop->addSource(counter->source, platform::kRunLoopDefaultMode);
    for (int signaller = 0; signaller < 2; ++signaller) {
        platform::startThread([counter] {
            ++counter->prepared;
            counter->source->signal();
        });
    }
    while (counter->seen < 2) {
        loop->run(platform::kRunLoopDefaultMode, counter->seen == 1 ? 1 : 2);
    }
    return [counter] { expect(counter->runs == 1 || counter->runs == 2, "runs without a signal"); };
}

// A source is added, signalled and removed by others while the loop waits.
std::function<void()> sourceComesAndGoes() {
    const auto loop = RunLoop::forThisThread();
    const auto idle = std::make_shared<Counter>(-1);
    loop->addSource(idle->source, platform::kRunLoopDefaultMode);
    platform::startThread(
        [loop, idle] { loop->removeSource(idle->source, platform::kRunLoopDefaultMode); });
    const RunLoopOutcome outcome = loop->run(platform::kRunLoopDefaultMode, kNoLimit);
    return [idle, outcome] {
        expect(outcome == RunLoopOutcome::Finished, "the run did not end with its last source");
        expect(idle->runs == 0, "a source ran without a signal");
    };
}

// A stop from another thread ends a run that waits; before the run it does nothing.
std::function<void()> stopWakes() {
    const auto loop = RunLoop::forThisThread();
    const auto idle = std::make_shared<Counter>(-1);
    loop->addSource(idle->source, platform::kRunLoopDefaultMode);
    platform::startThread([loop] { loop->stop(); });
    const RunLoopOutcome outcome = loop->run(platform::kRunLoopDefaultMode, 1);
    return [idle, outcome] {
        expect(outcome == RunLoopOutcome::Stopped || outcome == RunLoopOutcome::TimedOut,
               "the run ended on its own");
    };
}

// The loop ends with its thread while another thread signals a source of it.
std::function<void()> loopEndsWhileSignalled() {
    const auto counter = std::make_shared<Counter>(-1);
    platform::startThread([counter] {
        RunLoop::forThisThread()->addSource(counter->source, platform::kRunLoopDefaultMode);
    });
    counter->source->signal();
    return [counter] { expect(counter->runs == 0, "a source ran without a run"); };
}

}  // namespace

std::vector<Scenario> runLoopScenarios() {
    return {
        {"run-loop.signal-wakes", signalWakes, 3},
        {"run-loop.signals-merge", signalsMerge, 2},
        {"run-loop.source-comes-and-goes", sourceComesAndGoes, 3},
        {"run-loop.stop-wakes", stopWakes, 3},
        {"run-loop.loop-ends-while-signalled", loopEndsWhileSignalled, 3},
    };
}

}  // namespace interleavings
