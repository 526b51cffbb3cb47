// What can fail about a device, where and how: its steps, and the faults that they can have.
#ifndef ZR_DEVICES_FAULTY_FAULT_H
#define ZR_DEVICES_FAULTY_FAULT_H

#include <cstdint>
#include <span>
#include <string>
#include <string_view>

#include "platform/error.h"

namespace faulty {

// The domain of the errors that faults report. The code is the number of the step, the description the
// sentence of Step::text(): "5th call: setValue MinimumFrameRate fails with an error object".
inline constexpr std::string_view kErrorDomain = "faulty";

enum class StepKind : std::uint8_t {
    Service,  // a service that the device has
    Call,     // a call of the device by its client
    Frame,    // a call of a frame handler by the device
    Event,    // a call of an event handler
    Report,   // a call of an input report callback
};

// How a step fails. Step::ways names those that the step has. Of the calls that fail, only those reach the
// device whose result is a damaged one of the device's.
//
//   way           what it does                                          to which steps
//   WithError     fails, and stores an error object if there is a slot  calls with a slot; reports
//   WithoutError  fails, and stores none                                calls with a slot; mainDisplay()
//   AbsentObject  null; of streams(), as many nulls as there are        services, objects, frames
//                 streams
//   AbsentValue   no value; samples without counts; no metadata         registry property, samples, frames
//   Empty         a list, a dictionary or data without contents         lists, dictionaries, frames, reports
//   WrongKind     a value of another kind; a report of another ID       values, frames, reports
//   WrongEntries  a dictionary whose entries are of another kind        dictionaries, frames
//   Lost          no effect                                             calls without a result, deliveries
enum class Way : std::uint8_t {
    WithError,
    WithoutError,
    AbsentObject,
    AbsentValue,
    Empty,
    WrongKind,
    WrongEntries,
    Lost,
};

// A step by its number among those of its kind; 1 for the first.
struct Place {
    StepKind kind = StepKind::Call;
    std::uint64_t number = 1;

    friend bool operator==(const Place& a, const Place& b) = default;
};

// A step that was taken.
struct Step {
    Place place = {};
    std::string operation = {};      // "setValue MinimumFrameRate"; empty for a delivery
    std::span<const Way> ways = {};  // in which it can fail; valid for good

    // "5th call: setValue MinimumFrameRate", "2nd frame".
    std::string text() const;
    // The same with the way: "5th call: setValue MinimumFrameRate fails with an error object".
    std::string text(Way way) const;
};

// A step that is to fail.
struct Fault {
    Place place = {};
    Way way = Way::WithError;

    friend bool operator==(const Fault& a, const Fault& b) = default;
};

// A fault whose step was taken.
struct Strike {
    Fault fault;
    std::string text;          // Step::text() with the way
    platform::ErrorRef error;  // what the step reports; null unless the way is WithError
};

}  // namespace faulty

#endif
