#include "host/run/repeat_statistics.h"

#include <cmath>
#include <limits>
#include <vector>

#include <gtest/gtest.h>

namespace {

using host::Judgement;
using host::RunRecord;
using host::Verdict;

RunRecord run(Verdict verdict, double value, Judgement judgement) {
    RunRecord record;
    record.plan.analysis.emplace();
    record.verdict = verdict;
    if (verdict != Verdict::Error) {
        record.results.push_back({"noise", value, "events", std::nullopt, judgement});
        record.results.push_back({"still", 0, "events", std::nullopt, Judgement::Within});
    }
    return record;
}

TEST(RepeatStatistics, FiguresOfEachResult) {
    host::RepeatStatistics statistics("D");
    for (const double value : {5.0, 1.0, 9.0}) {
        statistics.add(run(Verdict::Passed, value, Judgement::Within));
    }
    EXPECT_EQ(statistics.record().results.at(0).median, 5.0);

    statistics.add(run(Verdict::Failed, 100.0, Judgement::Outside));
    statistics.add(run(Verdict::Failed, std::nan(""), Judgement::Outside));
    RunRecord failing = run(Verdict::Error, 0, Judgement::Within);
    failing.number = 6;
    failing.seconds = 1.5;
    failing.failures = {{host::Part::Experiment, host::kStepRun, nullptr, "no light"}};
    statistics.add(failing);
    statistics.add(run(Verdict::Interrupted, 5, Judgement::Within));
    const host::RepeatRecord record = statistics.record();
    EXPECT_EQ(record.runs, 7U);
    EXPECT_EQ(record.passed, 3U);
    EXPECT_EQ(record.failed, 2U);
    EXPECT_EQ(record.errors, 1U);
    EXPECT_EQ(record.interrupted, 1U);
    EXPECT_EQ(record.notPassedCount(), 4U);
    ASSERT_EQ(record.notPassed.size(), 4U);
    ASSERT_EQ(record.notPassed[0].outside.size(), 1U);
    EXPECT_EQ(record.notPassed[0].outside[0].value, 100.0);
    EXPECT_EQ(record.notPassed[2].number, 6U);
    EXPECT_EQ(record.notPassed[2].failures.at(0).message, "no light");
    EXPECT_EQ(record.notPassed[2].why, "no light");
    ASSERT_EQ(record.outcomes.size(), 7U);
    EXPECT_EQ(record.outcomes[5].verdict, Verdict::Error);
    EXPECT_EQ(record.outcomes[5].seconds, 1.5);
    ASSERT_EQ(record.results.size(), 2U);
    const host::ResultStatistics& noise = record.results[0];
    EXPECT_EQ(noise.runs, 6U);
    EXPECT_EQ(noise.outside, 2U);
    EXPECT_EQ(noise.minimum, 1.0);
    EXPECT_EQ(noise.median, 5.0);  // of 1, 5, 5, 9, 100: the NaN has no place
    EXPECT_EQ(noise.maximum, 100.0);
}

TEST(RepeatStatistics, AnExperimentAloneIsCountedByItsMeasurements) {
    host::RepeatStatistics statistics("E");
    RunRecord record;
    record.verdict = Verdict::Passed;
    record.measurements = {{"FrameCount", 3, "frames"}};
    statistics.add(record);
    ASSERT_EQ(statistics.record().results.size(), 1U);
    EXPECT_EQ(statistics.record().results[0].maximum, 3.0);
    EXPECT_EQ(statistics.record().results[0].outside, 0U);
}

TEST(RepeatStatistics, TheLimitsOfTheBenchAreCountedApart) {
    host::RepeatStatistics statistics("D");
    const std::pair<double, Judgement> found[] = {
        {1, Judgement::Within}, {7, Judgement::Outside}, {std::nan(""), Judgement::NotMeasured}};
    for (const auto& [value, judgement] : found) {
        RunRecord one = run(judgement == Judgement::Within ? Verdict::Passed : Verdict::Failed, 0,
                            Judgement::Within);
        host::BenchResult& result = one.benchResults.emplace_back();
        result.name = "noise";  // as one of the module's results
        result.value = value;
        result.judgement = judgement;
        result.partOfVerdict = true;
        statistics.add(one);
    }
    const host::RepeatRecord record = statistics.record();
    ASSERT_EQ(record.benchResults.size(), 1U);
    const host::ResultStatistics& noise = record.benchResults[0];
    EXPECT_EQ(noise.runs, 2U);
    EXPECT_EQ(noise.outside, 1U);
    EXPECT_EQ(noise.notMeasured, 1U);
    EXPECT_EQ(noise.maximum, 7);
    EXPECT_EQ(record.results[0].runs, 3U);
    ASSERT_EQ(record.notPassed.size(), 2U);
    EXPECT_EQ(record.notPassed[0].bench.size(), 1U);
}

}  // namespace
