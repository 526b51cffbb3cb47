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

// Others signal a source and add it while the loop waits, and remove all sources once it has run.
std::function<void()> sourceComesAndGoes() {
    const auto loop = RunLoop::forThisThread();
    const auto idle = std::make_shared<Counter>(-1);
    loop->addSource(idle->source, platform::kRunLoopDefaultMode);
    const auto runs = std::make_shared<int>(0);
    platform::startThread([loop, idle, runs] {
        const auto comes = std::make_shared<std::shared_ptr<RunLoopSource>>();
        *comes = std::make_shared<RunLoopSource>([idle, runs, comes] {
            ++*runs;
            platform::startThread([loop = RunLoop::current(), idle, source = std::move(*comes)] {
                loop->removeSource(source, platform::kRunLoopDefaultMode);
                loop->removeSource(idle->source, platform::kRunLoopDefaultMode);
            });
        });
        const auto source = *comes;
        source->signal();
        loop->addSource(source, platform::kRunLoopDefaultMode);
    });
    const RunLoopOutcome outcome = loop->run(platform::kRunLoopDefaultMode, kNoLimit);
    return [idle, runs, outcome] {
        expect(outcome == RunLoopOutcome::Finished, "the run did not end with its last source");
        expect(*runs == 1, "a source that came with a signal ran {} times", *runs);
        expect(idle->runs == 0, "a source ran without a signal");
    };
}

// A stop from another thread ends a run, also one that waits. The first comes at any moment, also before the
// run, where it does nothing; the other one, which the run's source starts, comes during the run or after it.
std::function<void()> stopWakes() {
    const auto loop = RunLoop::forThisThread();
    const auto startStop = [] {
        platform::startThread([loop = RunLoop::current()] { loop->stop(); });
    };
    const auto source = std::make_shared<RunLoopSource>(startStop);
    source->signal();
    loop->addSource(source, platform::kRunLoopDefaultMode);
    startStop();
    return expectStopped(loop->run(platform::kRunLoopDefaultMode, kNoLimit));
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
        {"run-loop.signals-merge", signalsMerge, 3},
        {"run-loop.source-comes-and-goes", sourceComesAndGoes, 3},
        {"run-loop.stop-wakes", stopWakes, 3},
        {"run-loop.loop-ends-while-signalled", loopEndsWhileSignalled, 3},
    };
}

}  // namespace interleavings
