// zrlab conformance: whether a device keeps the promises of the interfaces that it implements.
#ifndef ZR_HOST_ZRLAB_CONFORMANCE_COMMAND_H
#define ZR_HOST_ZRLAB_CONFORMANCE_COMMAND_H

#include "host/zrlab/session_options.h"

namespace host {

// Checks the services of the device that `options` names, those named in `options.names` or else each that the
// device has, and reports as a session does, in every form. Returns the exit status that a session has: kExitFailed
// when a promise is broken. Throws a Problem: kExitUsage about a service that there is none of or that the device
// does not have, and as a session does. Main thread.
int conformanceCommand(const SessionOptions& options);

}  // namespace host

#endif
