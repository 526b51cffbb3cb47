#include "host/results/questions.h"

#include <chrono>
#include <cmath>
#include <limits>
#include <memory>

#include <gmock/gmock.h>

#include "host/record/problem.h"
#include "host/results/question_answers.h"
#include "host/results/stored_run.h"
#include "tests/host/results/sample_store.h"

namespace {

using host::Asked;
using host::Share;
using host::Verdict;
using test::cellOf;
using test::SampleStore;
using testing::Contains;
using testing::HasSubstr;
using testing::IsEmpty;

Share shareAt(const host::Answer& answer, std::size_t row, std::string_view key) {
    const auto* share = std::get_if<Share>(&cellOf(answer, row, key));
    return share != nullptr ? *share : Share{-1, -1, 0, 0};
}
std::pair<std::int64_t, std::int64_t> partAt(const host::Answer& answer,
                                             std::size_t row,
                                             std::string_view key) {
    const Share share = shareAt(answer, row, key);
    return {share.count, share.of};
}
double numberAt(const host::Answer& answer, std::size_t row, std::string_view key) {
    const auto* number = std::get_if<double>(&cellOf(answer, row, key));
    return number != nullptr ? *number : std::numeric_limits<double>::quiet_NaN();
}
std::int64_t countAt(const host::Answer& answer, std::size_t row, std::string_view key) {
    return std::get<std::int64_t>(cellOf(answer, row, key));
}
std::string textAt(const host::Answer& answer, std::size_t row, std::string_view key) {
    const auto* text = std::get_if<std::string>(&cellOf(answer, row, key));
    return text != nullptr ? *text : "(none)";
}
using Part = std::pair<std::int64_t, std::int64_t>;

// Every question answers the same on every engine.
class Questions : public testing::TestWithParam<test::EngineRow> {
  protected:
    SampleStore store{GetParam()};
};
INSTANTIATE_TEST_SUITE_P(Engines,
                         Questions,
                         testing::ValuesIn(test::kEngines),
                         [](const auto& row) { return std::string(row.param.name); });

// u1 passes; u2 fails, then passes on the right; u3 is in error, then fails; u4 is interrupted; one without a
// unit passes; u5 passes on the right.
void addFactory(SampleStore& store) {
    store.addAll({{.unit = "u1", .hour = 1, .values = {0}},
                  {.unit = "u2", .verdict = Verdict::Failed, .hour = 2, .values = {4}},
                  {.unit = "u2", .station = "right", .hour = 30, .values = {1}},
                  {.unit = "u3",
                   .verdict = Verdict::Error,
                   .hour = 3,
                   .error = std::make_shared<platform::Error>(
                       "Domain", 204, "No stream",
                       std::make_shared<platform::Error>("Service", -3, "Busy"))},
                  {.unit = "u3", .verdict = Verdict::Failed, .hour = 4, .values = {-5}},
                  {.unit = "u4", .verdict = Verdict::Interrupted, .hour = 5},
                  {.unit = "", .hour = 6, .values = {2}},
                  {.unit = "u5", .station = "right", .hour = 31, .values = {1}}});
}

TEST_P(Questions, YieldCountsFirstAndLastAttemptsOfUnits) {
    addFactory(store);
    const host::Answer all = store.ask("yield");
    ASSERT_EQ(all.rows.size(), 1U);
    EXPECT_EQ(countAt(all, 0, "runs"), 8);
    EXPECT_EQ(countAt(all, 0, "error"), 1);
    EXPECT_EQ(countAt(all, 0, "interrupted"), 1);
    EXPECT_EQ(countAt(all, 0, "withoutUnit"), 1);
    EXPECT_EQ(partAt(all, 0, "firstPass"), Part(2, 4));  // u1, u5 of u1, u2, u3, u5
    EXPECT_EQ(partAt(all, 0, "lastPass"), Part(3, 4));   // u2 too
    EXPECT_THAT(all.notes, Contains(HasSubstr("1 run named no unit")));

    const host::Answer stations = store.ask("yield", {.by = "station"});
    ASSERT_EQ(stations.rows.size(), 2U);
    EXPECT_EQ(textAt(stations, 0, "station"), "left");
    EXPECT_EQ(partAt(stations, 0, "firstPass"), Part(1, 3));
    EXPECT_EQ(partAt(stations, 0, "lastPass"), Part(1, 2));
    EXPECT_EQ(partAt(stations, 1, "firstPass"), Part(1, 1));
    EXPECT_EQ(partAt(stations, 1, "lastPass"), Part(2, 2));

    // Attempts do not change with the filter: u2's run on the right stays its second.
    const host::Answer right = store.ask("yield", {.filter = {.station = "right"}});
    EXPECT_EQ(partAt(right, 0, "firstPass"), Part(1, 1));
    const host::Answer days = store.ask("yield", {.by = "day"});
    EXPECT_EQ(textAt(days, 1, "day"), "2026-11-21");
    EXPECT_EQ(partAt(days, 1, "firstPass"), Part(1, 1));
}

TEST_P(Questions, LateDeliveryChangesAttempts) {
    store.addAll({{.unit = "u1", .hour = 5, .values = {0}}});
    EXPECT_EQ(partAt(store.ask("yield"), 0, "firstPass"), Part(1, 1));
    store.addAll({{.unit = "u1", .verdict = Verdict::Failed, .hour = 2, .values = {9}}});
    EXPECT_EQ(partAt(store.ask("yield"), 0, "firstPass"), Part(0, 1));
    const host::Answer unit = store.ask("unit", {.subject = "u1"});
    EXPECT_EQ(countAt(unit, 0, "attempt"), 2);
    EXPECT_EQ(textAt(unit, 1, "why"), "Offset is 9 mm, Limit: -3 … 3 mm");
}

TEST_P(Questions, AUnitIsASerialNumberOfAPart) {
    store.addAll({{.unit = "u1", .verdict = Verdict::Failed, .hour = 1, .values = {9}},
                  {.unit = "u1", .hour = 2, .values = {0}, .part = "P2", .lot = "L2"},
                  {.unit = "u1", .hour = 3, .values = {0}, .diagnostic = "Other"},
                  {.unit = "u1", .hour = 4, .values = {0}},
                  {.unit = "", .hour = 5, .values = {0}}});
    const host::Answer parts = store.ask("yield", {.by = "part"});
    ASSERT_EQ(parts.rows.size(), 3U);
    EXPECT_EQ(textAt(parts, 1, "part"), "P2");
    EXPECT_EQ(partAt(parts, 0, "firstPass"), Part(0, 1));
    EXPECT_EQ(partAt(parts, 0, "lastPass"), Part(1, 1));
    EXPECT_EQ(partAt(parts, 1, "firstPass"), Part(1, 1));
    EXPECT_EQ(textAt(parts, 2, "diagnostic"), "Other");
    const host::Answer lots = store.ask("yield", {.by = "lot"});
    EXPECT_EQ(textAt(lots, 1, "lot"), "L2");
    EXPECT_EQ(countAt(lots, 0, "withoutUnit"), 1);
    // Both are in the history; the part tells them apart, and attempts are counted in each.
    const host::Answer unit = store.ask("unit", {.subject = "u1"});
    ASSERT_EQ(unit.rows.size(), 4U);
    const std::int64_t kAttempts[] = {2, 1, 1, 1};
    for (std::size_t row = 0; row < 4; ++row) {
        EXPECT_EQ(countAt(unit, row, "attempt"), kAttempts[row]) << row;
    }
    EXPECT_EQ(store.ask("unit", {.filter = {.part = "P2"}, .subject = "u1"}).rows.size(), 1U);
}

TEST_P(Questions, ReasonsAreThoseOfTheReports) {
    const double infinity = std::numeric_limits<double>::infinity();
    store.addAll(
        {{.unit = "u1", .verdict = Verdict::Interrupted, .hour = 1},
         {.unit = "u2", .verdict = Verdict::Failed, .hour = 2, .values = {std::nan("")}},
         {.unit = "u3", .verdict = Verdict::Failed, .hour = 3, .values = {0, -infinity, 7}},
         {.unit = "u4",
          .verdict = Verdict::Error,
          .hour = 4,
          .values = {8},
          .error = std::make_shared<platform::Error>("Domain", -7, "No\nstream")},
         {.unit = "u5", .verdict = Verdict::Error, .hour = 5, .message = "it threw"}});
    const host::Answer list = store.ask("list");
    const char* kReasons[] = {"it threw", "No?stream (Domain -7)",
                              "Offset is -inf mm, Limit: -3 … 3 mm and 1 more",
                              "Offset is nan mm, Limit: -3 … 3 mm", "stopped after 3 of 90 frames"};
    for (std::size_t row = 0; row < 5; ++row) {
        EXPECT_EQ(textAt(list, row, "why"), kReasons[row]) << row;
    }
    const host::Answer pareto = store.ask(
        "pareto", {.filter = {.since = host::momentOf("", "2026-11-20 05:00", 0, false)}});
    EXPECT_EQ(textAt(pareto, 0, "name"), "experiment, run");
    EXPECT_EQ(textAt(pareto, 0, "detail"), "failed without an error object");
}

TEST_P(Questions, ParetoCountsLimitsAndErrors) {
    addFactory(store);
    // Interrupted runs say nothing about a unit.
    store.addAll({{.unit = "u6", .verdict = Verdict::Interrupted, .hour = 7, .values = {8}}});
    const host::Answer pareto = store.ask("pareto");
    ASSERT_EQ(pareto.rows.size(), 2U);
    EXPECT_EQ(textAt(pareto, 0, "name"), "Offset");
    EXPECT_EQ(textAt(pareto, 0, "detail"), "Limit: -3 … 3 mm");
    EXPECT_EQ(countAt(pareto, 0, "runs"), 2);
    EXPECT_EQ(countAt(pareto, 0, "units"), 2);
    EXPECT_NEAR(numberAt(pareto, 0, "sharePercent"), 200.0 / 3, 1e-9);
    EXPECT_EQ(textAt(pareto, 1, "name"), "Domain 204, caused by Service -3");
    EXPECT_EQ(numberAt(pareto, 1, "cumulativePercent"), 100);

    const host::Answer cut = store.ask("pareto", {.limit = 1});
    EXPECT_EQ(cut.rows.size(), 1U);
    EXPECT_THAT(cut.notes, Contains(HasSubstr("1 more")));
    const host::Answer none = store.ask("pareto", {.filter = {.station = "right"}});
    EXPECT_THAT(none.notes, Contains("Nothing failed."));
}

host::BenchResult benchResult(double value, host::Judgement judgement, bool partOfVerdict) {
    host::BenchResult result;
    result.name = "Load";
    result.value = value;
    result.unit = judgement == host::Judgement::NotMeasured ? "" : "N";
    result.limit = host::LimitRecord{"Desk", std::nullopt, host::BoundRecord{5, true}};
    result.judgement = judgement;
    result.partOfVerdict = partOfVerdict;
    result.note = judgement == host::Judgement::NotMeasured ? "no frame has it" : "";
    return result;
}

// What the bench's limits find counts as a failure when it is part of the verdict, and is measured when it is.
TEST_P(Questions, LimitsOfTheBenchAreApart) {
    const auto within = benchResult(4, host::Judgement::Within, true);
    const auto outside = benchResult(6, host::Judgement::Outside, true);
    const auto watched = benchResult(std::nan(""), host::Judgement::Outside, false);
    const auto missing = benchResult(std::nan(""), host::Judgement::NotMeasured, true);
    store.addAll(
        {{.unit = "u1", .hour = 1, .values = {1}, .bench = {within}},
         {.unit = "u2", .verdict = Verdict::Failed, .hour = 2, .bench = {outside}},
         {.unit = "u3", .hour = 3, .bench = {watched}},
         {.unit = "u4", .verdict = Verdict::Error, .hour = 4, .bench = {missing}},
         {.unit = "u5", .verdict = Verdict::Failed, .hour = 5, .values = {9}, .bench = {missing}}});
    const host::Answer pareto = store.ask("pareto");
    ASSERT_EQ(pareto.rows.size(), 3U);
    EXPECT_EQ(textAt(pareto, 0, "kind"), "not measured");
    EXPECT_EQ(countAt(pareto, 0, "runs"), 2);
    EXPECT_EQ(textAt(pareto, 1, "kind"), "bench limit");
    EXPECT_EQ(textAt(pareto, 1, "detail"), "Desk: < 5 N");
    EXPECT_EQ(countAt(pareto, 1, "units"), 1);
    EXPECT_EQ(textAt(pareto, 2, "kind"), "limit");

    const host::Answer spread = store.ask("spread");
    ASSERT_EQ(spread.rows.size(), 2U);
    EXPECT_EQ(textAt(spread, 0, "source"), "analysis");
    EXPECT_EQ(textAt(spread, 1, "source"), "bench");
    EXPECT_EQ(countAt(spread, 1, "n"), 2);
    EXPECT_EQ(countAt(spread, 1, "notNumbers"), 1);
    EXPECT_EQ(numberAt(spread, 1, "mean"), 5);
    EXPECT_EQ(partAt(spread, 1, "outside"), Part(2, 3));
    const host::Answer trend = store.ask("trend", {.subject = "Load"});
    ASSERT_EQ(trend.rows.size(), 1U);
    EXPECT_EQ(textAt(trend, 0, "limit"), "< 5");
    EXPECT_EQ(countAt(trend, 0, "n"), 2);

    const host::Answer list = store.ask("list");
    const char* kReasons[] = {"Offset is 9 mm, Limit: -3 … 3 mm and 1 more",
                              "Load not measured, Desk: < 5; no frame has it", "",
                              "Load is 6 N, Desk: < 5 N", ""};
    for (std::size_t row = 0; row < 5; ++row) {
        EXPECT_EQ(textAt(list, row, "why"), kReasons[row]) << row;
    }
}

// Each filter alone leaves the runs that it names, and no question looks beyond them.
TEST_P(Questions, FiltersSelectRuns) {
    store.addAll({{.unit = "u1", .hour = 1, .values = {0}, .diagnostic = "Other"},
                  {.unit = "u2", .station = "right", .hour = 2, .values = {0}},
                  {.unit = "u3", .hour = 3, .values = {0}, .part = "P2"},
                  {.unit = "u4", .hour = 4, .values = {0}, .lot = "L2"},
                  {.unit = "u5", .hour = 5, .values = {0}, .version = "2.0"},
                  {.unit = "u6", .hour = 30, .values = {0}}});
    const std::int64_t nextDay = host::momentOf("", "2026-11-21", 0, false);
    const std::pair<host::Filter, std::string> kFilters[] = {
        {{.since = nextDay}, "u6"},
        {{.until = nextDay, .diagnostic = "Other"}, "u1"},
        {{.station = "right"}, "u2"},
        {{.part = "P2"}, "u3"},
        {{.lot = "L2"}, "u4"},
        {{.version = "2.0"}, "u5"},
        {{.since = nextDay, .lot = "L2"}, ""}};
    for (const auto& [filter, unit] : kFilters) {
        const host::Answer list = store.ask("list", {.filter = filter});
        EXPECT_EQ(list.rows.size(), unit.empty() ? 0U : 1U) << unit;
        EXPECT_EQ(list.rows.empty() ? "" : textAt(list, 0, "unit"), unit);
        for (const char* question : {"yield", "spread", "trend", "stations"}) {
            const host::Answer answer =
                store.ask(question, {.filter = filter, .subject = "Offset"});
            EXPECT_EQ(answer.rows.size(), list.rows.size()) << question << " " << unit;
        }
    }
}

TEST_P(Questions, SpreadIsOfEachLimit) {
    // Fifteen times 1 and 3, one NaN, one infinity: mean 2, deviation sqrt(30 / 29).
    for (int at = 0; at < 15; ++at) {
        store.add({.unit = "u", .hour = at, .values = {1}});
        store.add({.unit = "u", .hour = at, .values = {3}});
    }
    store.add({.unit = "u",
               .verdict = Verdict::Failed,
               .hour = 20,
               .values = {std::nan(""), std::numeric_limits<double>::infinity()}});
    store.add({.unit = "u", .hour = 21, .values = {1, 1}}, 8);
    store.addAll({{.unit = "u", .verdict = Verdict::Error, .hour = 22, .values = {2.5}}});
    const host::Answer spread = store.ask("spread");
    ASSERT_EQ(spread.rows.size(), 2U);
    EXPECT_EQ(countAt(spread, 0, "n"), 30);
    EXPECT_EQ(countAt(spread, 0, "notNumbers"), 2);
    EXPECT_DOUBLE_EQ(numberAt(spread, 0, "mean"), 2);
    EXPECT_NEAR(numberAt(spread, 0, "deviation"), std::sqrt(30.0 / 29), 1e-12);
    EXPECT_EQ(numberAt(spread, 0, "maximum"), 3);
    EXPECT_NEAR(numberAt(spread, 0, "cp"), 1 / std::sqrt(30.0 / 29), 1e-12);
    EXPECT_NEAR(numberAt(spread, 0, "cpk"), 1 / std::sqrt(30.0 / 29) / 3, 1e-12);
    EXPECT_EQ(partAt(spread, 0, "outside"), Part(2, 32));
    // The wider limit: no spread, so no index, and the share outside says what is known.
    EXPECT_EQ(textAt(spread, 1, "limit"), "-8 … 8");
    EXPECT_EQ(numberAt(spread, 1, "deviation"), 0);
    EXPECT_TRUE(std::isnan(numberAt(spread, 1, "cpk")));
    EXPECT_EQ(partAt(spread, 1, "outside"), Part(0, 2));
}

TEST_P(Questions, SpreadKeepsDigitsBesideAGreatMean) {
    for (const double value : {1e9 + 4, 1e9 + 7, 1e9 + 13, 1e9 + 16}) {
        store.add({.unit = "u", .values = {value}}, 2e9);
    }
    EXPECT_NEAR(numberAt(store.ask("spread"), 0, "deviation"), std::sqrt(30.0), 1e-9);
}

TEST_P(Questions, TrendIsOfDaysStationsAndLimits) {
    addFactory(store);
    store.add({.unit = "u9", .station = "right", .hour = 32, .values = {3}}, 8);
    const host::Answer trend = store.ask("trend", {.subject = "Offset"});
    ASSERT_EQ(trend.rows.size(), 3U);
    EXPECT_EQ(textAt(trend, 0, "day"), "2026-11-20");
    EXPECT_EQ(countAt(trend, 0, "n"), 4);
    EXPECT_EQ(numberAt(trend, 0, "minimum"), -5);
    EXPECT_EQ(numberAt(trend, 0, "mean"), 0.25);
    EXPECT_EQ(partAt(trend, 0, "outside"), Part(2, 4));
    EXPECT_EQ(textAt(trend, 2, "limit"), "-8 … 8");
    ASSERT_EQ(trend.drawings.size(), 2U);  // one for each station, on the same axes
    const auto& right = std::get<host::LinePlot>(trend.drawings[1]);
    EXPECT_EQ(right.room.size(), std::get<host::LinePlot>(trend.drawings[0]).room.size());
    // The limit is a step where it changed.
    std::vector<double> upper;
    for (const host::Point& point : right.series.back().points) {
        upper.push_back(point.y);
    }
    EXPECT_THAT(upper, testing::ElementsAre(3, 3, 3, 3, 3, 8, 8));
    EXPECT_THAT(store.ask("trend", {.subject = "Ofset"}).notes,
                Contains(HasSubstr("did you mean Offset?")));
}

// However long a store is, a page is small: a drawing has a bounded number of stretches.
TEST_P(Questions, TrendOfManyRunsIsDrawnInStretches) {
    for (int at = 0; at < 310; ++at) {
        store.add({.unit = "u", .hour = at, .values = {1}});
    }
    const host::Answer trend = store.ask("trend", {.subject = "Offset"});
    const auto& plot = std::get<host::LinePlot>(trend.drawings.at(0));
    EXPECT_LE(plot.series.at(0).points.size(), 301U);
    EXPECT_THAT(plot.figure.caption, HasSubstr("mean of each 6 hours"));
}

TEST_P(Questions, StationsAreComparedByTheirFirstAttempts) {
    for (int at = 0; at < 20; ++at) {
        const std::string unit = std::to_string(at);
        store.add({.unit = "l" + unit, .hour = at, .values = {1}});
        const bool passes = at < 10;
        store.add({.unit = "r" + unit,
                   .verdict = passes ? Verdict::Passed : Verdict::Failed,
                   .station = "right",
                   .hour = at,
                   .values = {passes ? 2.0 : 4.0}});
    }
    const host::Answer stations = store.ask("stations");
    ASSERT_EQ(stations.rows.size(), 2U);
    EXPECT_EQ(partAt(stations, 1, "firstPass"), Part(10, 20));
    EXPECT_EQ(partAt(stations, 1, "others"), Part(20, 20));
    EXPECT_NEAR(numberAt(stations, 1, "p"), 0.000436, 1e-6);  // 2 · C(20, 10) / C(40, 10)
    EXPECT_EQ(textAt(stations, 1, "agrees"), "differs");
    const host::Answer means = store.ask("stations", {.measurements = true});
    ASSERT_EQ(means.rows.size(), 2U);
    EXPECT_EQ(numberAt(means, 1, "mean"), 3);
    EXPECT_EQ(numberAt(means, 1, "difference"), 2);
    EXPECT_EQ(numberAt(means, 0, "deviation"), 0);
}

TEST_P(Questions, ListIsNewestFirst) {
    addFactory(store);
    const host::Answer list = store.ask("list", {.limit = 3});
    ASSERT_EQ(list.rows.size(), 3U);
    EXPECT_EQ(textAt(list, 0, "unit"), "u5");
    EXPECT_EQ(textAt(list, 2, "started"), "2026-11-20 06:00:00");
    EXPECT_THAT(list.notes, Contains(HasSubstr("There are more")));
    const host::Answer errors =
        store.ask("list", {.filter = {.since = host::momentOf("", "2026-11-20 03:00", 0, false),
                                      .until = host::momentOf("", "2026-11-20 04:00", 0, false)}});
    ASSERT_EQ(errors.rows.size(), 1U);
    EXPECT_EQ(textAt(errors, 0, "why"), "No stream (Domain 204)");
}

TEST_P(Questions, NothingIsAnAnswer) {
    for (const host::Question& question : host::questions()) {
        const host::Answer answer = store.ask(question.name, {.subject = "x"});
        EXPECT_THAT(answer.rows, IsEmpty()) << question.name;
        EXPECT_THAT(answer.notes, Contains("No runs.")) << question.name;
    }
    addFactory(store);
    EXPECT_THAT(store.ask("yield", {.filter = {.station = "rihgt"}}).notes,
                Contains("No run has the station \"rihgt\"; did you mean right?"));
    EXPECT_THAT(store.ask("unit", {.subject = "u33"}).notes,
                Contains(HasSubstr("did you mean u3?")));
}

TEST_P(Questions, RunsAreFoundByTheBeginningOfTheirUuid) {
    const std::string uuid = store.add({.unit = "u1"});
    store.add({.unit = "u2"});
    EXPECT_EQ(host::storedRun(store.store(), "01900001").runs.at(0).uuid, uuid);
    for (const auto& [wanted, text] : {std::pair("0190", "several runs"),
                                       std::pair("0191", "no run"), std::pair("%", "no run")}) {
        try {
            host::storedRun(store.store(), wanted);
            ADD_FAILURE() << wanted;
        } catch (const host::Problem& problem) {
            EXPECT_THAT(problem.what(), HasSubstr(text));
            EXPECT_EQ(problem.status(), host::kExitUsage);
        }
    }
}

TEST(RowLabels, TellRowsApart) {
    EXPECT_THAT(
        host::rowLabels({{"a", "x", "1"}, {"a", "x", "2"}, {"a", "y", ""}, {"b", "x", "1"}}),
        testing::ElementsAre("a, x, 1", "a, x, 2", "a, y", "b"));
}

TEST(Moments, AreRead) {
    const std::int64_t now = host::momentOf("", "2026-11-25 12:00", 0, false);
    const std::pair<const char*, const char*> kGood[] = {
        {"2026-11-25", "2026-11-25 00:00:00"},
        {"2026-11-25T14:30:05Z", "2026-11-25 14:30:05"},
        {"2026-11-25 14:30", "2026-11-25 14:30:00"},
        {"7d", "2026-11-18 12:00:00"},
        {"90m", "2026-11-25 10:30:00"},
        {"0h", "2026-11-25 12:00:00"},
        {"2w", "2026-11-11 12:00:00"}};
    for (const auto& [text, moment] : kGood) {
        EXPECT_EQ(host::momentText(host::momentOf("--since", text, now, false)), moment);
    }
    EXPECT_EQ(host::momentText(host::momentOf("--until", "2026-11-25", now, true)),
              "2026-11-26 00:00:00");
    for (const char* text : {"", "yesterday", "7", "-7d", "7dd", "2026-02-30", "2026-11-25 24:00",
                             "2026-11-25x", "2026-11-25 14", "99999999999999999999d"}) {
        EXPECT_THROW(host::momentOf("--since", text, now, false), host::Problem) << text;
    }
}

}  // namespace
