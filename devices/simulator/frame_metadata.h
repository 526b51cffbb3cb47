// What a simulated sensor writes into a frame: a function of the stream's profile and the frame.
#ifndef ZR_DEVICES_SIMULATOR_FRAME_METADATA_H
#define ZR_DEVICES_SIMULATOR_FRAME_METADATA_H

#include <cstdint>

#include "devices/simulator/profile/capture_profile.h"
#include "platform/value.h"

namespace simulator {

// Whether the frame is lost on its way.
bool isDropped(const StreamProfile& profile, std::uint64_t frame);

// The frame's metadata, `seconds` of device time after the start; a Value that holds nothing for a
// frame without.
platform::Value frameMetadata(const StreamProfile& profile, std::uint64_t frame, double seconds);

// By how many seconds of device time the frame comes late.
double frameDelay(const StreamProfile& profile, std::uint64_t frame);

}  // namespace simulator

#endif
