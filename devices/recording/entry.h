// What a recording is made of: entries, in the order in which the recorder learned of them.
//
// Objects of the device have numbers: those that it hands out (a capture device, a stream, a HID manager, a
// sensor) are numbered from 1 as they first come; 0 stands for the services themselves.
#ifndef ZR_DEVICES_RECORDING_ENTRY_H
#define ZR_DEVICES_RECORDING_ENTRY_H

#include <chrono>
#include <cstdint>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "devices/recording/operation.h"
#include "platform/error.h"
#include "platform/media_time.h"
#include "platform/value.h"

namespace recording {

using ObjectId = std::uint32_t;
using Microseconds = std::chrono::microseconds;

// Whose device was recorded, and how. The first entry of every recording.
struct Session {
    std::string device;   // its name
    std::string summary;  // one line
    std::vector<std::pair<std::string, std::string>> facts;
    std::vector<std::string> services;    // those that the device has, as serviceNames() lists them
    std::vector<std::string> parameters;  // as given: "frameCount=30"
    std::string program;                  // name and version
    std::string started;                  // RFC 3339
};

// A run begins.
struct Run {
    std::string name;
    std::uint64_t number = 1;  // among the repetitions of the name
};

// A call of the device that has returned.
struct Call {
    Operation operation = {};
    ObjectId object = 0;
    platform::Value arguments;  // as the table of operations says
    platform::Value result;
    platform::ErrorRef error;  // that the device stored; null for none
};

// When the stream delivered: its starts so far, and whether stop() had been called since the last one.
struct Phase {
    std::uint32_t start = 0;
    bool stopped = false;
};

// A call of a frame handler. The buffer may be null, and its metadata absent or of any kind.
struct Frame {
    ObjectId stream = 0;
    Phase phase;
    platform::MediaTime time;
    bool hasBuffer = true;
    platform::Value metadata;
};

// A call of an event handler.
struct Event {
    ObjectId stream = 0;
    Phase phase;
    platform::MediaTime time;
    std::int32_t code = 0;
    std::int64_t info = 0;
};

// A call of an input report callback; `schedule` counts the sensor's scheduleWithRunLoop().
struct Report {
    ObjectId sensor = 0;
    std::uint32_t schedule = 0;
    std::int64_t reportID = 0;
    std::string data;
    platform::ErrorRef error;
};

// A scheduled sensor took its source away from the run loop, which ended for want of one.
struct Vanished {
    ObjectId sensor = 0;
    std::uint32_t schedule = 0;
};

// Entries were lost here, because they came faster than they could be written.
struct Hole {
    std::uint64_t deliveries = 0;
    std::uint64_t calls = 0;
};

// The recording is complete.
struct End {};

using Content = std::variant<Session, Run, Call, Frame, Event, Report, Vanished, Hole, End>;

struct Entry {
    // On the clock of the computer, since the recording began: when the call was made, the delivery came.
    Microseconds at{0};
    Content content;
};

}  // namespace recording

#endif
