// The simulated HID devices: a Kirra sensor that sends image reports, among others.
#ifndef ZR_DEVICES_SIMULATOR_HID_SENSOR_H
#define ZR_DEVICES_SIMULATOR_HID_SENSOR_H

#include <memory>

#include "devices/simulator/profile/hid_profile.h"
#include "platform/welkin/hid.h"

namespace simulator {

// Each enumeration makes device objects of its own: they start from their profiles.
//
// `speed`: simulated seconds per real second. 0, infinity or NaN make reports as fast as they are
// consumed. A sensor's thread makes them from when it is scheduled, open and in its modes until it is
// unscheduled; 64 of them wait for the run loop at most, and one is delivered at a turn of it.
//
// Refused, besides what the profile makes fail: a device opened twice, or scheduled or sent a feature
// report while it is not open, and a feature report whose data does not begin with its ID.
std::shared_ptr<platform::HidFacility> makeHidFacility(HidProfile profile, double speed);

}  // namespace simulator

#endif
