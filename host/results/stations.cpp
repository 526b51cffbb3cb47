#include <algorithm>
#include <map>
#include <tuple>
#include <vector>

#include <fmt/format.h>

#include "host/record/run_text.h"
#include "host/results/question_answers.h"

namespace host {

namespace {

// First attempts only: each unit counts once, so that the counts are independent.
constexpr std::string_view kYields = R"(
SELECT runs.diagnostic, stations.name, COUNT(*), COUNT(*) FILTER (WHERE runs.verdict = 'pass')
FROM {runs} JOIN attempts ON attempts.run_id = runs.id
WHERE attempt = 1 AND {selected} GROUP BY runs.diagnostic, stations.name ORDER BY runs.diagnostic, stations.name)";

// See spread.cpp.
constexpr std::string_view kMeans = R"(
WITH chosen AS (
    SELECT runs.diagnostic AS diagnostic, results.of_analysis AS of_analysis, results.quantity_id AS quantity_id,
           runs.station_id AS station_id,
           CASE WHEN results.value BETWEEN -1e100 AND 1e100 THEN results.value END AS value
    FROM {runs} JOIN results ON results.run_id = runs.id
    WHERE runs.verdict IN ('pass', 'fail') AND results.by_bench = 0 AND {selected}),
middles AS (
    SELECT diagnostic, of_analysis, quantity_id, station_id, AVG(value) AS middle, MIN(value) AS least,
           MAX(value) AS greatest FROM chosen
    GROUP BY diagnostic, of_analysis, quantity_id, station_id),
varied AS (
    SELECT diagnostic, of_analysis, quantity_id FROM middles GROUP BY diagnostic, of_analysis, quantity_id
    HAVING MIN(least) < MAX(greatest)),
figures AS (
    SELECT chosen.diagnostic AS diagnostic, chosen.of_analysis AS of_analysis, chosen.quantity_id AS quantity_id,
           chosen.station_id AS station_id, COUNT(value) AS n, MIN(middle) AS middle, SUM(value - middle) AS deviations,
           SUM(CASE WHEN ABS(value - middle) > 1e-100 THEN (value - middle) * (value - middle) ELSE 0 END) AS squares
    FROM varied
         JOIN chosen ON chosen.diagnostic = varied.diagnostic AND chosen.of_analysis = varied.of_analysis
              AND chosen.quantity_id = varied.quantity_id
         JOIN middles ON middles.diagnostic = chosen.diagnostic AND middles.of_analysis = chosen.of_analysis
              AND middles.quantity_id = chosen.quantity_id AND middles.station_id = chosen.station_id
    GROUP BY chosen.diagnostic, chosen.of_analysis, chosen.quantity_id, chosen.station_id)
SELECT diagnostic, of_analysis, quantities.name, quantities.unit, stations.name, n, middle, deviations, squares
FROM figures JOIN quantities ON quantities.id = quantity_id JOIN stations ON stations.id = station_id
WHERE n > 0
ORDER BY diagnostic, of_analysis DESC, quantities.name, quantities.unit, stations.name)";

void answerYields(Store& store, const Asked& asked, Answer& answer) {
    answer.title = "First-pass yield of each station beside the others";
    answer.columns = {{"diagnostic", "Diagnostic"},
                      {"station", "Station"},
                      {"firstPass", "First pass", ColumnKind::Share},
                      {"others", "Others", ColumnKind::Share},
                      {"p", "p", ColumnKind::Index},
                      {"agrees", "Agrees"}};
    struct Sample {
        std::int64_t passed = 0;
        std::int64_t units = 0;
        std::int64_t stations = 0;
    };
    const Rows rows = Selection(asked.filter).rows(store, kYields);
    std::map<std::string, Sample> all;
    for (const Row& row : rows) {
        Sample& sample = all[textAt(row, 0)];
        sample.units += integerAt(row, 2);
        sample.passed += integerAt(row, 3);
        ++sample.stations;
    }
    for (const Row& row : rows) {
        const Sample& sample = all[textAt(row, 0)];
        const std::int64_t units = integerAt(row, 2);
        const std::int64_t passed = integerAt(row, 3);
        const auto p = fisherTest(passed, units, sample.passed - passed, sample.units - units);
        // With two stations the two tests are one.
        const double level = levelOfOne(sample.stations > 2 ? sample.stations : 1);
        answer.rows.push_back({textAt(row, 0), textAt(row, 1), datumOf(shareOf(passed, units)),
                               datumOf(shareOf(sample.passed - passed, sample.units - units)),
                               datumOf(p),
                               !p.has_value() ? Datum()
                               : *p < level   ? Datum("differs")
                                              : Datum("no difference seen")});
    }
    answer.notes = {
        "Units whose first judged run was at the station, and at all other stations of the "
        "diagnostic together.",
        "p: Fisher's exact test, two-sided. \"Differs\" is p below 5 % divided by the number of "
        "stations (Bonferroni).",
        "A difference that is not seen may still be there: see the intervals (Wilson score, 95 %). "
        "Stations that "
        "test different lots differ for that reason too.",
        "zrlab results stations --measurements compares the means of measurements.",
    };
}

void answerMeans(Store& store, const Asked& asked, Answer& answer) {
    answer.title = "Mean of each measurement, station by station";
    answer.columns = {{"diagnostic", "Diagnostic"},
                      {"measurement", "Measurement"},
                      {"unit", "Unit"},
                      {"station", "Station"},
                      {"n", "n", ColumnKind::Count},
                      {"mean", "Mean", ColumnKind::Number},
                      {"deviation", "Deviation", ColumnKind::Number},
                      {"othersMean", "Mean of others", ColumnKind::Number},
                      {"difference", "Difference", ColumnKind::Number}};
    using Name = std::tuple<std::string, std::string, std::string>;
    const auto nameOf = [](const Row& row) {
        return Name(textAt(row, 0), textAt(row, 2), textAt(row, 3));
    };
    const auto momentsOf = [](const Row& row) {
        return Moments{integerAt(row, 5), numberAt(row, 6), numberAt(row, 7), numberAt(row, 8)};
    };
    // Results repeat the measurements of the same names; the rows of results come first.
    std::map<Name, std::int64_t> kinds;
    std::vector<std::pair<Name, Row>> rows;
    for (Row& row : Selection(asked.filter).rows(store, kMeans)) {
        const std::int64_t kind = integerAt(row, 1);
        if (kinds.try_emplace(nameOf(row), kind).first->second == kind) {
            rows.emplace_back(nameOf(row), std::move(row));
        }
    }
    std::map<Name, std::vector<const Row*>> stations;
    for (const auto& [name, row] : rows) {
        stations[name].push_back(&row);
    }
    for (const auto& [name, row] : rows) {
        const Moments moments = momentsOf(row);
        double sum = 0;
        std::int64_t n = 0;
        for (const Row* other : stations[name]) {
            if (textAt(*other, 4) != textAt(row, 4)) {
                sum += momentsOf(*other).mean() * static_cast<double>(momentsOf(*other).n);
                n += momentsOf(*other).n;
            }
        }
        const double others = sum / static_cast<double>(n);  // NaN when there are none
        answer.rows.push_back({std::get<0>(name), std::get<1>(name), std::get<2>(name),
                               textAt(row, 4), moments.n, datumOf(moments.mean()),
                               datumOf(moments.deviation()), datumOf(others),
                               datumOf(moments.mean() - others)});
    }
    answer.notes = {"Values of PASS and FAIL runs, repetitions and retests included.",
                    "Measurements whose every value is the same at all stations are left out.",
                    "Beside the deviation a difference shows how much stations disagree; no test "
                    "is made: values of "
                    "one unit are not independent."};
}

}  // namespace

void answerStations(Store& store, const Asked& asked, Answer& answer) {
    if (asked.measurements) {
        answerMeans(store, asked, answer);
    } else {
        answerYields(store, asked, answer);
    }
}

}  // namespace host
