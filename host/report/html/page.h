// The report for people who look at a session later: one HTML page.
//
// The page is self-contained: no network, no scripts. Verdict first, then for each run what failed and
// why, the repetitions, drawings of its frames and images, every result with its limit, parameters and
// log. Light or dark as the reader's system is, printable, and usable by keyboard and screen reader.
// Its size is bounded whatever the length of the runs.
#ifndef ZR_HOST_REPORT_HTML_PAGE_H
#define ZR_HOST_REPORT_HTML_PAGE_H

#include <memory>
#include <string>

#include "host/record/run_record.h"
#include "host/report/report_form.h"

namespace host {

std::string htmlReport(const SessionRecord& session);

std::shared_ptr<RunListener> openHtmlReport(ReportSink sink, const TextStyle& style);

}  // namespace host

#endif
