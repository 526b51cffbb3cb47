#include "host/results/questions.h"

#include <algorithm>
#include <chrono>
#include <map>
#include <set>

#include <fmt/format.h>

#include "host/record/run_text.h"
#include "host/results/question_answers.h"

namespace host {

std::span<const Question> questions() {
    static constexpr Question kQuestions[] = {
        {.name = "list",
         .summary = "List runs, newest first",
         .subject = "",
         .subjectSummary = "",
         .ask = answerList,
         .limit = 20},
        {.name = "yield",
         .summary = "First-pass and last-pass yield",
         .subject = "",
         .subjectSummary = "",
         .ask = answerYield,
         .limit = -1,
         .takesBy = true,
         .isPage = true},
        {.name = "pareto",
         .summary = "What fails most: limits and errors",
         .subject = "",
         .subjectSummary = "",
         .ask = answerPareto,
         .limit = 0,
         .isPage = true},
        {.name = "spread",
         .summary = "How each measurement spreads, and how capable it is of its limit",
         .subject = "",
         .subjectSummary = "",
         .ask = answerSpread,
         .limit = -1,
         .isPage = true},
        {.name = "trend",
         .summary = "A measurement over time, station by station",
         .subject = "MEASUREMENT",
         .subjectSummary = "What was measured, by its name in reports",
         .ask = answerTrend,
         .limit = -1,
         .isPage = true},
        {.name = "stations",
         .summary = "Whether stations agree",
         .subject = "",
         .subjectSummary = "",
         .ask = answerStations,
         .limit = -1,
         .takesMeasurements = true},
        {.name = "unit",
         .summary = "The history of a unit",
         .subject = "SERIAL",
         .subjectSummary = "The unit's serial number",
         .ask = answerUnit,
         .limit = 0},
    };
    return kQuestions;
}

const Question* questionNamed(std::string_view name) {
    const auto all = questions();
    const auto found = std::find_if(all.begin(), all.end(),
                                    [name](const Question& one) { return one.name == name; });
    return found != all.end() ? &*found : nullptr;
}

std::vector<std::string> rowLabels(const std::vector<std::vector<std::string>>& rows) {
    std::vector<std::string> labels;
    labels.reserve(rows.size());
    std::size_t most = 0;
    for (const auto& parts : rows) {
        labels.push_back(parts.front());
        most = std::max(most, parts.size());
    }
    for (std::size_t part = 1; part < most; ++part) {
        std::map<std::string, std::set<std::string>> texts;
        for (std::size_t row = 0; row < rows.size(); ++row) {
            texts[labels[row]].insert(rows[row][part]);
        }
        for (std::size_t row = 0; row < rows.size(); ++row) {
            if (texts.at(labels[row]).size() > 1 && !rows[row][part].empty()) {
                labels[row] += ", " + rows[row][part];
            }
        }
    }
    return labels;
}

std::string runsText(const Answer& answer) {
    if (answer.runs == 0) {
        return "no runs";
    }
    return fmt::format("{}: {} PASS, {} FAIL, {} ERROR, {} INTERRUPTED",
                       plural(static_cast<std::uint64_t>(answer.runs), "run", "runs"),
                       answer.verdicts[0], answer.verdicts[1], answer.verdicts[2],
                       answer.verdicts[3]);
}

Answer answerTo(const Question& question, Store& store, const Asked& asked) {
    Answer answer;
    answer.question = question.name;
    answer.commandLine = asked.commandLine;
    answer.asked = std::chrono::duration_cast<std::chrono::microseconds>(
                       std::chrono::system_clock::now().time_since_epoch())
                       .count();
    answer.scope = asked.filter.scope();
    answer.scope.emplace(answer.scope.begin(), "store", store.name());
    const Selection selection(asked.filter);
    for (const Row& row : selection.rows(
             store,
             "SELECT runs.verdict, COUNT(*) FROM {runs} WHERE {selected} GROUP BY runs.verdict")) {
        answer.runs += integerAt(row, 1);
        for (const Verdict verdict : kVerdicts) {
            if (textAt(row, 0) == verdictName(verdict)) {
                answer.verdicts[static_cast<std::size_t>(verdict)] = integerAt(row, 1);
            }
        }
    }
    const bool isEmpty = answer.runs == 0;
    question.ask(store, asked, answer);
    if (isEmpty) {
        const std::vector<std::string> unknown = unknownNames(store, asked.filter);
        answer.notes = unknown.empty() ? std::vector<std::string>{"No runs."} : unknown;
    }
    return answer;
}

}  // namespace host
