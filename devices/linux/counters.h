// Event counters in files of the machine.
#ifndef ZR_DEVICES_LINUX_COUNTERS_H
#define ZR_DEVICES_LINUX_COUNTERS_H

#include <atomic>
#include <cstdint>
#include <memory>
#include <vector>

#include "devices/linux/description.h"
#include "devices/linux/machine.h"
#include "platform/welkin/meterix.h"

namespace linux_device {

// How often the device's cameras have started a stream. Atomic: counters are read on any thread.
using StreamStarts = std::atomic<std::uint64_t>;

// A channel has no count while its file or the number in it is missing; the log says so once. A channel whose
// count is declared to restart goes on from the last one that was read, so that a difference is what was counted.
// difference() fails, with an error that names the channel, when a count is lower than the baseline's or when one
// of the two is missing: as zero it would pass for a counter that did not move.
std::shared_ptr<platform::MeterixFacility> makeMeterixFacility(
    std::vector<CounterChannel> channels,
    const Machine& machine,
    std::shared_ptr<const StreamStarts> starts);

}  // namespace linux_device

#endif
