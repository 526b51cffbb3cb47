#include <algorithm>
#include <tuple>

#include <fmt/format.h>

#include "host/record/run_text.h"
#include "host/results/question_answers.h"

namespace host {

namespace {

// Limits that kept runs from passing: those of the bench too when they are part of the verdict.
constexpr std::string_view kLimits = R"(
SELECT runs.diagnostic, quantities.name, quantities.unit, limits.name, limits.bounds,
       COUNT(DISTINCT runs.id), COUNT(DISTINCT runs.unit_id), results.by_bench
FROM {runs} JOIN results ON results.run_id = runs.id JOIN quantities ON quantities.id = results.quantity_id
     JOIN limits ON limits.id = results.limit_id
WHERE {unmet} AND results.decides = 1 AND runs.verdict <> 'interrupted' AND {selected}
GROUP BY runs.diagnostic, quantities.name, quantities.unit, limits.name, limits.bounds, results.by_bench)";

// Each is found by an index of its own. Only a limit of the bench can be on what was not measured.
constexpr std::string_view kUnmet[] = {"results.judgement = 2",
                                       "results.by_bench = 1 AND results.judgement = 3"};

// What was reported, and what was the first cause of it.
constexpr std::string_view kErrors = R"(
SELECT runs.diagnostic, failures.domain, failures.code, failures.part, failures.step, MIN(failures.description),
       root.domain, root.code, COUNT(DISTINCT runs.id), COUNT(DISTINCT runs.unit_id)
FROM {runs} JOIN failures ON failures.run_id = runs.id AND failures.depth = 0
     JOIN failures AS root ON root.run_id = failures.run_id AND root.place = failures.place
     LEFT JOIN failures AS deeper ON deeper.run_id = root.run_id AND deeper.place = root.place
                                 AND deeper.depth = root.depth + 1
WHERE deeper.run_id IS NULL AND runs.verdict <> 'interrupted' AND {selected}
GROUP BY runs.diagnostic, failures.domain, failures.code, failures.part, failures.step, root.domain, root.code)";

struct Finding {
    std::string diagnostic;
    std::string kind;
    std::string name;
    std::string detail;
    std::int64_t runs;
    std::int64_t units;
};

Finding limitOf(const Row& row, bool isUnmeasured) {
    const std::string& unit = textAt(row, 2);
    const bool isOfBench = integerAt(row, 7) == 1;
    return {
        textAt(row, 0),
        isUnmeasured ? "not measured"
        : isOfBench  ? "bench limit"
                     : "limit",
        textAt(row, 1),
        fmt::format("{}: {}{}{}", textAt(row, 3), textAt(row, 4), unit.empty() ? "" : " ", unit),
        integerAt(row, 5),
        integerAt(row, 6)};
}

std::string codeText(const Row& row, std::size_t domain) {
    return fmt::format("{} {}", textAt(row, domain), integerAt(row, domain + 1));
}

Finding errorOf(const Row& row) {
    Finding finding{textAt(row, 0), "error",           "",
                    textAt(row, 5), integerAt(row, 8), integerAt(row, 9)};
    const std::string place = textAt(row, 3) + ", " + textAt(row, 4);
    if (textAt(row, 1).empty()) {
        finding.name = place;
        finding.detail = "failed without an error object";
        return finding;
    }
    finding.name = codeText(row, 1);
    if (const std::string root = textAt(row, 6).empty() ? "" : codeText(row, 6);
        !root.empty() && root != finding.name) {
        finding.name += ", caused by " + root;
    }
    finding.detail += fmt::format(" ({})", place);
    return finding;
}

}  // namespace

void answerPareto(Store& store, const Asked& asked, Answer& answer) {
    answer.title = "What fails most";
    answer.columns = {{"kind", "Kind"},
                      {"diagnostic", "Diagnostic"},
                      {"name", "Result, or error"},
                      {"detail", "Limit, or description"},
                      {"runs", "Runs", ColumnKind::Count},
                      {"units", "Units", ColumnKind::Count},
                      {"sharePercent", "Share %", ColumnKind::Percent},
                      {"cumulativePercent", "Cumulative %", ColumnKind::Percent}};
    const Selection selection(asked.filter);
    std::vector<Finding> findings;
    for (const std::string_view unmet : kUnmet) {
        const std::pair<std::string_view, std::string_view> words[] = {{"{unmet}", unmet}};
        for (const Row& row : selection.rows(store, withWords(kLimits, words))) {
            findings.push_back(limitOf(row, unmet != kUnmet[0]));
        }
    }
    for (const Row& row : selection.rows(store, kErrors)) {
        findings.push_back(errorOf(row));
    }
    std::sort(findings.begin(), findings.end(), [](const Finding& a, const Finding& b) {
        return std::tie(b.runs, b.units, a.diagnostic, a.kind, a.name, a.detail) <
               std::tie(a.runs, a.units, b.diagnostic, b.kind, b.name, b.detail);
    });
    std::int64_t all = 0;
    for (const Finding& finding : findings) {
        all += finding.runs;
    }

    BarPlot plot;
    plot.figure = {"pareto", "Findings by runs",
                   "A bar is the number of runs that had the finding.", "runs", "finding"};
    plot.series = {{"runs", "hue-b"}};
    plot.areBars = true;
    const auto percent = [all](std::int64_t part) {
        return 100 * static_cast<double>(part) / static_cast<double>(all);
    };
    std::vector<std::vector<std::string>> names;
    names.reserve(findings.size());
    for (const Finding& finding : findings) {
        names.push_back({finding.name, finding.diagnostic, finding.detail});
    }
    const std::vector<std::string> labels = rowLabels(names);
    std::int64_t before = 0;
    for (const Finding& finding : findings) {
        before += finding.runs;
        answer.rows.push_back({finding.kind, finding.diagnostic, finding.name, finding.detail,
                               finding.runs, finding.units, percent(finding.runs),
                               percent(before)});
        if (plot.bars.size() < kMostBars) {
            plot.bars.push_back({labels[plot.bars.size()], {{static_cast<double>(finding.runs)}}});
        }
    }
    if (findings.size() > kMostBars) {
        plot.figure.caption +=
            fmt::format(" The first {} of {} are drawn.", kMostBars, findings.size());
    }
    answer.drawings.emplace_back(std::move(plot));
    if (findings.empty()) {
        answer.notes = {"Nothing failed."};
        return;
    }
    answer.notes = {
        fmt::format("Share: of {} in all, each counted once per run; a run can have several.",
                    plural(static_cast<std::uint64_t>(all), "finding", "findings")),
        "Units: different units with the finding; runs without a unit count in none.",
        "Limits of the bench count when they are part of the verdict. INTERRUPTED runs are left "
        "out.",
    };
    if (asked.limit > 0 && static_cast<std::int64_t>(answer.rows.size()) > asked.limit) {
        answer.notes.push_back(fmt::format(
            "{} more are not shown.", answer.rows.size() - static_cast<std::size_t>(asked.limit)));
        answer.rows.resize(static_cast<std::size_t>(asked.limit));
    }
}

}  // namespace host
