#include <algorithm>
#include <map>
#include <set>
#include <tuple>

#include <fmt/format.h>

#include "host/record/run_text.h"
#include "host/results/question_answers.h"
#include "input/nearest.h"

namespace host {

namespace {

// One row for each stretch of time, station and limit.
constexpr std::string_view kTrendSql = R"(
WITH chosen AS (
    SELECT runs.diagnostic AS diagnostic, {source} AS source, quantities.unit AS unit,
           stations.name AS station, runs.started / CAST({stretch} AS BIGINT) AS stretch,
           COALESCE(results.limit_id, 0) AS limit_id, results.judgement AS judgement,
           CASE WHEN results.value BETWEEN -1e100 AND 1e100 THEN results.value END AS value
    FROM {runs} JOIN results ON results.run_id = runs.id JOIN quantities ON quantities.id = results.quantity_id
    WHERE runs.verdict IN ('pass', 'fail') AND results.judgement <> 3 AND quantities.name = {name} AND {selected}),
figures AS (
    SELECT diagnostic, source, unit, station, stretch, limit_id, COUNT(*) AS records, COUNT(value) AS n,
           MIN(value) AS least, AVG(value) AS mean, MAX(value) AS greatest,
           COUNT(*) FILTER (WHERE judgement <> 0) AS judged, COUNT(*) FILTER (WHERE judgement = 2) AS outside
    FROM chosen GROUP BY diagnostic, source, unit, station, stretch, limit_id)
SELECT diagnostic, source, unit, station, stretch, records, n, least, mean, greatest, limits.bounds,
       limits.lower, limits.upper, judged, outside
FROM figures LEFT JOIN limits ON limits.id = limit_id
ORDER BY diagnostic, source, unit, station, stretch, limits.bounds)";

constexpr std::int64_t kSecond = 1'000'000;
constexpr std::int64_t kDay = 86400 * kSecond;

// A drawing has at most about that many stretches of time.
constexpr std::int64_t kMostStretches = 300;

struct Stretch {
    std::int64_t length;
    std::string_view name;
};
constexpr Stretch kStretches[] = {{kSecond, "second"},           {60 * kSecond, "minute"},
                                  {600 * kSecond, "10 minutes"}, {3600 * kSecond, "hour"},
                                  {21600 * kSecond, "6 hours"},  {kDay, "day"},
                                  {7 * kDay, "7 days"},          {28 * kDay, "28 days"}};

// Without the measurements that results of the same diagnostic repeat.
Rows rowsBy(std::int64_t stretch, Store& store, const Asked& asked) {
    Selection selection(asked.filter);
    const std::string length = selection.add(stretch);
    const std::string name = selection.add(asked.subject);
    const std::pair<std::string_view, std::string_view> words[] = {{"{stretch}", length},
                                                                   {"{name}", name}};
    std::set<std::string> analysed;
    Rows rows;
    for (Row& row : selection.rows(store, withWords(kTrendSql, words))) {
        const std::int64_t source = integerAt(row, 1);
        if (source == kAnalysis) {
            analysed.insert(textAt(row, 0));
        } else if (source == kExperiment && analysed.contains(textAt(row, 0))) {
            continue;
        }
        rows.push_back(std::move(row));
    }
    return rows;
}

void explainNothing(Store& store, const Asked& asked, Answer& answer) {
    std::vector<std::string> names;
    for (const Row& row : store.query("SELECT DISTINCT name FROM quantities")) {
        names.push_back(textAt(row, 0));
    }
    const bool isKnown = std::find(names.begin(), names.end(), asked.subject) != names.end();
    answer.notes = {isKnown ? fmt::format("None of these runs has \"{}\".", asked.subject)
                            : fmt::format("Nothing is measured under the name \"{}\"{}",
                                          asked.subject, input::didYouMean(asked.subject, names))};
}

// One drawing for each station: where the values were, and their limit as it was then.
void draw(Store& store, const Asked& asked, std::int64_t first, std::int64_t last, Answer& answer) {
    const auto* stretch = std::begin(kStretches);
    while (stretch + 1 != std::end(kStretches) &&
           (last - first) / stretch->length > kMostStretches) {
        ++stretch;
    }
    const std::int64_t origin = first / kDay * kDay;
    std::map<std::tuple<std::string, std::string, std::int64_t, std::string>, LinePlot> plots;
    for (const Row& row : rowsBy(stretch->length, store, asked)) {
        const std::int64_t source = integerAt(row, 1);
        const std::tuple key(textAt(row, 0), textAt(row, 3), source, textAt(row, 2));
        auto [known, isNew] = plots.try_emplace(key);
        LinePlot& plot = known->second;
        if (isNew) {
            plot.figure = {
                fmt::format("trend-{}", plots.size()),
                fmt::format("{} at {}{}", asked.subject, textAt(row, 3),
                            source == kBench ? ", limits of the bench" : ""),
                fmt::format(
                    "{}. The line is the mean of each {}, the area reaches from the least to the "
                    "greatest value.",
                    textAt(row, 0), stretch->name),
                "days since " + dayText(origin), textAt(row, 2)};
            plot.wholeX = false;
            plot.series = {{"mean", "hue-a", {}},
                           {"lower limit", "hue-b dashed", {}},
                           {"upper limit", "hue-c dotted", {}}};
            plot.bands = {{"least to greatest", "hue-a", {}, {}}};
        }
        const auto day = [&](std::int64_t at) {
            return static_cast<double>(at * stretch->length - origin) / static_cast<double>(kDay);
        };
        const double from = day(integerAt(row, 4));
        const double to = day(integerAt(row, 4) + 1);
        const double middle = (from + to) / 2;
        plot.series[0].points.push_back({middle, numberAt(row, 8)});
        plot.bands[0].lower.push_back({middle, numberAt(row, 7)});
        plot.bands[0].upper.push_back({middle, numberAt(row, 9)});
        for (const std::size_t bound : {1U, 2U}) {
            std::vector<Point>& points = plot.series[bound].points;
            // Two limits in one stretch: the step is where the second begins.
            const double start = points.empty() ? from : std::max(from, points.back().x);
            if (!points.empty() && points.back().y != numberAt(row, 10 + bound)) {
                points.push_back({start, points.back().y});
            }
            points.push_back({start, numberAt(row, 10 + bound)});
            points.push_back({std::max(start, to), numberAt(row, 10 + bound)});
        }
    }
    // The drawings of a diagnostic share their axes.
    std::map<std::pair<std::string, std::string>, std::vector<Point>> rooms;
    for (const auto& [key, plot] : plots) {
        std::vector<Point>& room = rooms[{std::get<0>(key), plot.figure.yLabel}];
        for (const auto* points : {&plot.bands[0].lower, &plot.bands[0].upper,
                                   &plot.series[1].points, &plot.series[2].points}) {
            room.insert(room.end(), points->begin(), points->end());
        }
    }
    for (auto& [key, plot] : plots) {
        plot.room = rooms[{std::get<0>(key), plot.figure.yLabel}];
        if (answer.drawings.size() == kMostDrawings) {
            answer.notes.push_back(
                fmt::format("{} of {} drawings are shown.", kMostDrawings, plots.size()));
            break;
        }
        std::erase_if(plot.series, [](const Series& series) {
            return std::none_of(series.points.begin(), series.points.end(),
                                [](const Point& point) { return point.y == point.y; });
        });
        answer.drawings.emplace_back(std::move(plot));
    }
}

}  // namespace

void answerTrend(Store& store, const Asked& asked, Answer& answer) {
    answer.title = "Trend of " + asked.subject;
    answer.columns = {{"diagnostic", "Diagnostic"},
                      {"station", "Station"},
                      {"day", "Day"},
                      {"unit", "Unit"},
                      {"source", "Source"},
                      {"n", "n", ColumnKind::Count},
                      {"notNumbers", "No number", ColumnKind::Count},
                      {"minimum", "Minimum", ColumnKind::Number},
                      {"mean", "Mean", ColumnKind::Number},
                      {"maximum", "Maximum", ColumnKind::Number},
                      {"limit", "Limit"},
                      {"outside", "Outside", ColumnKind::Share}};
    for (const Row& row : rowsBy(kDay, store, asked)) {
        answer.rows.push_back({textAt(row, 0), textAt(row, 3), dayText(integerAt(row, 4) * kDay),
                               textAt(row, 2), sourceName(integerAt(row, 1)), integerAt(row, 6),
                               integerAt(row, 5) - integerAt(row, 6), datumOf(optionalAt(row, 7)),
                               datumOf(optionalAt(row, 8)), datumOf(optionalAt(row, 9)),
                               textAt(row, 10),
                               datumOf(shareOf(integerAt(row, 14), integerAt(row, 13)))});
    }
    if (answer.rows.empty()) {
        explainNothing(store, asked, answer);
        return;
    }
    answer.notes = {
        "Values of PASS and FAIL runs; days are in UTC. A limit that changed within a day has a "
        "row of "
        "its own.",
        "Outside: values that were judged, with the Wilson score interval, 95 %."};
    const Row ends =
        Selection(asked.filter)
            .rows(store, "SELECT MIN(runs.started), MAX(runs.started) FROM {runs} WHERE {selected}")
            .front();
    draw(store, asked, integerAt(ends, 0), integerAt(ends, 1), answer);
}

}  // namespace host
