// The host sequence over a scripted experiment and analysis: which steps are called, and what is
// recorded when one fails.
#include "host/run/sequence.h"

#include <functional>
#include <latch>
#include <memory>
#include <stdexcept>
#include <stop_token>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "host/record/run_text.h"
#include "host/run/planner.h"
#include "platform/log.h"
#include "platform/run_loop.h"
#include "platform/work_queue.h"

namespace {

using host::RunRecord;
using host::Verdict;
using testing::ElementsAre;

// What the scripted parts do, and what was called.
struct Script {
    std::string failing = {};  // the step that fails
    bool silently = false;     // without an error object
    bool throwing = false;
    std::string null = {};  // the step whose result lacks a measurement
    std::vector<std::string> calls = {};
    std::function<void()> during = {};  // the run

    bool step(const std::string& name, platform::ErrorSlot error) {
        calls.push_back(name);
        if (name != failing) {
            return true;
        }
        if (throwing) {
            throw std::logic_error("No HID Manager available?!");
        }
        if (!silently) {
            static_cast<void>(platform::fail(error, "domain", 7, nullptr, "%@ failed", name));
        }
        return false;
    }
};
Script script;

class Scripted final : public ZRExperiment, public ZRAnalysis, public ZRSetup, public ZRTeardown {
  public:
    explicit Scripted(std::string part) : _part(std::move(part)) {}
    ZRDescription experimentDescription() const override { return ZRDescription("e"); }
    ZRDescription analysisDescription() const override { return ZRDescription("a"); }
    bool setupWithParameters(const platform::Dictionary&,
                             ZRDiagnosticHost*,
                             platform::ErrorSlot error) override {
        return script.step(_part + " setup", error);
    }
    ZRExperimentResultRef run(platform::ErrorSlot error) override {
        auto result = std::make_shared<ZRExperimentResult>();
        result->measurements().set(
            "n", script.null == "run"
                     ? nullptr
                     : std::make_shared<const Measurement>(1.0, ZRDimensionlessUnit::frames()));
        if (script.during) {
            script.during();
        }
        return script.step("run", error) ? result : nullptr;
    }
    bool teardown(platform::ErrorSlot error) override {
        return script.step(_part + " teardown", error);
    }
    ZRAnalysisResultRef analyzeExperimentResult(const ZRExperimentResult& result,
                                                platform::ErrorSlot error) override {
        auto analysed = std::make_shared<ZRAnalysisResult>();
        analysed->measuredResults().push_back(std::make_shared<ZRMeasuredResult>(
            "n", script.null == "analyze" ? nullptr : *result.measurements().find("n")));
        return script.step("analyze", error) ? analysed : nullptr;
    }

  private:
    std::string _part;
};

host::RunRecorder& recorder() {
    static const auto shared =
        std::make_shared<host::RunRecorder>([](const host::LogRecord&) {}, false);
    return *shared;
}

host::SequenceOutcome runScript(Script given, std::stop_token stop, const char* name = "ScriptD") {
    ZRLab& lab = ZRLab::defaultLab();
    lab.addExperimentWithName("ScriptE", [] { return std::make_shared<Scripted>("experiment"); });
    lab.addAnalysisWithName("ScriptA", [] { return std::make_shared<Scripted>("analysis"); });
    lab.addDiagnosticWithName("ScriptD", "d", "ScriptE", "ScriptA");
    script = std::move(given);
    return host::runOnce({lab, recorder(), {}, std::move(stop)},
                         host::planRuns(lab, {name}, {}).front(), 1);
}

RunRecord runScript(Script given) {
    return runScript(std::move(given), {}).run;
}

TEST(Sequence, CallsEveryStepInOrder) {
    const RunRecord run = runScript({});
    EXPECT_THAT(script.calls, ElementsAre("experiment setup", "run", "experiment teardown",
                                          "analysis setup", "analyze", "analysis teardown"));
    EXPECT_EQ(run.verdict, Verdict::Passed);
    EXPECT_EQ(run.measurements.size(), 1U);
    EXPECT_EQ(run.results.size(), 1U);
}

TEST(Sequence, AFailedStepEndsWhatDependsOnIt) {
    struct Row {
        const char* failing;
        const char* recordedStep;
        std::vector<std::string> calls;
    };
    const Row rows[] = {
        {"experiment setup", "setup", {"experiment setup"}},
        {"run", "run", {"experiment setup", "run", "experiment teardown"}},
        {"experiment teardown",
         "teardown",
         {"experiment setup", "run", "experiment teardown", "analysis setup", "analyze",
          "analysis teardown"}},
        {"analysis setup",
         "setup",
         {"experiment setup", "run", "experiment teardown", "analysis setup"}},
        {"analysis teardown",
         "teardown",
         {"experiment setup", "run", "experiment teardown", "analysis setup", "analyze",
          "analysis teardown"}},
        {"analyze",
         "analyze",
         {"experiment setup", "run", "experiment teardown", "analysis setup", "analyze",
          "analysis teardown"}},
    };
    for (const Row& row : rows) {
        for (const int way : {0, 1, 2}) {
            const RunRecord run =
                runScript({.failing = row.failing, .silently = way == 1, .throwing = way == 2});
            EXPECT_EQ(script.calls, row.calls) << row.failing;
            EXPECT_EQ(run.verdict, Verdict::Error);
            ASSERT_EQ(run.failures.size(), 1U) << row.failing;
            EXPECT_EQ(run.failures[0].step, row.recordedStep);
            const std::string expected[] = {std::string(row.failing) + " failed",
                                            "failed without an error",
                                            "No HID Manager available?!"};
            EXPECT_EQ(host::failureText(run.failures[0]), expected[way]);
        }
    }
}

TEST(Sequence, AResultWithoutAMeasurementIsAnError) {
    const std::pair<const char*, const char*> rows[] = {
        {"run", "the measurement \"n\" is null"},
        {"analyze", "the measured result \"n\" has no measurement"}};
    for (const auto& [step, message] : rows) {
        const RunRecord run = runScript({.null = step});
        EXPECT_EQ(run.verdict, Verdict::Error);
        ASSERT_EQ(run.failures.size(), 1U);
        EXPECT_EQ(run.failures[0].step, step);
        EXPECT_EQ(host::failureText(run.failures[0]), message);
    }
}

TEST(Sequence, AMisuseOfTheDeviceIsAnError) {
    recorder().misused("property written before control was requested");
    const RunRecord run = runScript({}, {}, "ScriptE").run;
    EXPECT_EQ(run.verdict, Verdict::Error);
    ASSERT_EQ(run.failures.size(), 1U);
    EXPECT_EQ(host::failureText(run.failures[0]), "property written before control was requested");
}

// The request ends the run's loop; what that makes fail is not the unit's fault.
TEST(Sequence, ARequestToStopEndsARunLoopAndStartsNothingNew) {
    for (const char* failing : {"", "run"}) {
        std::stop_source stop;
        const auto untilStopped = [&stop] {
            const auto loop = platform::RunLoop::forThisThread();
            const auto source =
                std::make_shared<platform::RunLoopSource>([&stop] { stop.request_stop(); });
            loop->addSource(source, platform::kRunLoopDefaultMode);
            source->signal();
            loop->run(platform::kRunLoopDefaultMode, 60);
        };
        const auto [run, isGivenUp] =
            runScript({.failing = failing, .during = untilStopped}, stop.get_token());
        EXPECT_FALSE(isGivenUp);
        EXPECT_EQ(run.verdict, Verdict::Interrupted);
        EXPECT_THAT(run.failures, testing::IsEmpty());
        EXPECT_EQ(run.measurements.size(), *failing == '\0' ? 1U : 0U);
        EXPECT_THAT(script.calls, ElementsAre("experiment setup", "run", "experiment teardown"));
    }
}

// The record is whole at once; what the blocked thread does later reaches neither it nor a listener.
TEST(Sequence, GivesUpARunThatDoesNotEnd) {
    std::stop_source stop;
    std::latch blocked(1);
    std::latch back(1);
    recorder().misused("a rule");
    const auto untilReleased = [&] {
        stop.request_stop();
        blocked.wait();
        back.count_down();
        throw std::runtime_error("too late");
    };
    const auto [run, isGivenUp] = runScript({.during = untilReleased}, stop.get_token());
    EXPECT_TRUE(isGivenUp);
    EXPECT_EQ(run.verdict, Verdict::Interrupted);
    EXPECT_GE(run.seconds, 0.5);
    ASSERT_EQ(run.failures.size(), 1U);
    EXPECT_EQ(host::failureText(run.failures[0]), "a rule");
    EXPECT_THAT(script.calls, ElementsAre("experiment setup"));
    blocked.count_down();
    back.wait();
}

// A line that a run's delayed item logs when the next run is in progress.
TEST(Sequence, ALineBelongsToTheRunThatCausedIt) {
    const platform::Log log("test", "sequence");
    platform::WorkQueue queue("late", platform::WorkQueue::Priority::UserInteractive);
    std::latch firstIsOver(1);
    std::latch written(1);
    const auto write = [&log](std::string_view text) {
        log.write(platform::LogLevel::Error, [text] { return text; });
    };
    platform::setLogSink(std::shared_ptr<platform::LogSink>(&recorder(), [](auto*) {}),
                         platform::LogLevel::Error);
    const RunRecord first = runScript({.during = [&] {
        write("of the first");
        queue.async([&] {
            firstIsOver.wait();
            write("late");
            recorder().imageDelivered(1);
            recorder().misused("a late misuse");
            written.count_down();
        });
    }});
    const RunRecord second = runScript({.during = [&] {
        write("of the second");
        firstIsOver.count_down();
        written.wait();
    }});
    platform::setLogSink(nullptr, platform::LogLevel::Default);
    const auto texts = [](const RunRecord& run) {
        std::vector<std::string> lines;
        for (const host::LogRecord& line : run.log) {
            lines.push_back(line.message);
        }
        return lines;
    };
    EXPECT_THAT(texts(first), ElementsAre("of the first"));
    EXPECT_THAT(texts(second), ElementsAre("of the second"));
    EXPECT_EQ(second.verdict, Verdict::Passed);
    EXPECT_EQ(recorder().images(), 0U);
    const auto late = recorder().takeLateLines();
    ASSERT_EQ(late.size(), 2U);
    EXPECT_EQ(late[0].first, first.tag);
    EXPECT_EQ(late[0].second.message, "late");
    EXPECT_TRUE(late[0].second.late);
    EXPECT_EQ(late[1].second.message, "a late misuse");
}

}  // namespace
