// Work queues without threads, for a fuzz target that links queues.cpp: items wait until the target runs
// them, those of all queues in the order in which they were queued. A delay is noted, and is over at once:
// after() runs all that waits, the delayed item last.
#ifndef ZR_FUZZ_QUEUES_H
#define ZR_FUZZ_QUEUES_H

#include <vector>

namespace fuzz {

// Runs what waits, and what that queues.
void runQueued();

// The delays since the last call, in seconds.
std::vector<double> takeDelays();

}  // namespace fuzz

#endif
