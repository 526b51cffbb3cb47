// Two faults in one run: whatever comes of it, it keeps to what holds for every run.
//
//     ZR_FAULT_PAIRS=100000 ZR_FAULT_SEED=17 faulty_test --gtest_filter='FaultPairs.*'
//
// tries so many pairs of each experiment, chosen by the seed; or all of them when there are no more. Without the
// variables there are a few, and the seed is another one every time.
#include <algorithm>
#include <cstdlib>
#include <random>
#include <set>

#include "tests/devices/faulty/sweep.h"

namespace {

using faulty::Fault;
using faulty::FaultyDevice;
using faulty::Step;
using faulty::StepKind;
using faulty::Way;
using test::Ending;
using test::kUntouched;

struct Pair {
    std::vector<Fault> faults;
    std::string name;
};

std::uint64_t setting(const char* variable, std::uint64_t otherwise) {
    const char* text = std::getenv(variable);
    return text != nullptr ? std::strtoull(text, nullptr, 10) : otherwise;
}

// Whether `later` is not taken before `earlier`, as far as their numbers say.
bool comesAfter(const faulty::Place& later, const faulty::Place& earlier) {
    return later.kind == earlier.kind ? later.number > earlier.number : later.kind > earlier.kind;
}

class FaultPairs : public test::Sweep {
  protected:
    void sweep(const test::Subject& subject) {
        const std::uint64_t seed = setting("ZR_FAULT_SEED", std::random_device()());
        const std::uint64_t most = setting("ZR_FAULT_PAIRS", 100);
        std::vector<Pair> pairs = pairsOf(subject);
        const std::size_t all = pairs.size();
        std::shuffle(pairs.begin(), pairs.end(), std::mt19937_64(seed));
        pairs.resize(std::min<std::size_t>(all, most));
        std::printf("%zu of %zu pairs of faults, ZR_FAULT_SEED=%llu\n", pairs.size(), all,
                    static_cast<unsigned long long>(seed));
        for (const Pair& pair : pairs) {
            for (const bool withSlot : {true, false}) {
                const FaultyDevice device(test::makeSmallDevice, pair.faults);
                const std::string name =
                    pair.name + (withSlot ? ", error slot" : ", no error slot");
                SCOPED_TRACE(name);
                const Ending ending =
                    run(subject, device, timeoutFor(subject, pair), withSlot, name);
                check(ending, device.strikes(), withSlot);
            }
            runHealthy(subject, "without a fault after: " + pair.name);
        }
    }

  private:
    std::vector<Step> runHealthy(const test::Subject& subject, const std::string& name) {
        SCOPED_TRACE(name);
        const FaultyDevice device(test::makeSmallDevice);
        const Ending ending = run(subject, device, subject.generous, true, name);
        EXPECT_NE(ending.result, nullptr);
        EXPECT_EQ(ending.error, kUntouched);
        EXPECT_TRUE(ending.isTornDown);
        return device.steps();
    }

    // Each fault of a run, with each fault that comes later in a run with it: a step that the first fault
    // leads to is among them.
    std::vector<Pair> pairsOf(const test::Subject& subject) {
        std::vector<Pair> pairs;
        const auto within = [](const Step& step) {
            return step.place.kind <= StepKind::Call || step.place.number <= test::kAskedFor;
        };
        for (const Step& first : runHealthy(subject, "no fault")) {
            for (const Way firstWay : within(first) ? first.ways : std::span<const Way>()) {
                const Fault fault{first.place, firstWay};
                const FaultyDevice device(test::makeSmallDevice, {fault});
                const Pair alone{{fault}, first.text(firstWay)};
                run(subject, device, timeoutFor(subject, alone), true, alone.name);
                for (const Step& second : device.steps()) {
                    for (const Way secondWay : second.ways) {
                        if (within(second) && comesAfter(second.place, first.place)) {
                            pairs.push_back({{fault, {second.place, secondWay}},
                                             alone.name + "; " + second.text(secondWay)});
                        }
                    }
                }
            }
        }
        return pairs;
    }

    // Only the image experiment runs out of time by a fault: of the call that lets reports come.
    static double timeoutFor(const test::Subject& subject, const Pair& pair) {
        const bool runsOut = pair.name.find("setInputReportCallback is lost") != std::string::npos;
        return runsOut ? 0 : subject.generous;
    }

    static void check(const Ending& ending,
                      const std::vector<faulty::Strike>& strikes,
                      bool withSlot) {
        const auto isOfAFault = [&](const platform::ErrorRef& error) {
            return std::any_of(strikes.begin(), strikes.end(),
                               [&](const auto& strike) { return strike.error == error; });
        };
        const auto checkSlot = [&](const platform::ErrorRef& slot) {
            if (!isOfAFault(slot)) {
                EXPECT_TRUE(slot->domain().starts_with("ZR")) << slot->domain();
                EXPECT_TRUE(slot->underlyingError() == nullptr ||
                            isOfAFault(slot->underlyingError()));
            }
        };
        EXPECT_TRUE(ending.exception.empty() || ending.exception == "No HID Manager available?!");
        const bool hasNone = ending.error == kUntouched;
        if (!withSlot) {
            EXPECT_TRUE(hasNone && ending.teardownError == kUntouched);
            return;
        }
        if (!hasNone) {
            checkSlot(ending.error);
        }
        // A stream whose port type cannot be read is reported, and the run goes on.
        EXPECT_NE(
            ending.result != nullptr || !ending.exception.empty(),
            !hasNone && ending.error->localizedDescription() != "Failed to get stream port type!");
        EXPECT_EQ(ending.isTornDown, ending.teardownError == kUntouched);
        if (!ending.isTornDown) {
            checkSlot(ending.teardownError);
        }
    }
};

TEST_F(FaultPairs, OfTheFaultExperiment) {
    sweep(test::kFaultExperiment);
}
TEST_F(FaultPairs, OfTheCounterExperiment) {
    sweep(test::kCounterExperiment);
}
TEST_F(FaultPairs, OfTheImageExperiment) {
    sweep(test::kImageExperiment);
}

}  // namespace
