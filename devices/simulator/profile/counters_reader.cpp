// The counters of a device profile.
#include <string>

#include "devices/simulator/profile/part_readers.h"
#include "devices/simulator/profile/value_readers.h"

namespace simulator {

namespace {

constexpr JsonKey<CounterChannel> kChannelKeys[] = {
    {"group", readMember<&CounterChannel::group>},
    {"subgroup", readMember<&CounterChannel::subgroup>},
    {"count", readMember<&CounterChannel::count>},
    {"risePerSecond",
     [](const JsonNode& node, CounterChannel& channel) {
         channel.risePerSecond = node.asDouble(0, kLargestQuantity);
     }},
    {"riseAtFrame", readMember<&CounterChannel::riseAtFrame>},
    {"riseBy", readMember<&CounterChannel::riseBy>},
};

constexpr JsonKey<MeterixProfile> kCounterFaultKeys[] = {
    {"report", readMember<&MeterixProfile::report>},
    {"firstSnapshot", readMember<&MeterixProfile::firstSnapshot>},
    {"laterSnapshots", readMember<&MeterixProfile::laterSnapshots>},
    {"difference", readMember<&MeterixProfile::difference>},
};

constexpr JsonKey<MeterixProfile> kCountersKeys[] = {
    {"faults", [](const JsonNode& node,
                  MeterixProfile& counters) { readObject(node, kCounterFaultKeys, counters); }},
    {"channels",
     [](const JsonNode& node, MeterixProfile& counters) {
         readNamed(
             node, kChannelKeys, counters.channels, "counter channel", {"group", "subgroup"},
             [](const CounterChannel& channel) { return channel.name; },
             [](const std::string& name, const JsonNode& /*node*/) {
                 CounterChannel channel;
                 channel.name = name;
                 return channel;
             });
     }},
};

}  // namespace

void readCounters(const JsonNode& node, MeterixProfile& counters) {
    readObject(node, kCountersKeys, counters);
}

}  // namespace simulator
