// The four parts of a device profile. Each changes what its object names in what the device has so
// far, and throws a DocumentProblem about the first thing that is wrong.
#ifndef ZR_SIMULATOR_PROFILE_PARTS_H
#define ZR_SIMULATOR_PROFILE_PARTS_H

#include "simulator/device.h"
#include "simulator/json_reader.h"

namespace simulator {

void readCapture(const JsonNode& node, CaptureProfile& capture);
void readCounters(const JsonNode& node, MeterixProfile& counters);
void readHid(const JsonNode& node, HidProfile& hid);
void readDisplay(const JsonNode& node, DisplayProfile& display);

}  // namespace simulator

#endif
