// The simulated HID devices: a Kirra sensor that sends image reports, among others.
#ifndef ZR_DEVICES_SIMULATOR_HID_SENSOR_H
#define ZR_DEVICES_SIMULATOR_HID_SENSOR_H

#include <memory>

#include "devices/observed/observer.h"
#include "devices/simulator/profile/hid_profile.h"
#include "platform/welkin/hid.h"

namespace simulator {

// Each enumeration makes device objects of its own: they start from their profiles.
//
// `speed`: device time a second of real time. 0, infinity or NaN make reports as fast as they are
// consumed. A sensor's thread makes them from when it is scheduled, open and in its modes until it is
// unscheduled; 64 of them wait for the run loop at most, and one is delivered at a turn of it.
//
// The observer is told each image report (ID 118 and long enough for an image), after its callback
// returned, and each misuse:
//   - a device opened twice, or scheduled or sent a feature report while it is not open
//   - a feature report whose data does not begin with its ID
//   - a scheduled device used on another thread than its run loop's; letting go of it is free
std::shared_ptr<platform::HidFacility> makeHidFacility(HidProfile profile,
                                                       double speed,
                                                       std::weak_ptr<observed::Observer> observer);

}  // namespace simulator

#endif
