// Observer: receives reports of what a device delivers and of broken rules of its interfaces.
#ifndef ZR_DEVICES_OBSERVED_OBSERVER_H
#define ZR_DEVICES_OBSERVED_OBSERVER_H

#include <chrono>
#include <cstdint>
#include <string_view>

#include "platform/error.h"
#include "platform/media_time.h"
#include "platform/value.h"
#include "platform/welkin/meterix.h"

namespace observed {

// A frame that was handed to a stream's frame handler.
struct DeliveredFrame {
    // The frames that reached the client's handler since start(), this one included: 1 for the first.
    // Not the sensor's number, which also counts the frames that were lost on the way.
    std::uint64_t number;
    platform::MediaTime time;                         // when it was taken: its presentation time
    std::chrono::steady_clock::time_point delivered;  // when the device called the handler
    platform::Dictionary metadata;                    // empty when the frame carried none
};

// An event that was handed to a stream's event handler.
struct DeliveredEvent {
    std::int32_t code;
    platform::MediaTime time;
    std::int64_t info;
    std::chrono::steady_clock::time_point delivered;  // when the device called the handler
};

// Threads  Any, several at once: frames, events and images come on the thread that the device
//          delivers on, after the client's handler or callback has returned; everything else comes on
//          the thread that called the device, inside that call. The client may hold locks of its own
//          meanwhile, so an observer returns soon and calls neither the device nor its client.
class Observer {
  public:
    virtual ~Observer() = default;

    virtual void frameDelivered(const DeliveredFrame& /*frame*/) {}
    virtual void eventDelivered(const DeliveredEvent& /*event*/) {}

    // An input report that can hold an image, ID 118 and at least 792 bytes, was handed to the report
    // callback. `number` is 1 for the first one since the sensor was opened.
    virtual void imageDelivered(std::uint64_t /*number*/) {}

    // A snapshot of counters was taken, one sample per channel.
    virtual void countersSampled(const platform::MeterixSamples& /*samples*/) {}

    // A call stored an error object, also when its caller passed no slot for it; or an input report
    // brought one. `call` names the operation, and the property if there is one: "start()", "setValue()
    // of ryl.stream.format-index", "input report". `error` is never null.
    virtual void errorReported(std::string_view /*call*/, const platform::ErrorRef& /*error*/) {}

    // The device or its client broke a rule of an interface: one line that names the operation.
    virtual void misused(std::string_view /*what*/) {}
};

}  // namespace observed

#endif
