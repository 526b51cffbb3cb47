// The decorator around a device: every call and delivery passes through it, and an observer learns what the
// device delivers and which rules of its interfaces the device or its client breaks.
#ifndef ZR_DEVICES_OBSERVED_OBSERVE_H
#define ZR_DEVICES_OBSERVED_OBSERVE_H

#include <memory>

#include "devices/observed/observer.h"
#include "platform/services.h"

namespace observed {

// The device's services, observed: the capture service, the counter reports and the HID bus. The
// display and the registry are returned as they are. A null service stays null. Observed services can
// be observed again. A handler or callback runs, and is reported, under the run tag of the thread that
// gave it to the device (platform/run_tag.h).
//
// A broken rule is reported, and the call goes on to the device all the same: whether it is refused is
// up to the device. Reports end when the observer goes; the services work on without it.
platform::Services observe(platform::Services device, std::weak_ptr<Observer> observer);

}  // namespace observed

#endif
