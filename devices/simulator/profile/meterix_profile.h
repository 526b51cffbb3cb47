// The counters that a simulated device publishes, and which calls of their facility fail.
#ifndef ZR_DEVICES_SIMULATOR_PROFILE_METERIX_PROFILE_H
#define ZR_DEVICES_SIMULATOR_PROFILE_METERIX_PROFILE_H

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "devices/simulator/profile/fault.h"

namespace simulator {

struct CounterChannel {
    std::string group;
    std::string subgroup;
    std::string name;
    std::optional<std::uint64_t> count = 0;  // at the start; nothing: the channel has no count

    // What streaming adds to the count.
    double risePerSecond = 0;       // events per second of device time, fractions accumulate
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

}  // namespace simulator

#endif
