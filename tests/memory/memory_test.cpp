// Every allocation of a run fails once, each in a process of its own. Either the exception leaves the call on
// the host's thread; then nothing is left behind, and the next run in the same process is a good one. Or it
// was thrown inside a handler, an item of a queue or the device's own thread, and the process ends there.
#include <algorithm>
#include <atomic>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <functional>
#include <iostream>
#include <map>
#include <memory>
#include <new>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include <sys/mman.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "devices/simulator/device.h"
#include "kirra/image_experiment.h"
#include "platform/log.h"
#include "platform/run_loop.h"
#include "platform/services.h"
#include "tests/platform/threads.h"
#include "tests/support/descriptors.h"
#include "tests/support/eventually.h"
#include "tests/support/result_values.h"
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
constexpr Seconds kLongTimeout{3};  // of a run that must not end by it
// Of the device. Its client is done with a frame before the next one, so that the allocations come in the same order
// in each run.
constexpr double kSpeed = 30;
constexpr std::size_t kAskedFor = 3;  // frames or images

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
             return platform::Dictionary{{"frameCount", kAskedFor}, {"timeout", timeout.count()}};
         }},
        {"Counters", std::make_shared<ZRVantorMeterixExperiment>,
         std::make_shared<ZRVantorMeterixAnalysis>, [](Seconds) { return platform::Dictionary(); }},
        {"Images", std::make_shared<ZRKirraImageExperiment>, nullptr,
         [](Seconds) {
             return platform::Dictionary{{"images", kAskedFor}, {"timeout", 60}};
         }},
    };
    return runs;
}

struct DiscardingSink final : platform::LogSink {
    void write(const platform::LogLine& /*line*/) override {}
};

// A device whose counters move by a number of their own, however many frames there are.
platform::Services makeDevice() {
    simulator::DeviceProfile profile;
    std::uint64_t number = 0;
    for (simulator::CounterChannel& channel : profile.meterix.channels) {
        channel.risePerSecond = 0;
        channel.riseAtFrame = 1;
        channel.riseBy = ++number;
    }
    return simulator::makeDevice(profile, kSpeed);
}

// What a run of the host comes to.
struct Results {
    test::ResultValues values;
    std::map<std::string, double> judged;  // but for the frame count
};

template <class Part>
bool setUp(Part& part, const platform::Dictionary& parameters, platform::ErrorSlot error) {
    auto* setup = dynamic_cast<ZRSetup*>(&part);
    return setup == nullptr || setup->setupWithParameters(parameters, nullptr, error);
}

void tearDown(ZRExperiment& experiment, platform::ErrorSlot error) {
    if (auto* teardown = dynamic_cast<ZRTeardown*>(&experiment)) {
        teardown->teardown(error);
    }
}

// Calls what the host calls, in its order, also when one of the calls throws. Nothing when one fails.
std::optional<Results> takeTurn(const Run& run,
                                const platform::Dictionary& parameters,
                                platform::ErrorSlot error) {
    const auto experiment = run.makeExperiment();
    if (!setUp(*experiment, parameters, error)) {
        return {};
    }
    ZRExperimentResultRef result;
    try {
        result = experiment->run(error);
    } catch (const std::bad_alloc&) {
        tearDown(*experiment, nullptr);
        throw;
    }
    tearDown(*experiment, result != nullptr ? error : nullptr);
    if (result == nullptr) {
        return {};
    }
    ZRAnalysisResultRef analyzed;
    if (run.makeAnalysis != nullptr) {
        const auto analysis = run.makeAnalysis();
        if (!setUp(*analysis, parameters, error)) {
            return {};
        }
        analyzed = analysis->analyzeExperimentResult(*result, error);
        if (analyzed == nullptr) {
            return {};
        }
    }
    allocationsToFailure = 0;  // the run is over
    Results results{test::valuesOf(*result), {}};
    if (analyzed != nullptr) {
        for (const ZRMeasuredResultRef& one : analyzed->measuredResults()) {
            results.judged.emplace(one->name(), one->measurement()->doubleValue());
        }
        results.judged.erase("Actual Frames");
    }
    return results;
}

// Whether a run has everything that a good one has.
bool isWhole(const std::optional<Results>& results, const Results& healthy) {
    return results.has_value() && results->values.captured >= healthy.values.captured &&
           results->values.hasSameValues(healthy.values) && results->judged == healthy.judged;
}

// A run on a device of its own in which the n-th allocation fails; 0: none does. Says on the standard
// error what it finds wrong.
Outcome runOnce(const Run& run, Seconds timeout, long failing, const Results& healthy) {
    const long before = liveAllocations;
    const std::size_t descriptorsBefore = test::descriptorCount();
    Outcome outcome = kHealthy;
    {
        platform::installServices(makeDevice());
        platform::ErrorRef error;
        const platform::Dictionary parameters = run.parameters(timeout);
        std::optional<Results> results;
        const auto started = std::chrono::steady_clock::now();
        allocationsToFailure = failing;
        try {
            results = takeTurn(run, parameters, &error);
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
        if (outcome == kHealthy && !isWhole(results, healthy)) {
            std::cerr << "not the result of a good run\n";
            outcome = kWrong;
        }
        platform::installServices({});
    }
    if (!test::eventually([&] { return test::threadCount() == 1; })) {
        std::cerr << test::threadCount() << " threads are left\n";
        return kWrong;
    }
    if (liveAllocations != before || test::descriptorCount() != descriptorsBefore) {
        std::cerr << liveAllocations - before << " allocations are left, and "
                  << test::descriptorCount() << " descriptors of " << descriptorsBefore << '\n';
        return kWrong;
    }
    return outcome;
}

class EveryAllocation : public ::testing::TestWithParam<Run> {};

TEST_P(EveryAllocation, FailsOnceWithoutHarm) {
    platform::setLogSink(std::make_shared<DiscardingSink>(), platform::LogLevel::Debug);
    const auto runLoop = platform::RunLoop::forThisThread();
    // The first run leaves what is made once in a process.
    platform::installServices(makeDevice());
    const auto first = takeTurn(GetParam(), GetParam().parameters(kLongTimeout), nullptr);
    platform::installServices({});
    ASSERT_TRUE(test::eventually([] { return test::threadCount() == 1; }));
    ASSERT_TRUE(first.has_value());
    Results healthy = *first;
    if (healthy.values.captured > 0) {
        ASSERT_GE(healthy.values.captured, kAskedFor);
        healthy.values.captured = kAskedFor;  // more come by chance
    }

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
            Outcome outcome = runOnce(GetParam(), timeout, failing, healthy);
            if (runOnce(GetParam(), timeout, 0, healthy) != kHealthy) {
                std::cerr << "the next run is not a good one\n";
                outcome = kWrong;
            }
            _exit(outcome);
        }
        int status = 0;
        ASSERT_EQ(waitpid(child, &status, 0), child);
        if (seen->late && timeout < kLongTimeout) {
            timeout = std::min(16 * timeout, kLongTimeout);  // the machine was too slow: once more
            continue;
        }
        timeout = kTimeout;
        EXPECT_FALSE(seen->late) << "only the time-out ended the run";
        reached = seen->failed;
        ++failing;
        if (WIFSIGNALED(status)) {
            EXPECT_EQ(WTERMSIG(status), SIGABRT);
            EXPECT_FALSE(seen->onHostThread) << "the exception did not leave the call";
            ++outcomes["ended the process"];
        } else if (reached) {
            EXPECT_THAT(WEXITSTATUS(status), ::testing::AnyOf(kThrew, kNoStream));
            ++outcomes["left the call"];
        } else {
            EXPECT_EQ(WEXITSTATUS(status), kHealthy);  // the last run, in which none failed
        }
    }
    for (const auto& [outcome, count] : outcomes) {
        std::cout << count << " allocations: " << outcome << '\n';
    }
    EXPECT_GT(outcomes["left the call"], 10);
}

INSTANTIATE_TEST_SUITE_P(Runs,
                         EveryAllocation,
                         ::testing::ValuesIn(allRuns()),
                         [](const auto& info) { return std::string(info.param.name); });

// A teardown that succeeds allocates nothing. This one fails: there is no device to invalidate.
TEST(FailingTeardown, ThrowsWhenAnAllocationOfItsErrorFails) {
    ZRVantorFaultExperiment experiment;
    long failing = 0;
    do {
        ++failing;
        seen->failed = false;
        const long before = liveAllocations;
        {
            platform::ErrorRef error;
            bool threw = false;
            allocationsToFailure = failing;
            try {
                experiment.teardown(&error);
            } catch (const std::bad_alloc&) {
                threw = true;
            }
            allocationsToFailure = 0;
            EXPECT_EQ(threw, seen->failed);
            EXPECT_EQ(error != nullptr, !threw);
        }
        EXPECT_EQ(liveAllocations, before);
    } while (seen->failed);
    EXPECT_GT(failing, 1);
}

}  // namespace
