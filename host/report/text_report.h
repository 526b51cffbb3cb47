// The report for people: the verdict first, then what failed and why, then the rest.
#ifndef ZR_HOST_REPORT_TEXT_REPORT_H
#define ZR_HOST_REPORT_TEXT_REPORT_H

#include <string>

#include "host/record/run_record.h"

namespace host {

struct TextStyle {
    bool colour = false;   // escape sequences of a terminal
    bool verbose = false;  // show what is folded otherwise
};

// One run.
std::string textReport(const RunRecord& run, const TextStyle& style);

// One line for a run of a repeated series: its number, verdict, first failure.
std::string textLine(const RunRecord& run, const TextStyle& style);

// The figures of a repeated series.
std::string textReport(const RepeatRecord& repeat, const TextStyle& style);

}  // namespace host

#endif
