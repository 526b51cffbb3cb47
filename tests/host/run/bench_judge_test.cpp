#include "host/run/bench_judge.h"

#include <cmath>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include <gtest/gtest.h>

#include "host/run/judge.h"

namespace {

using host::BenchLimit;
using host::BenchResult;
using host::BoundRecord;
using host::Judgement;
using host::RunRecord;
using host::Verdict;

constexpr BoundRecord kNought{0, false};

std::size_t figureOf(std::string_view key, host::FigureGroup group = host::FigureGroup::Frames) {
    for (std::size_t at = 0; at < host::kFigureCount; ++at) {
        if (host::kFigures[at].key == key && host::kFigures[at].group == group) {
            return at;
        }
    }
    throw std::out_of_range(std::string(key));
}

std::vector<BenchResult> judged(const BenchLimit& limit,
                                const std::vector<host::FrameRecord>& frames,
                                const RunRecord& run) {
    host::BenchJudge judge({limit});
    judge.begin();
    judge.add({.frames = frames, .metadata = {}, .events = {}});
    return judge.judge(run);
}

RunRecord runOf() {
    RunRecord run;
    run.plan.name = "D";
    run.measurements = {{"LPDP", 4, "errors"}, {"UART", 0, "errors"}};
    run.framesDelivered = 3;
    const platform::List samples{3, 30};
    const platform::List others{4, -40};
    run.auxiliaryData = {
        {"images", platform::List{platform::Dictionary{
                       {"tmonDataInC", 86.1F}, {"dScanI", samples}, {"dScanQ", others}}}}};
    return run;
}

// Three frames; the last one comes late and lacks the thermistor's temperature.
std::vector<host::FrameRecord> framesOf(double hottest) {
    std::vector<host::FrameRecord> frames(3);
    frames[1].presentation = 0.03125;
    frames[2].presentation = 0.125;
    frames[2].delivered = 0.25;
    frames[0].temperatures[0] = 20;
    frames[1].temperatures[0] = hottest;
    return frames;
}

struct BenchRow {
    const char* what;
    BenchLimit limit;
    std::vector<std::string> found;  // name, value, judgement of each result
};

BenchLimit on(std::optional<std::size_t> figure,
              const std::string& measurement,
              std::optional<BoundRecord> lower,
              std::optional<BoundRecord> upper) {
    return {"D", figure, measurement, {"Desk", lower, upper}, true};
}

TEST(BenchJudge, JudgesMeasurementsAndFigures) {
    static constexpr const char* kJudgements[] = {"information", "within", "outside",
                                                  "not measured"};
    const auto images = host::FigureGroup::Images;
    const BenchRow rows[] = {
        {"a measurement", on({}, "LPDP", {}, kNought), {"LPDP 4 errors outside"}},
        {"both bounds", on({}, "UART", kNought, kNought), {"UART 0 errors within"}},
        {"a slip",
         on({}, "LPD", {}, kNought),
         {"LPD nan  not measured: the run has no such measurement; did you mean LPDP?"}},
        {"least and greatest",
         on(figureOf("NTCTemperatureIdle"), "", BoundRecord{20, true}, BoundRecord{30, false}),
         {"NTC idle, least 20  outside", "NTC idle, greatest 30  within"}},
        {"a temperature that no frame has",
         on(figureOf("DIETemperatureIdle"), "", {}, kNought),
         {"DIE idle, greatest nan  not measured: no frame has it"}},
        {"an interval",
         on(figureOf("interval"), "", {}, BoundRecord{93.75, true}),
         {"frame interval, greatest 93.75 ms outside"}},
        {"arrival",
         on(figureOf("arrivalInterval"), "", kNought, {}),
         {"frame arrival interval, least 0 ms within"}},
        {"frames without numbers",
         on(figureOf("lost"), "", {}, kNought),
         {"frames lost nan  not measured: the device does not number its frames"}},
        {"a float as the sensor says it",
         on(figureOf("temperature", images), "", {}, BoundRecord{86.1, false}),
         {"image temperature, greatest 86.1 °C within"}},
        {"an amplitude",
         on(figureOf("amplitude", images), "", BoundRecord{50, true}, {}),
         {"image amplitude, least 50  outside"}},
    };
    for (const BenchRow& row : rows) {
        std::vector<std::string> found;
        for (const BenchResult& one : judged(row.limit, framesOf(30), runOf())) {
            found.push_back(one.name + " " + platform::Number(one.value).text() + " " + one.unit +
                            " " + kJudgements[static_cast<int>(one.judgement)] +
                            (one.note.empty() ? "" : ": " + one.note));
        }
        EXPECT_EQ(found, row.found) << row.what;
    }
    RunRecord run = runOf();
    run.framesLost = 2;
    EXPECT_EQ(judged(on(figureOf("lost"), "", {}, kNought), {}, run)[0].value, 2);
    run.plan.name = "another";
    EXPECT_TRUE(judged(rows[0].limit, {}, run).empty());
    const auto broken = judged(rows[3].limit, framesOf(std::nan("")), runOf());
    EXPECT_EQ(broken[0].judgement, Judgement::Outside) << "NaN is within no limit";
}

TEST(BenchJudge, KeepsNothingOfTheRunBefore) {
    host::BenchJudge judge({on(figureOf("interval"), "", {}, kNought)});
    EXPECT_TRUE(judge.followsFrames());
    EXPECT_TRUE(judge.hasLimitsFor("D"));
    EXPECT_FALSE(host::BenchJudge({on(figureOf("lost"), "", {}, kNought)}).followsFrames());
    judge.add({.frames = framesOf(0), .metadata = {}, .events = {}});
    judge.begin();
    EXPECT_EQ(judge.judge(runOf())[0].judgement, Judgement::NotMeasured);
}

// A value that is known to be outside comes before one that could not be measured.
TEST(BenchJudge, IsPartOfTheVerdictOnlyWhereItSaysSo) {
    struct Case {
        std::vector<Judgement> found;
        bool moduleOutside;
        bool moduleFails;
        Verdict counted;
        Verdict notCounted;
    };
    const Case cases[] = {
        {{Judgement::Within}, false, false, Verdict::Passed, Verdict::Passed},
        {{Judgement::Within, Judgement::Outside}, false, false, Verdict::Failed, Verdict::Passed},
        {{Judgement::NotMeasured}, false, false, Verdict::Error, Verdict::Passed},
        {{Judgement::NotMeasured, Judgement::Outside},
         false,
         false,
         Verdict::Failed,
         Verdict::Passed},
        {{Judgement::NotMeasured}, true, false, Verdict::Failed, Verdict::Failed},
        {{Judgement::Outside}, false, true, Verdict::Error, Verdict::Error},
    };
    for (const Case& one : cases) {
        for (const bool counts : {false, true}) {
            RunRecord run;
            for (const Judgement judgement : one.found) {
                run.benchResults.emplace_back().judgement = judgement;
                run.benchResults.back().partOfVerdict = counts;
            }
            run.results.push_back(
                {"r", 0, "", {}, one.moduleOutside ? Judgement::Outside : Judgement::Within});
            if (one.moduleFails) {
                run.failures.push_back({host::Part::Experiment, host::kStepRun, nullptr, "x"});
            }
            EXPECT_EQ(host::verdictOf(run), counts ? one.counted : one.notCounted);
        }
    }
}

}  // namespace
