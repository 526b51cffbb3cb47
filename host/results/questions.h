// The questions that can be asked of a store. The command line, its help and the completions are made from
// this table.
#ifndef ZR_HOST_RESULTS_QUESTIONS_H
#define ZR_HOST_RESULTS_QUESTIONS_H

#include <cstdint>
#include <span>
#include <string>
#include <string_view>

#include "host/results/answer.h"
#include "host/results/selection.h"
#include "host/store/store.h"

namespace host {

struct Question {
    std::string_view name;
    std::string_view summary;
    std::string_view subject;  // its argument as the help shows it; empty when it has none
    std::string_view subjectSummary;
    // Fills title, columns, rows, notes and drawings. Throws a StoreProblem.
    void (*ask)(Store& store, const Asked& asked, Answer& answer);
    std::int64_t limit;  // rows unless another number is given, 0 for all; -1 when it takes none
    bool takesBy = false;
    bool takesMeasurements = false;
    bool isPage = false;  // can be an HTML page
};

std::span<const Question> questions();

// The question of that name, or null.
const Question* questionNamed(std::string_view name);

// What yields can be grouped by, beside the diagnostic.
std::span<const std::string_view> yieldGroups();

// The answer. Every run that is asked about is in its counts; names that no run has are in its notes. Throws a
// StoreProblem.
Answer answerTo(const Question& question, Store& store, const Asked& asked);

}  // namespace host

#endif
