// Replay: a session that is over, told to a report as if it were happening.
#ifndef ZR_HOST_REPORT_REPLAY_H
#define ZR_HOST_REPORT_REPLAY_H

#include "host/record/run_listener.h"
#include "host/record/run_record.h"

namespace host {

// Calls the listener in the order that run_listener.h describes, on this thread. Each run's log lines come in its
// first step; of repeated runs only the record is told.
void replay(const SessionRecord& session, RunListener& listener);

}  // namespace host

#endif
