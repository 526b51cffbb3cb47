#include "host/run/planner.h"

#include <memory>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "host/record/problem.h"

namespace {

using host::Part;
using platform::Number;

class Parameterised final : public ZRExperiment, public ZRAnalysis {
  public:
    ZRDescription experimentDescription() const override {
        ZRDescription description("Takes two.");
        description.addParameter(ZRNumberParameter("How many.", true), "count");
        description.addParameter(ZRNumberParameter("How long.", false), "seconds");
        return description;
    }
    ZRDescription analysisDescription() const override {
        ZRDescription description("Takes one.");
        description.addParameter(ZRNumberParameter("How many.", true), "count");
        return description;
    }
    ZRExperimentResultRef run(platform::ErrorSlot) override { return nullptr; }
    ZRAnalysisResultRef analyzeExperimentResult(const ZRExperimentResult&,
                                                platform::ErrorSlot) override {
        return nullptr;
    }
};

const ZRLab& lab() {
    static const ZRLab& filled = []() -> ZRLab& {
        ZRLab& lab = ZRLab::defaultLab();
        lab.addExperimentWithName("PlanExperiment",
                                  [] { return std::make_shared<Parameterised>(); });
        lab.addAnalysisWithName("PlanAnalysis", [] { return std::make_shared<Parameterised>(); });
        lab.addDiagnosticWithName("PlanDiagnostic", "Both.", "PlanExperiment", "PlanAnalysis");
        lab.addDiagnosticWithName("HalfDiagnostic", "Half.", "PlanExperiment", "Nowhere");
        return lab;
    }();
    return filled;
}

// The problem of planning with these settings, or "planned".
std::string plan(const std::vector<std::string>& names,
                 const std::vector<std::string>& texts,
                 std::vector<host::RunPlan>* plans = nullptr) {
    try {
        std::vector<host::ParameterSetting> settings;
        for (const std::string& text : texts) {
            settings.push_back(host::readSetting(text));
        }
        auto made = host::planRuns(lab(), names, settings);
        if (plans != nullptr) {
            *plans = std::move(made);
        }
        return "planned";
    } catch (const host::Problem& problem) {
        EXPECT_EQ(problem.status(), host::kExitUsage);
        return problem.what();
    }
}

TEST(Setting, ReadsNumbersOfTheFittingKind) {
    const std::pair<const char*, Number> rows[] = {
        {"a=90", Number(std::int64_t{90})},
        {"a=-1", Number(std::int64_t{-1})},
        {"a=18446744073709551615", Number(std::uint64_t{18446744073709551615U})},
        {"a=0.5", Number(0.5)},
        {"a=1e3", Number(1000.0)},
        {"a=inf", Number(std::numeric_limits<double>::infinity())},
        {"a=true", Number(true)},
        {"a=false", Number(false)},
    };
    for (const auto& [text, expected] : rows) {
        const host::ParameterSetting setting = host::readSetting(text);
        EXPECT_EQ(setting.value, expected) << text;
        EXPECT_EQ(setting.name, "a");
        EXPECT_FALSE(setting.part.has_value());
    }
}

TEST(Setting, NamesWhatIsWrong) {
    const std::pair<const char*, const char*> rows[] = {
        {"a", "--set a: not of the form PARAM=VALUE"},
        {"=1", "--set =1: not of the form PARAM=VALUE"},
        {"experiment:=1", "--set experiment:=1: not of the form PARAM=VALUE"},
        {"a=", "--set a=: \"\" is not a valid number"},
        {"a=9x", "--set a=9x: \"9x\" is not a valid number"},
        {"a=18446744073709551616",
         "--set a=18446744073709551616: \"18446744073709551616\" is not a valid number"},
    };
    for (const auto& [text, expected] : rows) {
        EXPECT_EQ(plan({"PlanExperiment"}, {text}), expected);
    }
}

TEST(RunPlan, GivesEachPartWhatItDeclares) {
    std::vector<host::RunPlan> plans;
    ASSERT_EQ(plan({"PlanDiagnostic", "PlanExperiment"},
                   {"analysis:count=2", "count=3", "seconds=1", "seconds=1.5"}, &plans),
              "planned");
    ASSERT_EQ(plans.size(), 2U);
    EXPECT_EQ(plans[0].summary, "Both.");
    EXPECT_EQ(plans[0].experiment.asDictionary(),
              (platform::Dictionary{{"count", std::int64_t{3}}, {"seconds", 1.5}}));
    EXPECT_EQ(plans[0].analysis->asDictionary(),
              (platform::Dictionary{{"count", std::int64_t{2}}}));
    EXPECT_FALSE(plans[1].isDiagnostic());
    EXPECT_EQ(plans[1].summary, "Takes two.");
    EXPECT_FALSE(plans[1].analysis.has_value());
}

TEST(RunPlan, RefusesBeforeAnythingRuns) {
    struct Row {
        std::vector<std::string> names;
        std::vector<std::string> settings;
        const char* problem;
    };
    const Row rows[] = {
        {{"PlanDiagnostik"},
         {},
         "unknown diagnostic or experiment \"PlanDiagnostik\"; did you mean PlanDiagnostic?"},
        {{"Zzz"}, {}, "unknown diagnostic or experiment \"Zzz\"; zrlab list shows them"},
        {{"PlanAnalysis"},
         {},
         "PlanAnalysis is an analysis: it is run as a part of a diagnostic, PlanDiagnostic"},
        {{"PlanExperiment"},
         {},
         "no value for \"count\" of the experiment PlanExperiment; give one with --set "
         "PARAM=NUMBER"},
        {{"PlanDiagnostic"},
         {"experiment:count=1"},
         "no value for \"count\" of the analysis PlanAnalysis; give one with --set PARAM=NUMBER"},
        {{"PlanDiagnostic"},
         {},
         "no value for \"count\" of the experiment PlanExperiment, \"count\" of the analysis "
         "PlanAnalysis; give one with --set PARAM=NUMBER"},
        {{"PlanExperiment"},
         {"coumt=1"},
         "none of the parts to be run declares a parameter \"coumt\"; did you mean count?"},
        {{"PlanExperiment"},
         {"count=1", "analysis:count=1"},
         "no analysis to be run declares a parameter \"count\"; zrlab describe NAME shows them"},
        {{"PlanExperiment", "count=1"},
         {},
         "unknown diagnostic or experiment \"count=1\"; did you mean --set count=1?"},
        {{"HalfDiagnostic"}, {"count=1"}, "HalfDiagnostic: its analysis Nowhere is not registered"},
    };
    for (const Row& row : rows) {
        EXPECT_EQ(plan(row.names, row.settings), row.problem);
    }
}

TEST(RunPlan, WarnsOfValuesThatMayBeReadDifferently) {
    const char* kNoCount = " is not a whole number from 0 to 9007199254740992";
    const char* kNoSeconds = " is not a number of seconds from 0";
    const std::pair<const char*, const char*> rows[] = {
        {"images=2.7", kNoCount},  {"images=-1", kNoCount},    {"images=nan", kNoCount},
        {"images=1e30", kNoCount}, {"timeout=-1", kNoSeconds}, {"timeout=nan", kNoSeconds},
        {"images=1e3", nullptr},   {"timeout=0.5", nullptr},   {"timeout=inf", nullptr},
        {"frameCount=0", nullptr}, {"count=-2.7", nullptr},
    };
    for (const auto& [text, problem] : rows) {
        const host::ParameterSetting setting = host::readSetting(text);
        host::RunPlan plan;
        plan.experiment.parameters = {{setting.name, setting.value}};
        plan.analysis = plan.experiment;  // of both parts only one line
        std::vector<std::string> expected;
        if (problem != nullptr) {
            expected = {"warning: " + setting.name + " " + setting.value.text() + problem +
                        "; the run may use another value"};
        }
        EXPECT_EQ(host::valueWarnings({plan, plan}), expected) << text;
    }
}

}  // namespace
