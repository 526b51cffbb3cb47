// Two faults in one run: whatever comes of it, it keeps to what holds for every run.
//
//     ZR_FAULT_PAIRS=100000 ZR_FAULT_SEED=17 faulty_test --gtest_filter='FaultPairs.*'
//
// tries that many pairs of each experiment, chosen by the seed, or all of them if there are fewer. Without the
// variables it tries a few, and the seed is another one every time.
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

    // Each fault of a run, with each fault that can come later in a run with it: a call that only the first
    // fault leads to is among them.
    std::vector<Pair> pairsOf(const test::Subject& subject) {
        std::vector<Pair> pairs;
        std::vector<Step> healthy = runHealthy(subject, "no fault");
        std::erase_if(healthy, [](const Step& step) { return !test::isCertain(step); });
        for (const Step& first : healthy) {
            for (const Way firstWay : first.ways) {
                const Fault fault{first.place, firstWay};
                const FaultyDevice device(test::makeSmallDevice, {fault});
                const Pair alone{{fault}, first.text(firstWay)};
                run(subject, device, timeoutFor(subject, alone), true, alone.name);
                for (const Step& second : laterSteps(first, device.steps(), healthy)) {
                    for (const Way secondWay : second.ways) {
                        pairs.push_back({{fault, {second.place, secondWay}},
                                         alone.name + "; " + second.text(secondWay)});
                    }
                }
            }
        }
        return pairs;
    }

    // The services and calls of the run with the first fault, and the deliveries that are asked for, when
    // there were any: how many came of them is not certain.
    static std::vector<Step> laterSteps(const Step& first,
                                        const std::vector<Step>& taken,
                                        const std::vector<Step>& healthy) {
        std::vector<Step> later;
        const auto add = [&](const Step& step) {
            if (comesAfter(step.place, first.place)) {
                later.push_back(step);
            }
        };
        std::set<StepKind> delivered;
        for (const Step& step : taken) {
            if (step.place.kind <= StepKind::Call) {
                add(step);
            } else {
                delivered.insert(step.place.kind);
            }
        }
        for (const Step& step : healthy) {
            if (delivered.contains(step.place.kind)) {
                add(step);
            }
        }
        return later;
    }

    // A sensor that got no callback sends nothing. A stream that neither stops nor is invalidated goes on
    // until the experiment lets go of it, which the time-out keeps alive.
    static double timeoutFor(const test::Subject& subject, const Pair& pair) {
        const auto has = [&](std::string_view text) {
            return pair.name.find(text) != std::string::npos;
        };
        if (has("setInputReportCallback is lost")) {
            return 0;
        }
        return has("stop fails") && has("invalidate fails") ? 0.1 : subject.generous;
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
        if (!withSlot) {
            return;  // there is nothing to look at: a write would have ended the process
        }
        const bool hasNone = ending.error == kUntouched;
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
