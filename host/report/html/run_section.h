// The section of one run in the HTML report, and what its head shares with the page's.
#ifndef ZR_HOST_REPORT_HTML_RUN_SECTION_H
#define ZR_HOST_REPORT_HTML_RUN_SECTION_H

#include <string>

#include "host/record/run_record.h"

namespace host {

// The verdict as a mark and a word, so that it does not depend on colour alone.
std::string verdictHtml(Verdict verdict);

// "pass", "fail", "error": the class that gives an element the verdict's colour.
std::string_view verdictClass(Verdict verdict);

// The section; its id, and the beginning of every id in it, is `id`. `repeat` is null when the run was
// not repeated. `withOutcome`: the head shows the run's own verdict, when the page's may differ.
std::string runHtml(const RunRecord& run,
                    const RepeatRecord* repeat,
                    const std::string& id,
                    bool withOutcome);

}  // namespace host

#endif
