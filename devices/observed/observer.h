// Observer: sees what the simulated device does while it does it.
#ifndef ZR_DEVICES_OBSERVED_OBSERVER_H
#define ZR_DEVICES_OBSERVED_OBSERVER_H

#include <chrono>
#include <cstdint>
#include <string_view>

#include "platform/media_time.h"
#include "platform/value.h"

namespace observed {

// A frame that was handed to a stream's frame handler.
struct DeliveredFrame {
    std::uint64_t number;  // 1 for the first frame since the stream was started
    platform::MediaTime time;
    std::chrono::steady_clock::time_point delivered;
    platform::Dictionary metadata;  // empty when the frame carried none
};

// Called on the device's threads, several at once; must return soon.
class Observer {
  public:
    virtual ~Observer() = default;
    virtual void frameDelivered(const DeliveredFrame& /*frame*/) {}
    // An image report reached its callback; 1 for the first since the sensor was opened.
    virtual void imageDelivered(std::uint64_t /*number*/) {}
    // The device's user broke the rules of an interface, in one line.
    virtual void misused(std::string_view /*what*/) {}
};

}  // namespace observed

#endif
