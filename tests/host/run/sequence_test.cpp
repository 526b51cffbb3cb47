// The host sequence over a scripted experiment and analysis: which steps are called, and what is
// recorded when one fails.
#include "host/run/sequence.h"

#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "host/record/run_text.h"
#include "host/run/planner.h"

namespace {

using host::RunRecord;
using host::Verdict;
using testing::ElementsAre;

// What the scripted parts do, and what was called.
struct Script {
    std::string failing;    // the step that fails
    bool silently = false;  // without an error object
    bool throwing = false;
    std::string null;  // the step whose result lacks a measurement
    std::vector<std::string> calls;

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

RunRecord runScript(Script given) {
    ZRLab& lab = ZRLab::defaultLab();
    lab.addExperimentWithName("ScriptE", [] { return std::make_shared<Scripted>("experiment"); });
    lab.addAnalysisWithName("ScriptA", [] { return std::make_shared<Scripted>("analysis"); });
    lab.addDiagnosticWithName("ScriptD", "d", "ScriptE", "ScriptA");
    script = std::move(given);
    const auto plans = host::planRuns(lab, {"ScriptD"}, {});
    host::RunRecorder recorder([](const host::LogRecord&) {}, false);
    return host::runOnce(lab, plans.front(), 1, recorder, {});
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
            const RunRecord run = runScript({.failing = row.failing,
                                             .silently = way == 1,
                                             .throwing = way == 2,
                                             .null = {},
                                             .calls = {}});
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
        const RunRecord run = runScript({.failing = {}, .null = step, .calls = {}});
        EXPECT_EQ(run.verdict, Verdict::Error);
        ASSERT_EQ(run.failures.size(), 1U);
        EXPECT_EQ(run.failures[0].step, step);
        EXPECT_EQ(host::failureText(run.failures[0]), message);
    }
}

TEST(Sequence, AMisuseOfTheDeviceIsAnError) {
    ZRLab& lab = ZRLab::defaultLab();
    runScript({});
    const auto plans = host::planRuns(lab, {"ScriptE"}, {});
    host::RunRecorder recorder([](const host::LogRecord&) {}, false);
    recorder.misused("property written before control was requested");
    const RunRecord run = host::runOnce(lab, plans.front(), 1, recorder, {});
    EXPECT_EQ(run.verdict, Verdict::Error);
    ASSERT_EQ(run.failures.size(), 1U);
    EXPECT_EQ(host::failureText(run.failures[0]), "property written before control was requested");
}

}  // namespace
