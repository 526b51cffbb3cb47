// The numbers of a port description: where they come from. And the event counters, which are numbers with a name.
#ifndef ZR_DEVICES_LINUX_DESCRIPTION_NUMBERS_H
#define ZR_DEVICES_LINUX_DESCRIPTION_NUMBERS_H

#include <string>
#include <vector>

#include "devices/linux/description_keys.h"

namespace linux_device {

// Where a number stands; not every source may stand everywhere.
enum Place : unsigned { InMetadata = 1U, InErrorCounters = 2U, InChannels = 4U };

// Each of these fails about a value that does not fit.
NumberSource numberOf(const Node& node, Place place);
CounterChannel channelOf(const Node& node, const std::string& name);
Control controlOf(const Node& node);
ExtensionUnit extensionUnitOf(const Node& node);

}  // namespace linux_device

#endif
