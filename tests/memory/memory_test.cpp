// Every allocation of a run fails once, each in a process of its own. Either the exception leaves the call on
// the host's thread; then nothing is left behind, and the next run in the same process is a good one. Or it
// was thrown inside a handler, an item of a queue or the device's own thread, and the process ends there.
#include <array>
#include <atomic>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <functional>
#include <iostream>
#include <map>
#include <memory>
#include <new>
#include <string>
#include <thread>
#include <vector>

#include <sys/mman.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include "devices/simulator/device.h"
#include "kirra/image_experiment.h"
#include "platform/log.h"
#include "platform/run_loop.h"
#include "platform/services.h"
#include "tests/platform/threads.h"
#include "tests/support/eventually.h"
#include "vantor_counters/counter_analysis.h"
#include "vantor_counters/counter_experiment.h"
#include "vantor_fault/fault_analysis.h"
#include "vantor_fault/fault_experiment.h"

namespace {

std::atomic<long> allocationsToFailure{0};  // counts down to the one that fails, and on
std::atomic<long> liveAllocations{0};

// Shared by the parent and its children.
struct Seen {
    std::atomic<bool> failed{false};
    std::atomic<bool> onHostThread{false};
    std::atomic<bool> late{false};  // a run took as long as its time-out
};
Seen* const seen = [] {
    void* const shared =
        mmap(nullptr, sizeof(Seen), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    return ::new (shared) Seen;
}();

bool allocationFails() {
    if (allocationsToFailure.load() <= 0 || --allocationsToFailure != 0) {
        return false;
    }
    seen->onHostThread = gettid() == getpid();
    seen->failed = true;
    return true;
}

}  // namespace

// Not inlined: otherwise g++ reports the pair as a mismatch.
[[gnu::noinline]] void* operator new(std::size_t size) {
    void* const memory = allocationFails() ? nullptr : std::malloc(size);
    if (memory == nullptr) {
        throw std::bad_alloc();
    }
    ++liveAllocations;
    return memory;
}
[[gnu::noinline]] void operator delete(void* memory) noexcept {
    liveAllocations -= memory != nullptr ? 1 : 0;
    std::free(memory);
}
[[gnu::noinline]] void operator delete(void* memory, std::size_t /*size*/) noexcept {
    operator delete(memory);
}

namespace {

using Seconds = std::chrono::duration<double>;

constexpr Seconds kTimeout{0.02};   // a run's: it keeps its experiment for so long
constexpr Seconds kLongTimeout{2};  // of a run that must not end by it

// What a child reports as its exit status. It ends by a signal when an exception leaves a thread.
enum Outcome : int { kHealthy, kThrew, kNoStream, kWrong };

// A run as the host makes one: an experiment, and what judges its result, if anything does.
struct Run {
    const char* name;
    std::function<std::shared_ptr<ZRExperiment>()> makeExperiment;
    std::function<std::shared_ptr<ZRAnalysis>()> makeAnalysis;
    platform::Dictionary (*parameters)(Seconds timeout);
};

void PrintTo(const Run& run, std::ostream* out) {
    *out << run.name;
}

const std::vector<Run>& allRuns() {
    static const std::vector<Run> runs{
        {"Projector", std::make_shared<ZRVantorFaultExperiment>,
         std::make_shared<ZRVantorFaultAnalysis>,
         [](Seconds timeout) {
             return platform::Dictionary{{"frameCount", 3}, {"timeout", timeout.count()}};
         }},
        {"Counters", std::make_shared<ZRVantorMeterixExperiment>,
         std::make_shared<ZRVantorMeterixAnalysis>, [](Seconds) { return platform::Dictionary(); }},
        {"Images", std::make_shared<ZRKirraImageExperiment>, nullptr,
         [](Seconds) {
             return platform::Dictionary{{"images", 3}, {"timeout", 60}};
         }},
    };
    return runs;
}

// How many results a run without a failure has: measurements, measured results, auxiliary data.
using Sizes = std::array<std::size_t, 3>;

// Calls what the host calls, also when one of the calls throws.
Sizes takeTurn(const Run& run, const platform::Dictionary& parameters, platform::ErrorSlot error) {
    const auto experiment = run.makeExperiment();
    struct Teardown {
        explicit Teardown(ZRExperiment* torn) : experiment(torn) {}
        ~Teardown() {
            allocationsToFailure = 0;  // what follows must work
            if (auto* teardown = dynamic_cast<ZRTeardown*>(experiment)) {
                teardown->teardown(nullptr);
            }
        }
        ZRExperiment* const experiment;
    };
    const auto analysis = run.makeAnalysis != nullptr ? run.makeAnalysis() : nullptr;
    for (auto* setup :
         {dynamic_cast<ZRSetup*>(experiment.get()), dynamic_cast<ZRSetup*>(analysis.get())}) {
        if (setup != nullptr && !setup->setupWithParameters(parameters, nullptr, error)) {
            return {};
        }
    }
    const Teardown teardown(experiment.get());
    const auto result = experiment->run(error);
    if (result == nullptr) {
        return {};
    }
    std::size_t measured = 0;
    if (analysis != nullptr) {
        const auto analyzed = analysis->analyzeExperimentResult(*result, error);
        measured = analyzed != nullptr ? analyzed->measuredResults().size() : 0;
    }
    return {result->measurements().size(), measured, result->auxiliaryData().size()};
}

// A run on a device of its own in which the n-th allocation fails; 0: none does. Says on the standard
// error what it finds wrong.
Outcome runOnce(const Run& run, Seconds timeout, long failing, Sizes& sizes) {
    const long before = liveAllocations;
    Outcome outcome = kHealthy;
    {
        platform::installServices(simulator::makeDevice(simulator::DeviceProfile(), 0));
        platform::ErrorRef error;
        const platform::Dictionary parameters = run.parameters(timeout);
        const auto started = std::chrono::steady_clock::now();
        allocationsToFailure = failing;
        try {
            sizes = takeTurn(run, parameters, &error);
        } catch (const std::bad_alloc&) {
            outcome = kThrew;
        }
        allocationsToFailure = 0;
        if (std::chrono::steady_clock::now() - started >= timeout) {
            seen->late = true;
        }
        if (outcome == kHealthy && error != nullptr) {
            // The one error that the lack of memory has.
            outcome = error->domain() == ZRKirraImageExperimentErrorDomain && error->code() == 3 &&
                              error->localizedDescription() == "Failed to create kirra stream."
                          ? kNoStream
                          : kWrong;
            std::cerr << (outcome == kWrong ? error->localizedDescription() + "\n" : "");
        }
        platform::installServices({});
    }
    if (!test::eventually([&] { return test::threadCount() == 1; })) {
        std::cerr << test::threadCount() << " threads are left\n";
        return kWrong;
    }
    if (liveAllocations != before) {
        std::cerr << liveAllocations - before << " allocations are left\n";
        return kWrong;
    }
    return outcome;
}

class EveryAllocation : public ::testing::TestWithParam<Run> {};

TEST_P(EveryAllocation, FailsOnceWithoutHarm) {
    platform::setLogSink(nullptr, platform::LogLevel::Error);
    const auto runLoop = platform::RunLoop::forThisThread();
    // The first run leaves what is made once in a process.
    platform::installServices(simulator::makeDevice(simulator::DeviceProfile(), 0));
    takeTurn(GetParam(), GetParam().parameters(kLongTimeout), nullptr);
    platform::installServices({});
    ASSERT_TRUE(test::eventually([] { return test::threadCount() == 1; }));
    Sizes healthy;
    ASSERT_EQ(runOnce(GetParam(), kLongTimeout, 0, healthy), kHealthy);

    std::map<std::string, int> outcomes;
    bool reached = true;
    Seconds timeout = kTimeout;
    for (long failing = 1; reached;) {
        SCOPED_TRACE("allocation " + std::to_string(failing));
        seen->failed = false;
        seen->late = false;
        const pid_t child = fork();
        ASSERT_GE(child, 0);
        if (child == 0) {
            const rlimit noCore{0, 0};
            setrlimit(RLIMIT_CORE, &noCore);
            alarm(test::kGenerous.count());
            Sizes sizes;
            Outcome outcome = runOnce(GetParam(), timeout, failing, sizes);
            if (outcome == kHealthy && sizes != healthy) {
                std::cerr << "a result without everything\n";
                outcome = kWrong;
            }
            if (runOnce(GetParam(), timeout, 0, sizes) != kHealthy || sizes != healthy) {
                std::cerr << "the next run is not a good one\n";
                outcome = kWrong;
            }
            _exit(outcome);
        }
        int status = 0;
        ASSERT_EQ(waitpid(child, &status, 0), child);
        if (WIFEXITED(status) && WEXITSTATUS(status) == kWrong && seen->late &&
            timeout < kLongTimeout) {
            timeout = kLongTimeout;  // the machine was too slow for the short one: once more
            continue;
        }
        timeout = kTimeout;
        if (WIFSIGNALED(status)) {
            EXPECT_EQ(WTERMSIG(status), SIGABRT);
            EXPECT_FALSE(seen->onHostThread) << "the exception did not leave the call";
            ++outcomes["ended the process"];
        } else {
            EXPECT_NE(WEXITSTATUS(status), kWrong);
            ++outcomes[WEXITSTATUS(status) == kHealthy ? "no one noticed" : "left the call"];
        }
        reached = seen->failed;
        ++failing;
    }
    --outcomes["no one noticed"];  // the last run, in which none failed
    for (const auto& [outcome, count] : outcomes) {
        std::cout << count << " allocations: " << outcome << '\n';
    }
    EXPECT_GT(outcomes["left the call"], 10);
}

INSTANTIATE_TEST_SUITE_P(Runs,
                         EveryAllocation,
                         ::testing::ValuesIn(allRuns()),
                         [](const auto& info) { return std::string(info.param.name); });

}  // namespace
