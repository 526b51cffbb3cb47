// The display of a simulated device.
#ifndef ZR_DEVICES_SIMULATOR_PROFILE_DISPLAY_PROFILE_H
#define ZR_DEVICES_SIMULATOR_PROFILE_DISPLAY_PROFILE_H

#include "platform/value.h"

namespace simulator {

// A display that is on, and what can be wrong on the way to its power state.
struct DisplayProfile {
    int mainDisplayStatus = 0;       // other than 0: there is no main display
    bool registryService = true;     // whether the display has a registry object
    bool property = true;            // whether the object has the debug property
    bool powerInfo = true;           // whether the property has the entry "Quorm power info"
    bool powerPanel = true;          // whether that has the entry "Quorm power info panel"
    platform::Value powered = true;  // of that entry: a display that is on has a true number
};

}  // namespace simulator

#endif
