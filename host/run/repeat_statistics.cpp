#include "host/run/repeat_statistics.h"

#include <algorithm>
#include <cmath>
#include <iterator>
#include <limits>
#include <utility>

#include "host/record/run_text.h"

namespace host {

namespace {

// The value at `rank` (from 0) of the sorted sequence that the counts stand for.
double atRank(const std::map<double, std::uint64_t>& values, std::uint64_t rank) {
    for (const auto& [value, count] : values) {
        if (rank < count) {
            return value;
        }
        rank -= count;
    }
    return std::numeric_limits<double>::quiet_NaN();
}

double median(const std::map<double, std::uint64_t>& values) {
    std::uint64_t total = 0;
    for (const auto& [value, count] : values) {
        total += count;
    }
    if (total % 2 == 1) {
        return atRank(values, total / 2);
    }
    return (atRank(values, total / 2 - 1) + atRank(values, total / 2)) / 2;
}

}  // namespace

void RepeatStatistics::add(const RunRecord& run) {
    ++_record.runs;
    _record.seconds += run.seconds;
    switch (run.verdict) {
        case Verdict::Passed:
            ++_record.passed;
            break;
        case Verdict::Failed:
            ++_record.failed;
            break;
        case Verdict::Error:
            ++_record.errors;
            break;
        case Verdict::Interrupted:
            ++_record.interrupted;
            break;
    }
    if (_record.outcomes.size() < kMostOutcomes) {
        _record.outcomes.push_back({run.verdict, run.seconds});
    }
    if (run.verdict != Verdict::Passed && _record.notPassed.size() < kMostRepetitions) {
        Repetition one{run.number, run.verdict, run.seconds, whyText(run), {}, run.failures};
        std::copy_if(
            run.results.begin(), run.results.end(), std::back_inserter(one.outside),
            [](const ResultRecord& result) { return result.judgement == Judgement::Outside; });
        std::copy_if(run.benchResults.begin(), run.benchResults.end(),
                     std::back_inserter(one.bench), isBenchFinding);
        _record.notPassed.push_back(std::move(one));
    }
    for (const ResultRecord& result : run.results) {
        _results.add(result);
    }
    if (!run.plan.isDiagnostic()) {
        for (const MeasurementRecord& measurement : run.measurements) {
            _results.add({measurement.name, measurement.value, measurement.unit, std::nullopt,
                          Judgement::Information});
        }
    }
    for (const BenchResult& result : run.benchResults) {
        _benchResults.add(result);
    }
}

void RepeatStatistics::Tallies::add(const ResultRecord& result) {
    const auto [known, isNew] = _tallyOf.try_emplace(result.name, _tallies.size());
    if (isNew) {
        Tally& tally = _tallies.emplace_back();
        tally.statistics.name = result.name;
        tally.statistics.limit = result.limit;
    }
    Tally& tally = _tallies[known->second];
    if (tally.statistics.unit.empty()) {
        tally.statistics.unit = result.unit;
    }
    if (result.judgement == Judgement::NotMeasured) {
        ++tally.statistics.notMeasured;
        return;
    }
    ++tally.statistics.runs;
    tally.statistics.outside += result.judgement == Judgement::Outside ? 1 : 0;
    if (!std::isnan(result.value)) {
        ++tally.values[result.value];
    }
}

std::vector<ResultStatistics> RepeatStatistics::Tallies::statistics() const {
    std::vector<ResultStatistics> all;
    for (const Tally& tally : _tallies) {
        ResultStatistics result = tally.statistics;
        if (tally.values.empty()) {
            result.minimum = result.median = result.maximum =
                std::numeric_limits<double>::quiet_NaN();
        } else {
            result.minimum = tally.values.begin()->first;
            result.median = median(tally.values);
            result.maximum = tally.values.rbegin()->first;
        }
        all.push_back(std::move(result));
    }
    return all;
}

RepeatRecord RepeatStatistics::record() const {
    RepeatRecord record = _record;
    record.results = _results.statistics();
    record.benchResults = _benchResults.statistics();
    return record;
}

}  // namespace host
