// The report for people: the verdict first, then what failed and why, then the rest.
#ifndef ZR_HOST_REPORT_TEXT_REPORT_H
#define ZR_HOST_REPORT_TEXT_REPORT_H

#include <memory>
#include <string>

#include "host/record/run_record.h"
#include "host/report/report_form.h"

namespace host {

// Writes each name that was asked for as soon as it is done, with a blank line between two of them.
std::shared_ptr<RunListener> openTextReport(ReportSink sink, const TextStyle& style);

// One run.
std::string textReport(const RunRecord& run, const TextStyle& style);

// One line for a run of a repeated series: its number, verdict, first failure.
std::string textLine(const RunRecord& run, const TextStyle& style);

// The figures of a repeated series.
std::string textReport(const RepeatRecord& repeat, const TextStyle& style);

}  // namespace host

#endif
