// The decorator around the HID bus.
#ifndef ZR_DEVICES_OBSERVED_HID_H
#define ZR_DEVICES_OBSERVED_HID_H

#include <memory>

#include "devices/observed/reporter.h"
#include "platform/welkin/hid.h"

namespace observed {

// Reports each image report, the errors of every call and of input reports, and these broken rules:
//
//   The client   a device opened twice
//                a device scheduled, or sent a feature report, while it is not open
//                a feature report whose data does not begin with its ID
//                a scheduled device used on another thread than its run loop's; dropping it is free
//   The device   the report callback called on another thread than the run loop's (once per device)
//
// After a failed close() its state counts as unknown, and the rules about being open are not checked. A run loop that is gone binds a
// device to no thread. A matched device has one wrapper while that is held, and what is known
// of it lasts as long as the device. No lock is held while the device, a callback or the observer is
// called.
//
// Null for a null facility.
std::shared_ptr<platform::HidFacility> observeHid(std::shared_ptr<platform::HidFacility> facility,
                                                  const Reporter& reporter);

}  // namespace observed

#endif
