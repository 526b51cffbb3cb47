// A stored run by its name.
#ifndef ZR_HOST_RESULTS_STORED_RUN_H
#define ZR_HOST_RESULTS_STORED_RUN_H

#include <string>

#include "host/store/store.h"

namespace host {

// The run whose UUID begins with `beginning`, upper case or lower, as the only one of its session. Throws a
// Problem (kExitUsage) when no run or several have such a UUID, and a StoreProblem.
SessionRecord storedRun(Store& store, const std::string& beginning);

}  // namespace host

#endif
