// Runs one by one: the newest of all, and those of a unit.
#include <algorithm>
#include <iterator>
#include <map>
#include <memory>

#include <fmt/format.h>

#include "host/record/run_text.h"
#include "host/results/question_answers.h"
#include "host/store/run_json.h"
#include "input/nearest.h"

namespace host {

namespace {

// The runs that are asked for; {listed} stands for this below.
constexpr std::string_view kListed = R"(
    SELECT runs.id AS id, runs.uuid AS uuid, runs.started AS started FROM {runs}
    WHERE {also}{selected} ORDER BY runs.started DESC, runs.uuid DESC LIMIT {limit})";

// Each with its first failure.
constexpr std::string_view kRuns = R"(
WITH listed AS ({listed})
SELECT runs.uuid, runs.started, runs.diagnostic, stations.name, units.serial, runs.part, runs.lot, runs.verdict,
       {attempt}, runs.frames_delivered, runs.images_delivered, steps.parameters,
       failures.part, failures.step, failures.domain, failures.code, failures.description, failures.message
FROM listed JOIN runs ON runs.id = listed.id JOIN stations ON stations.id = runs.station_id
LEFT JOIN units ON units.id = runs.unit_id
LEFT JOIN steps ON steps.run_id = runs.id AND steps.part = 'experiment'
LEFT JOIN failures ON failures.run_id = runs.id AND failures.place = 0 AND failures.depth = 0
{attempts}
ORDER BY runs.started DESC, runs.uuid DESC)";

// What kept each of them from passing, in the order of the reports.
constexpr std::string_view kFindings = R"(
WITH listed AS ({listed})
SELECT listed.uuid, results.by_bench, quantities.name, results.value, quantities.unit, results.judgement,
       results.note, limits.name, limits.lower, limits.lower_open, limits.upper, limits.upper_open
FROM listed JOIN results ON results.run_id = listed.id JOIN quantities ON quantities.id = results.quantity_id
     JOIN limits ON limits.id = results.limit_id
WHERE results.judgement IN (2, 3) AND results.decides = 1
ORDER BY listed.id, results.by_bench, results.of_analysis, results.place)";

std::optional<BoundRecord> boundOf(const Row& row, std::size_t column) {
    const auto open = optionalAt(row, column + 1);
    return open.has_value() ? std::optional(BoundRecord{numberAt(row, column), *open == 1})
                            : std::nullopt;
}

// The parts of the run's record that its reason is told from.
RunRecord recordOf(const Row& row) {
    RunRecord run;
    run.plan.name = textAt(row, 2);
    run.verdict = verdictOf(textAt(row, 7));
    run.framesDelivered = static_cast<std::uint64_t>(integerAt(row, 9));
    run.imagesDelivered = static_cast<std::uint64_t>(integerAt(row, 10));
    if (run.verdict == Verdict::Interrupted && !textAt(row, 11).empty()) {
        run.plan.experiment.parameters = parametersFromJson(textAt(row, 11));
    }
    if (!textAt(row, 12).empty()) {
        platform::ErrorRef error;
        if (!textAt(row, 14).empty()) {
            error = std::make_shared<platform::Error>(textAt(row, 14), integerAt(row, 15),
                                                      textAt(row, 16));
        }
        run.failures.push_back(
            {partOf(textAt(row, 12)), stepOf(textAt(row, 13)), std::move(error), textAt(row, 17)});
    }
    return run;
}

void addFinding(const Row& row, RunRecord& run) {
    BenchResult result;
    result.name = textAt(row, 2);
    result.value = numberAt(row, 3);
    result.unit = textAt(row, 4);
    result.judgement = judgementOf(integerAt(row, 5));
    result.note = textAt(row, 6);
    result.partOfVerdict = true;
    result.limit = LimitRecord{textAt(row, 7), boundOf(row, 8), boundOf(row, 10)};
    if (integerAt(row, 1) == 1) {
        // What an interrupted run had found says nothing about the unit.
        if (run.verdict == Verdict::Interrupted) {
            return;
        }
        run.benchResults.push_back(std::move(result));
    } else {
        run.results.push_back(std::move(result));
    }
}

// As reports tell it, with the error's domain and code and the number of other findings.
std::string whyOf(const RunRecord& run) {
    std::string why = whyText(run);
    if (!run.failures.empty()) {
        return run.failures.front().error == nullptr
                   ? why
                   : fmt::format("{} ({})", why, symptomText(run.failures.front(), " "));
    }
    const std::size_t findings = run.results.size() + run.benchResults.size();
    return findings > 1 && run.verdict != Verdict::Interrupted
               ? fmt::format("{} and {} more", why, findings - 1)
               : why;
}

struct ListedRun {
    Row row;
    RunRecord record;
};

std::vector<ListedRun> runsOf(Store& store,
                              const Asked& asked,
                              Selection& selection,
                              bool withAttempts,
                              std::string_view also) {
    // No limit is a great one.
    const std::string limit =
        selection.add(asked.limit > 0 ? asked.limit + 1 : std::int64_t{1} << 40);
    const std::pair<std::string_view, std::string_view> words[] = {
        {"{listed}", kListed},
        {"{attempt}", withAttempts ? "attempts.attempt" : "NULL"},
        {"{attempts}", withAttempts ? "LEFT JOIN attempts ON attempts.run_id = runs.id" : ""},
        {"{limit}", limit},
        {"{also}", also}};
    std::vector<ListedRun> runs;
    std::map<std::string, std::size_t> places;
    for (Row& row : selection.rows(store, withWords(kRuns, words))) {
        RunRecord record = recordOf(row);
        places.emplace(textAt(row, 0), runs.size());
        runs.push_back({std::move(row), std::move(record)});
    }
    for (const Row& row : selection.rows(store, withWords(kFindings, words))) {
        // A run that was written between the two is not listed.
        if (const auto place = places.find(textAt(row, 0)); place != places.end()) {
            addFinding(row, runs[place->second].record);
        }
    }
    return runs;
}

void cut(const Asked& asked, Answer& answer) {
    if (asked.limit > 0 && answer.rows.size() > static_cast<std::size_t>(asked.limit)) {
        answer.rows.resize(static_cast<std::size_t>(asked.limit));
        answer.notes.emplace_back("There are more; --limit N shows N of them.");
    }
}

Datum verdictDatum(const RunRecord& run) {
    return std::string(verdictText(run.verdict));
}

}  // namespace

void answerList(Store& store, const Asked& asked, Answer& answer) {
    answer.title = "Runs, newest first";
    answer.columns = {{"started", "Started", ColumnKind::Time},
                      {"uuid", "UUID"},
                      {"diagnostic", "Diagnostic"},
                      {"unit", "Unit"},
                      {"station", "Station"},
                      {"verdict", "Verdict"},
                      {"why", "Why"}};
    Selection selection(asked.filter);
    for (const auto& [row, run] : runsOf(store, asked, selection, false, "")) {
        answer.rows.push_back({momentText(integerAt(row, 1)), textAt(row, 0), textAt(row, 2),
                               textAt(row, 4), textAt(row, 3), verdictDatum(run), whyOf(run)});
    }
    cut(asked, answer);
}

void answerUnit(Store& store, const Asked& asked, Answer& answer) {
    answer.title = "History of unit " + asked.subject;
    answer.columns = {{"started", "Started", ColumnKind::Time},
                      {"diagnostic", "Diagnostic"},
                      {"attempt", "Attempt", ColumnKind::Count},
                      {"station", "Station"},
                      {"part", "Part"},
                      {"lot", "Lot"},
                      {"verdict", "Verdict"},
                      {"why", "Why"},
                      {"uuid", "UUID"}};
    Selection selection(asked.filter);
    const std::string unit = "units.serial = " + selection.add(asked.subject) + " AND ";
    // Of this unit only.
    answer.runs = 0;
    std::fill(std::begin(answer.verdicts), std::end(answer.verdicts), 0);
    for (const auto& [row, run] : runsOf(store, asked, selection, true, unit)) {
        ++answer.runs;
        ++answer.verdicts[static_cast<std::size_t>(run.verdict)];
        const auto attempt = optionalAt(row, 8);
        answer.rows.push_back({momentText(integerAt(row, 1)), textAt(row, 2),
                               attempt.has_value() ? Datum(integerAt(row, 8)) : Datum(),
                               textAt(row, 3), textAt(row, 5), textAt(row, 6), verdictDatum(run),
                               whyOf(run), textAt(row, 0)});
    }
    if (!answer.rows.empty()) {
        answer.notes = {
            "Newest first. An attempt is a judged run of the diagnostic; ERROR and INTERRUPTED are "
            "none."};
        cut(asked, answer);
        return;
    }
    std::vector<std::string> serials;
    for (const Row& row : store.query("SELECT DISTINCT serial FROM units")) {
        serials.push_back(textAt(row, 0));
    }
    const bool isKnown = std::find(serials.begin(), serials.end(), asked.subject) != serials.end();
    answer.notes = {isKnown ? fmt::format("None of these runs is of unit \"{}\".", asked.subject)
                            : fmt::format("No run is of unit \"{}\"{}", asked.subject,
                                          input::didYouMean(asked.subject, serials))};
}

}  // namespace host
