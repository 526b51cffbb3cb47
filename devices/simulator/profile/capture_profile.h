// What a simulated capture service has, and what it does wrong: every call can fail, with or without
// an error object, and every frame can carry what a broken device would make of it.
#ifndef ZR_DEVICES_SIMULATOR_PROFILE_CAPTURE_PROFILE_H
#define ZR_DEVICES_SIMULATOR_PROFILE_CAPTURE_PROFILE_H

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "devices/simulator/profile/fault.h"
#include "devices/simulator/profile/number_range.h"
#include "platform/string_map.h"
#include "platform/value.h"

namespace simulator {

// What is different about a range of frames. Several may cover one frame: applied in their order.
struct FrameOverride {
    NumberRange frames;
    platform::MutableDictionary set;  // metadata entries added or replaced
    std::vector<std::string> remove;  // metadata entries taken away
    bool noMetadata = false;
    bool metadataIsNoDictionary = false;  // a string in its place
    bool dropped = false;                 // lost: counted by the sensor and never delivered
};

// An event that is delivered right before the frame of that number.
struct FrameEvent {
    std::uint64_t frame = 1;
    std::int32_t code = 0;
    std::int64_t info = 0;
};

// Frames are numbered by the sensor, from 1 at each start.
struct StreamProfile {
    std::string name;               // in a profile
    std::string portType;           // what a client reads
    platform::Value errorCounters;  // what a client reads: a dictionary, complete or not

    platform::MutableDictionary metadata;  // of every frame
    std::vector<std::int32_t>
        lightSources;  // of successive frames, in turn; none: as in `metadata`
    // Metadata numbers that rise exponentially as the module warms up (time constant 60 s of device
    // time); the value is the total rise.
    platform::StringMap<double> warming;
    std::vector<FrameOverride> overrides;
    std::vector<FrameEvent> events;

    double jitterMicroseconds = 0;  // frames come up to this much late, by chance from `seed`
    std::uint64_t seed = 1;
    std::optional<std::uint64_t> stallAfterFrame;  // nothing is delivered after this frame
    std::uint64_t framesAfterStop = 0;             // still delivered once stop() has returned

    Fault control;
    Fault start;
    Fault stop;  // the stream goes on then
    // By property key: reading (the port type, the error counters) or writing it fails.
    platform::StringMap<Fault> propertyFaults;
};

struct CaptureProfile {
    bool plugIn = true;  // whether there is a capture plug-in at all
    Fault device;
    Fault streamList;
    Fault invalidate;  // the device goes on then
    std::vector<StreamProfile> streams;
};

// Three cameras without faults: the rear one, the front one and the front infrared one. Only the
// last has a projector and metadata about it.
CaptureProfile healthyCapture();

}  // namespace simulator

#endif
