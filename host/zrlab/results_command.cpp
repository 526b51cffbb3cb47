#include "host/zrlab/results_command.h"

#include <chrono>

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/record/problem.h"
#include "host/report/replay.h"
#include "host/report/report_forms.h"
#include "host/results/answer_forms.h"
#include "host/results/questions.h"
#include "host/results/stored_run.h"
#include "host/store/run_json.h"
#include "host/zrlab/output_file.h"
#include "host/zrlab/output_form.h"
#include "host/zrlab/store_command.h"

namespace host {

namespace {

// A question looks at every run; nobody waits for it at the end of a test.
constexpr std::chrono::minutes kPatience(5);

std::string shownRun(Store& store, const ResultsOptions& options, const std::string& format) {
    const SessionRecord session = storedRun(store, options.asked.subject);
    std::string text;
    const auto report =
        reportFormNamed(format)->open([&text](std::string_view piece) { text += piece; },
                                      {.colour = false, .verbose = true, .heading = true});
    replay(session, *report);
    return text;
}

// What the answer is made by: everything but the store is checked before this returns.
std::function<std::string(Store& store)> prepared(const ResultsOptions& options) {
    const Question* question = questionNamed(options.question);
    if (question == nullptr) {
        const std::string format =
            formOfOutput("results", options.format, options.output, [](const std::string& file) {
                const ReportForm* form = reportFormOf(file);
                return form != nullptr ? std::string(form->name) : "";
            });
        return [&options, format](Store& store) { return shownRun(store, options, format); };
    }
    const std::string name =
        formOfOutput("results", options.format, options.output, [](const std::string& file) {
            const AnswerForm* form = findAnswerForm(
                [ending = endingOf(file)](const AnswerForm& one) { return one.ending == ending; });
            return form != nullptr ? std::string(form->name) : "";
        });
    const AnswerForm& form =
        *findAnswerForm([&name](const AnswerForm& one) { return one.name == name; });
    if (form.isPage && !question->isPage) {
        throw Problem(kExitUsage,
                      fmt::format("results {}: its answer cannot be a page; its forms are {}",
                                  question->name, fmt::join(answerFormNames(*question), ", ")));
    }
    const std::int64_t now = microsecondsOf(platform::Date::now());
    Asked asked = options.asked;
    if (!options.since.empty()) {
        asked.filter.since = momentOf("--since", options.since, now, false);
    }
    if (!options.until.empty()) {
        asked.filter.until = momentOf("--until", options.until, now, true);
    }
    if (asked.filter.since >= asked.filter.until && asked.filter.until.has_value()) {
        throw Problem(kExitUsage,
                      fmt::format("results: no time is between --since {} and --until {}",
                                  plainLine(options.since), plainLine(options.until)));
    }
    asked.limit = options.limit > 0 ? options.limit : question->limit;
    return [question, &form, asked](Store& store) {
        return form.write(answerTo(*question, store, asked));
    };
}

}  // namespace

std::vector<std::string> answerFormNames(const Question& question) {
    std::vector<std::string> names;
    for (const AnswerForm& form : answerForms()) {
        if (!form.isPage || question.isPage) {
            names.emplace_back(form.name);
        }
    }
    return names;
}

std::string resultsCommand(const ResultsOptions& options) {
    const auto answer = prepared(options);
    if (goesToFile(options.output)) {
        requireWritable(options.output);
    }
    requireNamedStore("results", options.store);
    Store store(options.store, Access::Existing);
    store.setPatience(kPatience);
    std::string text;
    try {
        text = answer(store);
    } catch (const StoreProblem& problem) {
        throw Problem(kExitError, fmt::format("store {}", problem.what()));
    }
    if (!goesToFile(options.output)) {
        return text;
    }
    writeFile(options.output, text);
    return "";
}

}  // namespace host
