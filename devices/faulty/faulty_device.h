// FaultyDevice: any device, with faults at chosen steps. It shows what a client does when a device fails:
// run the client once without faults, then once for each step of that run and each way in which the step
// can fail.
//
//     const faulty::FaultyDevice healthy(makeServices);
//     run(healthy.services());
//     for (const faulty::Step& step : healthy.steps()) {
//         for (const faulty::Way way : step.ways) {
//             const faulty::FaultyDevice device(makeServices, {{step.place, way}});
//             run(device.services());
//             check(step.text(way), device.strikes());
//         }
//     }
//
// A step is a service, a call of the client's, or a delivery of the device's: a frame, an event, an input
// report. Each kind is numbered on its own. What is not made to fail passes through unchanged.
//
// The numbers of one run are those of the next as long as the client makes one call at a time, in an order
// of its own that no race decides, and one stream or sensor delivers: a call is numbered when it is made, a
// delivery when the device makes it. The number of deliveries may differ: frames that the device sends while
// it is being stopped are numbered too. A fault whose step is not reached does not strike.
#ifndef ZR_DEVICES_FAULTY_FAULTY_DEVICE_H
#define ZR_DEVICES_FAULTY_FAULTY_DEVICE_H

#include <cstddef>
#include <functional>
#include <memory>
#include <vector>

#include "devices/faulty/fault.h"
#include "platform/services.h"

namespace faulty {

class Injector;

// Owner    Its maker. Its services, and the streams and sensors that a client got from them, work on
//          without it; they share the count of steps.
// Threads  Any. No lock is held while the device, a handler or a callback is called.
class FaultyDevice {
  public:
    // Makes a device with its state as at the start; a service that it leaves null counts as not
    // available, and is not a step.
    using Factory = std::function<platform::Services()>;

    // The steps of each kind that steps() has at most; later ones are counted and can fail as well.
    static constexpr std::size_t kMostSteps = 10'000;

    // Makes a device, and calls the factory no more. A fault in a way in which its step cannot fail does
    // not strike. Of several for one step the first strikes.
    explicit FaultyDevice(const Factory& make, std::vector<Fault> faults = {});

    const platform::Services& services() const { return _services; }

    // The steps that were taken so far: the services, then the calls, frames, events and reports, each in
    // the order of their numbers.
    std::vector<Step> steps() const;

    // The faults that struck so far, in their order.
    std::vector<Strike> strikes() const;

    // Expires once this object is gone and everything that came from it: services, devices, streams,
    // managers, sensors, and the handlers and callbacks that were given to them. So it shows what a client
    // left behind.
    std::weak_ptr<const void> lifetime() const { return _injector; }

  private:
    std::shared_ptr<Injector> _injector;
    platform::Services _services;
};

}  // namespace faulty

#endif
