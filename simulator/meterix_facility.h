// The simulated counter-report facility: channels with counts that stand still or rise.
#ifndef ZR_SIMULATOR_METERIX_FACILITY_H
#define ZR_SIMULATOR_METERIX_FACILITY_H

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/welkin/meterix.h"
#include "simulator/fault.h"
#include "simulator/stream_progress.h"

namespace simulator {

struct CounterChannel {
    std::string group;
    std::string subgroup;
    std::string name;
    std::optional<std::uint64_t> count = 0;  // at the start; nothing: the channel has no count

    // What streaming adds to the count.
    double risePerSecond = 0;       // events a second of device time, fractions accumulate
    std::uint64_t riseAtFrame = 0;  // the device's frame at which `riseBy` is added; 0 for never
    std::uint64_t riseBy = 0;
};

struct MeterixProfile {
    std::vector<CounterChannel> channels;
    Fault report = {};          // asking for the simple channels
    Fault firstSnapshot = {};   // the first snapshot since the device was made
    Fault laterSnapshots = {};  // every other
    Fault difference = {};
};

// The counters of a device without faults.
MeterixProfile healthyMeterix();

// Any thread. The difference leaves a count absent when either snapshot lacks it, and counts a
// channel that the baseline does not have from zero.
std::shared_ptr<platform::MeterixFacility> makeMeterixFacility(
    MeterixProfile profile, std::shared_ptr<const StreamProgress> progress);

}  // namespace simulator

#endif
