// The images of a session as a table for other programs, in CSV: one row per image of an experiment's result.
// Written when the experiment ends; nothing is kept.
//
// Every row has the run's name, number and UUID, the image's place in the result from 1, and what the image
// holds under the names that it has there: frameID, timestampInMilliseconds, tmonDataInC in degrees Celsius,
// and its I and Q samples as dScanI0 to dScanI47 and dScanQ0 to dScanQ47. Whatever else an image holds, and a
// list of more samples, is JSON text in the last column.
#ifndef ZR_HOST_REPORT_IMAGE_TABLE_H
#define ZR_HOST_REPORT_IMAGE_TABLE_H

#include <memory>

#include "host/record/run_listener.h"
#include "host/report/report_form.h"

namespace host {

std::shared_ptr<RunListener> openImagesCsv(ReportSink sink);

}  // namespace host

#endif
