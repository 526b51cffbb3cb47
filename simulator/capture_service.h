// The simulated capture service: a device with camera streams that deliver frames and events on
// threads of their own, at the configured rate or as fast as they are taken.
//
// What it does wrong is data: every call can fail, with or without an error object, and every frame
// can carry what a broken device would make of it.
#ifndef ZR_SIMULATOR_CAPTURE_SERVICE_H
#define ZR_SIMULATOR_CAPTURE_SERVICE_H

#include <cstddef>
#include <cstdint>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/string_map.h"
#include "platform/value.h"
#include "platform/welkin/capture.h"
#include "simulator/fault.h"
#include "simulator/observer.h"
#include "simulator/stream_progress.h"

namespace simulator {

// What is different about a range of frames. Several may cover one frame: applied in their order.
struct FrameOverride {
    std::uint64_t firstFrame = 1;
    std::uint64_t lastFrame = std::numeric_limits<std::uint64_t>::max();  // the last one covered
    platform::MutableDictionary set;  // metadata entries added or replaced
    std::vector<std::string> remove;  // metadata entries taken away
    bool noMetadata = false;
    bool metadataIsNoDictionary = false;  // a string in its place
    bool dropped = false;                 // lost: counted by the sensor and never delivered
};

// An event that is told right before the frame of that number.
struct FrameEvent {
    std::uint64_t frame = 1;
    std::int32_t code = 0;
    std::int64_t info = 0;
};

// Frames are numbered by the sensor, from 1 at each start.
struct StreamProfile {
    std::string portType;
    platform::Value errorCounters;  // what a client reads: a dictionary, complete or not

    platform::MutableDictionary metadata;  // of every frame
    std::vector<std::int32_t>
        lightSources;  // of successive frames, in turn; none: as in `metadata`
    // Metadata numbers that rise while the module warms up, and by how much in the end. Two thirds
    // of the way take a minute of device time.
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

// The plug-in as makeCapturePlugIn makes it, for whoever wants to look inside.
class SimulatedCapture : public WLISPCapturePlugIn {
  public:
    // Image buffers, over all devices and streams, that somebody still holds. Any thread.
    virtual std::size_t liveBuffers() const = 0;
};

// The plug-in of such a device; null when the profile has none.
//
// Each call of its device() is another client's connection: its streams, their settings and their
// deliveries are its own. Dropping the device ends them too.
//
// `speed`: device time a second of real time. 0, infinity or NaN deliver frames as fast as they are
// taken. A stream has 16 image buffers, in every case: with all of them held it waits for one.
// `progress` counts the frames and the device time of all streams.
//
// The observer is told each frame, after its handler returned, and each misuse:
//   - a property written, or a stream started, without control of the stream
//   - a stream started without a frame handler or a second time, stopped while it does not run
//   - a device or a stream used after the device was invalidated
//   - no buffer given back for five seconds, or one still held a second after the plug-in went
std::shared_ptr<WLISPCapturePlugIn> makeCapturePlugIn(CaptureProfile profile,
                                                      double speed,
                                                      std::shared_ptr<StreamProgress> progress,
                                                      std::weak_ptr<Observer> observer);

}  // namespace simulator

#endif
