// The four parts of a device profile. Each changes what its object names in what the device has so
// far, and throws a input::DocumentProblem about the first thing that is wrong.
#ifndef ZR_DEVICES_SIMULATOR_PROFILE_PART_READERS_H
#define ZR_DEVICES_SIMULATOR_PROFILE_PART_READERS_H

#include "devices/simulator/profile/device_profile.h"
#include "input/json_reader.h"

namespace simulator {

void readCapture(const input::JsonNode& node, CaptureProfile& capture);
void readCounters(const input::JsonNode& node, MeterixProfile& counters);
void readHid(const input::JsonNode& node, HidProfile& hid);
void readDisplay(const input::JsonNode& node, DisplayProfile& display);

}  // namespace simulator

#endif
