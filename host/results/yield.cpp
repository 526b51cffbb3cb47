#include <algorithm>
#include <cctype>
#include <iterator>
#include <map>

#include <fmt/format.h>

#include "host/record/run_text.h"
#include "host/results/answer_forms.h"
#include "host/results/question_answers.h"

namespace host {

namespace {

constexpr std::string_view kGroups[] = {"diagnostic", "station", "lot", "part", "day"};
// The column of each.
constexpr std::string_view kColumns[] = {"''", "stations.name", "runs.lot", "runs.part",
                                         "runs.day"};

// Attempts are counted over the whole store, so that a filter does not make a second attempt the first.
constexpr std::string_view kYieldSql = R"(
SELECT runs.diagnostic, {group}, COUNT(*),
       COUNT(*) FILTER (WHERE runs.verdict = 'pass'), COUNT(*) FILTER (WHERE runs.verdict = 'fail'),
       COUNT(*) FILTER (WHERE runs.verdict = 'error'), COUNT(*) FILTER (WHERE runs.verdict = 'interrupted'),
       COUNT(*) FILTER (WHERE runs.unit_id IS NULL),
       COUNT(*) FILTER (WHERE attempt = 1), COUNT(*) FILTER (WHERE attempt = 1 AND runs.verdict = 'pass'),
       COUNT(*) FILTER (WHERE attempt_from_last = 1),
       COUNT(*) FILTER (WHERE attempt_from_last = 1 AND runs.verdict = 'pass')
FROM {runs} LEFT JOIN attempts ON attempts.run_id = runs.id
WHERE {selected} GROUP BY 1, 2 ORDER BY 1, 2)";

// The cells behind those of the group.
constexpr std::size_t kCountCells = 6;
const Share* firstPass(const std::vector<Datum>& row) {
    return std::get_if<Share>(&row[row.size() - kCountCells - 2]);
}
const Share* lastPass(const std::vector<Datum>& row) {
    return std::get_if<Share>(&row[row.size() - kCountCells - 1]);
}

// The ends of the interval and the share over the days, in per cent.
void addDay(LinePlot& plot, double day, const Share& share) {
    plot.series[0].points.push_back({day, 100 * share.value()});
    plot.bands[0].lower.push_back({day, 100 * share.low});
    plot.bands[0].upper.push_back({day, 100 * share.high});
}

void drawDays(Answer& answer) {
    std::map<std::string, LinePlot> plots;
    std::string first;
    for (const auto& row : answer.rows) {
        const auto& day = std::get<std::string>(row[1]);
        first = first.empty() ? day : std::min(first, day);
    }
    const auto daysSince = [](const std::string& from, const std::string& to) {
        return static_cast<double>(momentOf("", to, 0, false) - momentOf("", from, 0, false)) /
               86400e6;
    };
    for (const auto& row : answer.rows) {
        const Share* share = firstPass(row);
        if (share == nullptr) {
            continue;
        }
        const auto& diagnostic = std::get<std::string>(row[0]);
        auto [known, isNew] = plots.try_emplace(diagnostic);
        LinePlot& plot = known->second;
        if (isNew) {
            plot.figure = {
                fmt::format("yield-{}", plots.size()), "First-pass yield of " + diagnostic,
                "Units whose first attempt was on the day. The area is the 95 % interval.",
                "days since " + first, "%"};
            plot.series = {{"first pass", "hue-a", {}}};
            plot.bands = {{"95 % interval", "hue-a", {}, {}}};
        }
        addDay(plot, daysSince(first, std::get<std::string>(row[1])), *share);
    }
    for (auto& [diagnostic, plot] : plots) {
        if (answer.drawings.size() < kMostDrawings) {
            answer.drawings.emplace_back(std::move(plot));
        }
    }
}

void drawGroups(Answer& answer, std::string_view by) {
    BarPlot plot;
    plot.figure = {"yield", "Yield",
                   "A point is the share of units that passed; the line is its 95 % interval.",
                   "% of units",
                   by == "diagnostic" ? "diagnostic" : fmt::format("diagnostic, {}", by)};
    plot.series = {{"first pass", "hue-a"}, {"last pass", "hue-b"}};
    std::size_t left = 0;
    for (const auto& row : answer.rows) {
        const Share* first = firstPass(row);
        const Share* last = lastPass(row);
        if (first == nullptr && last == nullptr) {
            continue;
        }
        if (plot.bars.size() == kMostBars) {
            ++left;
            continue;
        }
        std::string label = std::get<std::string>(row[0]);
        if (by != "diagnostic") {
            label += ", " + datumText(row[1], ColumnKind::Text);
        }
        Bar& bar = plot.bars.emplace_back(Bar{label, {}});
        for (const Share* share : {first, last}) {
            bar.marks.push_back(share == nullptr ? BarMark{}
                                                 : BarMark{100 * share->value(), 100 * share->low,
                                                           100 * share->high});
        }
    }
    if (left > 0) {
        plot.figure.caption +=
            fmt::format(" The first {} are drawn; the table has {} more.", kMostBars, left);
    }
    answer.drawings.emplace_back(std::move(plot));
}

}  // namespace

std::span<const std::string_view> yieldGroups() {
    return kGroups;
}

void answerYield(Store& store, const Asked& asked, Answer& answer) {
    answer.title = "Yield by diagnostic";
    answer.columns = {{"diagnostic", "Diagnostic"}};
    const bool isGrouped = asked.by != "diagnostic";
    if (isGrouped) {
        answer.title += " and " + asked.by;
        std::string head = asked.by;
        head.front() = static_cast<char>(std::toupper(static_cast<unsigned char>(head.front())));
        answer.columns.push_back({asked.by, std::move(head)});
    }
    answer.columns.insert(answer.columns.end(), {{"firstPass", "First pass", ColumnKind::Share},
                                                 {"lastPass", "Last pass", ColumnKind::Share},
                                                 {"runs", "Runs", ColumnKind::Count},
                                                 {"pass", "PASS", ColumnKind::Count},
                                                 {"fail", "FAIL", ColumnKind::Count},
                                                 {"error", "ERROR", ColumnKind::Count},
                                                 {"interrupted", "INTERRUPTED", ColumnKind::Count},
                                                 {"withoutUnit", "No unit", ColumnKind::Count}});
    const auto at =
        std::find(std::begin(kGroups), std::end(kGroups), asked.by) - std::begin(kGroups);
    const std::pair<std::string_view, std::string_view> group[] = {{"{group}", kColumns[at]}};
    std::int64_t withoutUnit = 0;
    for (const Row& row : Selection(asked.filter).rows(store, withWords(kYieldSql, group))) {
        std::vector<Datum>& cells = answer.rows.emplace_back();
        cells.emplace_back(textAt(row, 0));
        if (isGrouped) {
            cells.emplace_back(textAt(row, 1));
        }
        cells.push_back(datumOf(shareOf(integerAt(row, 9), integerAt(row, 8))));
        cells.push_back(datumOf(shareOf(integerAt(row, 11), integerAt(row, 10))));
        for (std::size_t column = 2; column < 2 + kCountCells; ++column) {
            cells.emplace_back(integerAt(row, column));
        }
        withoutUnit += integerAt(row, 7);
    }
    answer.notes = {
        "First pass: units whose first judged run passed; last pass: units whose last one did.",
        "Attempts are counted over the whole store; a unit counts in the group and period of that "
        "attempt.",
        "ERROR and INTERRUPTED are not FAIL and not attempts.",
        "Intervals: Wilson score, 95 %.",
    };
    if (withoutUnit > 0) {
        answer.notes.push_back(
            fmt::format("{} named no unit and {} in no yield.",
                        plural(static_cast<std::uint64_t>(withoutUnit), "run", "runs"),
                        withoutUnit == 1 ? "counts" : "count"));
    }
    if (asked.by == "day") {
        drawDays(answer);
    } else {
        drawGroups(answer, asked.by);
    }
}

}  // namespace host
