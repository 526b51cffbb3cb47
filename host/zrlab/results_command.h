// zrlab results: questions to a store, and stored runs.
#ifndef ZR_HOST_ZRLAB_RESULTS_COMMAND_H
#define ZR_HOST_ZRLAB_RESULTS_COMMAND_H

#include <cstdint>
#include <string>
#include <vector>

#include "host/results/selection.h"

namespace host {

struct Question;

struct ResultsOptions {
    std::string question;  // a name of the table of questions, or "show"
    std::string store;     // where the runs are; see Store
    std::string since;     // as given; see momentOf()
    std::string until;
    Asked asked;             // without since, until and limit
    std::int64_t limit = 0;  // 0 when not given
    std::string format;      // empty: what the output's ending says, else text
    std::string output;      // the file that gets the answer; empty or "-" for standard output
};

// The forms that an answer to the question can have.
std::vector<std::string> answerFormNames(const Question& question);

// The answer for standard output; nothing when it went to a file. Throws a Problem: kExitUsage about a time, a
// form, a file, a store that is not named, or a UUID that is not that of one run, and as Store does; kExitError
// when the store does not work or the file cannot be written.
std::string resultsCommand(const ResultsOptions& options);

}  // namespace host

#endif
