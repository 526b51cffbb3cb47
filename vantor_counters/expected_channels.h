// The counter channels that the projector module is expected to publish. Both analyses check them.
#ifndef ZR_VANTOR_COUNTERS_EXPECTED_CHANNELS_H
#define ZR_VANTOR_COUNTERS_EXPECTED_CHANNELS_H

#include <array>
#include <string_view>

// Sixty distinct names: 40 of the Xel family, 10 of the MB family, 8 of the YB family and two
// temperature sensors.
extern const std::array<std::string_view, 60> kVantorCounterChannelNames;

#endif
