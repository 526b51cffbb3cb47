// A device profile and its four parts as JSON. Reading changes what the part's object names in what the device
// has so far, and appends what is wrong to the document's problems, or throws an input::DocumentProblem when
// the part is not an object. Writing names everything, so that what is written describes the part on its own.
#ifndef ZR_DEVICES_SIMULATOR_PROFILE_PARTS_H
#define ZR_DEVICES_SIMULATOR_PROFILE_PARTS_H

#include "devices/simulator/profile/device_profile.h"
#include "input/json_reader.h"

namespace simulator {

void readProfile(const input::JsonNode& node, DeviceProfile& device);
void readCapture(const input::JsonNode& node, CaptureProfile& capture);
void readCounters(const input::JsonNode& node, MeterixProfile& counters);
void readHid(const input::JsonNode& node, HidProfile& hid);
void readDisplay(const input::JsonNode& node, DisplayProfile& display);

input::Json writeProfile(const DeviceProfile& device);
input::Json writeCapture(const CaptureProfile& capture);
input::Json writeCounters(const MeterixProfile& counters);
input::Json writeHid(const HidProfile& hid);
input::Json writeDisplay(const DisplayProfile& display);

}  // namespace simulator

#endif
