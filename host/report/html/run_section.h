// The section of one run in the HTML report, and what its head shares with the page's.
#ifndef ZR_HOST_REPORT_HTML_RUN_SECTION_H
#define ZR_HOST_REPORT_HTML_RUN_SECTION_H

#include <string>

#include "host/record/run_record.h"

namespace host {

// The verdict as a mark and a word, so that it does not depend on colour alone.
std::string verdictHtml(Verdict verdict);

// How a run's section stands in the page.
struct SectionPlace {
    std::string id;     // of the section, and the beginning of every id in it
    std::string title;  // unique in the page
    bool withOutcome;   // the head shows the run's own verdict, when the page's may differ
};

// The section. `repeat` is null when the run was not repeated.
std::string runHtml(const RunRecord& run, const RepeatRecord* repeat, const SectionPlace& place);

}  // namespace host

#endif
