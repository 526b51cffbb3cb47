// The counters of a device profile.
#include <string>

#include "devices/simulator/profile/parts.h"
#include "devices/simulator/profile/value_forms.h"

namespace simulator {

namespace {

constexpr JsonKey<CounterChannel> kChannelKeys[] = {
    memberKey<&CounterChannel::group>("group"),
    memberKey<&CounterChannel::subgroup>("subgroup"),
    memberKey<&CounterChannel::count>("count"),
    numberKey<&CounterChannel::risePerSecond, 0, kLargestQuantity>("risePerSecond"),
    memberKey<&CounterChannel::riseAtFrame>("riseAtFrame"),
    memberKey<&CounterChannel::riseBy>("riseBy"),
};

constexpr JsonKey<MeterixProfile> kCounterFaultKeys[] = {
    memberKey<&MeterixProfile::report>("report"),
    memberKey<&MeterixProfile::firstSnapshot>("firstSnapshot"),
    memberKey<&MeterixProfile::laterSnapshots>("laterSnapshots"),
    memberKey<&MeterixProfile::difference>("difference"),
};

constexpr JsonNames<CounterChannel> kChannelNames = {
    "counter channel",
    &CounterChannel::name,
    {"group", "subgroup"},
    [](const JsonNode& /*node*/) { return CounterChannel(); },
};

constexpr JsonKey<MeterixProfile> kCountersKeys[] = {
    groupKey<kCounterFaultKeys>("faults"),
    namedKey<&MeterixProfile::channels, kChannelKeys, kChannelNames>("channels"),
};

}  // namespace

void readCounters(const JsonNode& node, MeterixProfile& counters) {
    input::readObject(node, kCountersKeys, counters);
}

input::Json writeCounters(const MeterixProfile& counters) {
    return input::writeObject(kCountersKeys, counters);
}

}  // namespace simulator
