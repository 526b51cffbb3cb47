// The texts of `zrlab list` and `zrlab describe`: what the loaded modules offer.
#ifndef ZR_HOST_ZRLAB_DESCRIBE_H
#define ZR_HOST_ZRLAB_DESCRIBE_H

#include <string>
#include <vector>

#include "frame/host_interface.h"

namespace host {

// Every experiment, analysis and diagnostic with its summary.
std::string listText(const ZRLab& lab);

// What each name is for and which parameters it takes. With `limits` also the results and their limits. A
// plug-in does not declare them, so each name is run: once, on the simulated device without faults, as fast
// as it goes, every required parameter 1 and the time-out 30 s. Throws a Problem (kExitUsage) about an
// unknown name. Main thread.
std::string describeText(const ZRLab& lab, const std::vector<std::string>& names, bool limits);

}  // namespace host

#endif
