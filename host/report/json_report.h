// The report for programs that want everything at once: a session as one JSON document.
#ifndef ZR_HOST_REPORT_JSON_REPORT_H
#define ZR_HOST_REPORT_JSON_REPORT_H

#include <memory>
#include <string>

#include "host/record/run_record.h"
#include "host/report/report_form.h"

namespace host {

// Integers stay integers, floating point has a decimal point or an exponent and the shortest digits
// that read back to the same value, booleans are true and false; NaN and the infinities, which JSON
// cannot carry, are the strings "nan", "inf" and "-inf". The kind of each number of
// the auxiliary data is under "auxiliaryDataKinds", in the same structure; a list whose elements are all
// of one kind has that kind once.
std::string jsonReport(const SessionRecord& session);

std::shared_ptr<RunListener> openJsonReport(ReportSink sink, const TextStyle& style);

}  // namespace host

#endif
