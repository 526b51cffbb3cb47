#include <algorithm>
#include <set>
#include <tuple>

#include <fmt/format.h>

#include "host/record/run_text.h"
#include "host/results/question_answers.h"

namespace host {

namespace {

// Numbers that can be calculated with: sums of squares of greater ones would not fit, and of infinities nothing
// is known. `middle` is near the mean; see Moments.
constexpr std::string_view kSpreadSql = R"(
WITH chosen AS (
    SELECT runs.diagnostic AS diagnostic, {source} AS source, results.quantity_id AS quantity_id,
           COALESCE(results.limit_id, 0) AS limit_id, results.judgement AS judgement,
           CASE WHEN results.value BETWEEN -1e100 AND 1e100 THEN results.value END AS value
    FROM {runs} JOIN results ON results.run_id = runs.id
    WHERE runs.verdict IN ('pass', 'fail') AND results.judgement <> 3 AND {selected}),
middles AS (
    SELECT diagnostic, source, quantity_id, limit_id, AVG(value) AS middle FROM chosen
    GROUP BY diagnostic, source, quantity_id, limit_id),
figures AS (
    SELECT chosen.diagnostic AS diagnostic, chosen.source AS source, chosen.quantity_id AS quantity_id,
           chosen.limit_id AS limit_id, COUNT(*) AS records, COUNT(value) AS n, MIN(value) AS least,
           MAX(value) AS greatest, MIN(middle) AS middle, SUM(value - middle) AS deviations,
           SUM(CASE WHEN ABS(value - middle) > 1e-100 THEN (value - middle) * (value - middle) ELSE 0 END) AS squares,
           COUNT(*) FILTER (WHERE judgement <> 0) AS judged, COUNT(*) FILTER (WHERE judgement = 2) AS outside
    FROM chosen JOIN middles ON middles.diagnostic = chosen.diagnostic AND middles.source = chosen.source
                AND middles.quantity_id = chosen.quantity_id AND middles.limit_id = chosen.limit_id
    GROUP BY chosen.diagnostic, chosen.source, chosen.quantity_id, chosen.limit_id)
SELECT diagnostic, source, quantities.name, quantities.unit, limits.bounds, limits.lower, limits.upper, records,
       n, least, greatest, middle, deviations, squares, judged, outside
FROM figures JOIN quantities ON quantities.id = quantity_id LEFT JOIN limits ON limits.id = limit_id
ORDER BY diagnostic, source, quantities.name, quantities.unit, limits.bounds)";

using Name = std::tuple<std::string, std::string, std::string>;
Name nameOf(const Row& row) {
    return {textAt(row, 0), textAt(row, 2), textAt(row, 3)};
}

// What the drawings show of a row.
struct Drawn {
    std::vector<std::string> names;  // see rowLabels()
    std::optional<Share> outside;
    std::optional<double> cpk;
};

void draw(Answer& answer, std::vector<Drawn> drawn) {
    std::vector<std::vector<std::string>> names;
    names.reserve(drawn.size());
    for (const Drawn& one : drawn) {
        names.push_back(one.names);
    }
    std::size_t row = 0;
    for (std::string& label : rowLabels(names)) {
        drawn[row++].names = {std::move(label)};
    }
    BarPlot outside;
    outside.figure = {"outside", "Share outside the limit",
                      "A point is the share of values outside; the line is its 95 % interval. ",
                      "% of values", "measurement"};
    outside.series = {{"outside", "hue-b"}};
    BarPlot capability;
    capability.figure = {"cpk", "Capability",
                         "Cpk of each measurement that has one, the least first.", "Cpk",
                         "measurement"};
    capability.series = {{"Cpk", "hue-a"}};
    capability.areBars = true;
    std::stable_sort(drawn.begin(), drawn.end(), [](const Drawn& a, const Drawn& b) {
        const auto key = [](const Drawn& one) {
            return one.outside.has_value() ? std::pair(one.outside->value(), one.outside->high)
                                           : std::pair(-1.0, -1.0);
        };
        return key(a) > key(b);
    });
    std::size_t judged = 0;
    for (const Drawn& one : drawn) {
        if (one.outside.has_value() && ++judged <= kMostBars) {
            outside.bars.push_back(
                {one.names.front(),
                 {{100 * one.outside->value(), 100 * one.outside->low, 100 * one.outside->high}}});
        }
    }
    outside.figure.caption += judged > kMostBars
                                  ? fmt::format("The {} worst of {} are drawn.", kMostBars, judged)
                                  : "The worst come first.";
    std::stable_sort(drawn.begin(), drawn.end(), [](const Drawn& a, const Drawn& b) {
        return a.cpk.value_or(1e300) < b.cpk.value_or(1e300);
    });
    for (const Drawn& one : drawn) {
        if (one.cpk.has_value() && capability.bars.size() < kMostBars) {
            capability.bars.push_back({one.names.front(), {{*one.cpk}}});
        }
    }
    answer.drawings = {std::move(outside), std::move(capability)};
}

}  // namespace

void answerSpread(Store& store, const Asked& asked, Answer& answer) {
    answer.title = "Spread of each measurement";
    answer.columns = {{"diagnostic", "Diagnostic"},
                      {"measurement", "Measurement"},
                      {"unit", "Unit"},
                      {"source", "Source"},
                      {"limit", "Limit"},
                      {"n", "n", ColumnKind::Count},
                      {"outside", "Outside", ColumnKind::Share},
                      {"cp", "Cp", ColumnKind::Index},
                      {"cpk", "Cpk", ColumnKind::Index},
                      {"mean", "Mean", ColumnKind::Number},
                      {"deviation", "Deviation", ColumnKind::Number},
                      {"minimum", "Minimum", ColumnKind::Number},
                      {"maximum", "Maximum", ColumnKind::Number},
                      {"notNumbers", "No number", ColumnKind::Count}};
    std::set<Name> analysed;
    std::vector<Drawn> drawn;
    for (const Row& row : Selection(asked.filter).rows(store, kSpreadSql)) {
        // A result of the analysis repeats the experiment's measurement of the same name.
        const std::int64_t source = integerAt(row, 1);
        if (source == kAnalysis) {
            analysed.insert(nameOf(row));
        } else if (source == kExperiment && analysed.contains(nameOf(row))) {
            continue;
        }
        const Moments moments{integerAt(row, 8), numberAt(row, 11), numberAt(row, 12),
                              numberAt(row, 13)};
        const Capability capability = capabilityOf(moments, optionalAt(row, 5), optionalAt(row, 6));
        const auto outside = shareOf(integerAt(row, 15), integerAt(row, 14));
        answer.rows.push_back({textAt(row, 0), textAt(row, 2), textAt(row, 3), sourceName(source),
                               textAt(row, 4), moments.n, datumOf(outside), datumOf(capability.cp),
                               datumOf(capability.cpk), datumOf(moments.mean()),
                               datumOf(moments.deviation()), datumOf(optionalAt(row, 9)),
                               datumOf(optionalAt(row, 10)), integerAt(row, 7) - moments.n});
        drawn.push_back({{textAt(row, 2), textAt(row, 0), textAt(row, 4), sourceName(source)},
                         outside,
                         capability.cpk});
    }
    answer.notes = {
        "Values of PASS and FAIL runs, repetitions and retests included; a changed limit, and one "
        "of "
        "the bench, has a row of its own.",
        fmt::format("Cp and Cpk use the deviation of all values; undefined (–) of fewer than {} "
                    "values, without "
                    "deviation or without a bound.",
                    kLeastForCapability),
        "Outside: values that were judged, with the Wilson score interval, 95 %. With none of n "
        "outside its upper "
        "end is 3.84 / (n + 3.84).",
        "No number: NaN, infinite, or beyond 1e100; judged like every value, and in no other "
        "figure.",
    };
    draw(answer, std::move(drawn));
}

}  // namespace host
