// The frames of a session as a table for other programs: one row per delivered frame and per event of its
// stream, in the order in which they came. Written as they come; nothing is kept.
//
// Every row has the run's name, number and UUID; kind, "frame" or "event"; time, the UTC of its delivery, and
// delivered, the same in seconds since the run began; presentation, in seconds on the device's clock. A frame
// has its number as received, how many frames the sensor counted and lost before it, and all of its metadata;
// an event has its code and info.
//
// In CSV the columns are the same for every device: the known metadata entries have one each (kFrameColumns),
// and what else a frame carries is JSON text in the last one. In JSON lines each frame has its metadata as it
// is. Numbers are exact: host/report/csv.h and host/report/json_value.h say how they are written.
#ifndef ZR_HOST_REPORT_FRAME_TABLE_H
#define ZR_HOST_REPORT_FRAME_TABLE_H

#include <memory>

#include "host/record/run_listener.h"
#include "host/report/report_form.h"

namespace host {

std::shared_ptr<RunListener> openFramesCsv(ReportSink sink);
std::shared_ptr<RunListener> openFramesJsonl(ReportSink sink);

}  // namespace host

#endif
