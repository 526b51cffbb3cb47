// The report for CI systems: a session as JUnit XML.
//
// One suite per diagnostic or experiment, in the order in which they were asked for; in it
//   one case per measured result: passed when it is within its limit or has none, else a failure with
//   value, limit and unit
//   one case per failed step, with an error of type "domain code" and the chain of causes
//   for an experiment that completed, which has no results, one passed case "run"
//   for a run that was interrupted a case "run" with an error of type "interrupted"
//   one skipped case per result that a run in error or interrupted did not come to, when another run of the
//   session shows that there is such a result; an analysis names its results only by having them
// and for each name that was not started a suite with one skipped case "run". A case's class is
// "DEVICE.NAME". Device, parameters and the measurements of a run without results are properties of the
// suite, log lines its system-out. For a repeated run, each case covers all repetitions: a result failed when
// it was outside its limit at least once, and its message has the least, median and greatest value. Characters
// that XML 1.0 cannot carry are replaced by U+FFFD.
#ifndef ZR_HOST_REPORT_JUNIT_REPORT_H
#define ZR_HOST_REPORT_JUNIT_REPORT_H

#include <memory>
#include <string>

#include "host/record/run_record.h"
#include "host/report/report_form.h"

namespace host {

std::string junitReport(const SessionRecord& session);

std::shared_ptr<RunListener> openJunitReport(ReportSink sink, const TextStyle& style);

}  // namespace host

#endif
