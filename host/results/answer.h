// Answer: what a question to a store found, as plain data. Every form that shows it (text, JSON, CSV, a page)
// is made from this alone.
#ifndef ZR_HOST_RESULTS_ANSWER_H
#define ZR_HOST_RESULTS_ANSWER_H

#include <cstdint>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "host/report/html/bar_plot.h"
#include "host/report/html/plot.h"
#include "host/results/statistics.h"

namespace host {

enum class ColumnKind {
    Text,
    Time,
    Count,
    Number,
    Index,    // a number of which three digits say enough
    Percent,  // a number from 0 to 100
    Share,
};

struct AnswerColumn {
    std::string key;    // camelCase: the member in JSON, the head in CSV
    std::string title;  // for people
    ColumnKind kind = ColumnKind::Text;
};

// A cell: nothing where the figure is undefined or there is none; a count; a number; a text, also of a time
// (RFC 3339, UTC); a share.
using Datum = std::variant<std::monostate, std::int64_t, double, std::string, Share>;

using Drawing = std::variant<LinePlot, BarPlot>;

struct Answer {
    std::string question;  // its name
    std::string title;
    // Names and texts: where the runs are and which ones were asked for.
    std::vector<std::pair<std::string, std::string>> scope;
    std::string commandLine;  // that asked, passwords masked; empty when none did
    std::int64_t asked = 0;   // microseconds since 1970
    // How many runs were asked about, and how they ended: pass, fail, error, interrupted.
    std::int64_t runs = 0;
    std::int64_t verdicts[4] = {};
    std::vector<AnswerColumn> columns;
    std::vector<std::vector<Datum>> rows;  // each with a datum for every column
    // What to know about the figures, one sentence each; why there are no rows.
    std::vector<std::string> notes;
    std::vector<Drawing> drawings;
};

// "1200 runs: 1100 PASS, 60 FAIL, 30 ERROR, 10 INTERRUPTED"; "no runs".
std::string runsText(const Answer& answer);

}  // namespace host

#endif
