// What a client passes to the counter reports and the sensors, and what it gets from them, as values.
#ifndef ZR_DEVICES_RECORDING_ARGUMENT_VALUES_H
#define ZR_DEVICES_RECORDING_ARGUMENT_VALUES_H

#include <cstddef>
#include <memory>
#include <span>
#include <string>
#include <vector>

#include "platform/value.h"
#include "platform/welkin/meterix.h"

namespace recording {

// A list of channels, each [group, subgroup, name]; absent for null.
platform::Value channelsValue(const platform::MeterixChannels& channels);
// Null for what is not such a list.
std::shared_ptr<const platform::MeterixChannels> channelsOf(const platform::Value& value);

// A list of samples, each [channel, count].
platform::Value samplesValue(const platform::MeterixSamples& samples);
std::shared_ptr<const platform::MeterixSamples> samplesOf(const platform::Value& value);

// The counts alone.
platform::Value countsValue(const platform::MeterixSamples& samples);

platform::Value dictionariesValue(const std::vector<platform::Dictionary>& dictionaries);

std::string bytesText(std::span<const std::byte> data);

}  // namespace recording

#endif
