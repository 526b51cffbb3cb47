// A session: one call of `zrlab run`, from its options to its reports.
#ifndef ZR_HOST_ZRLAB_SESSION_H
#define ZR_HOST_ZRLAB_SESSION_H

#include "host/record/run_record.h"
#include "host/zrlab/session_options.h"

namespace host {

// Runs the session with the loaded modules and returns the exit status. What cannot work (a name, a
// parameter, a device, a file that cannot be written) is a Problem that is thrown before anything runs.
int runSession(const SessionOptions& options);

// The exit status for a verdict other than Interrupted, whose status interrupt::exitStatus() knows.
int exitStatusOf(Verdict verdict);

}  // namespace host

#endif
