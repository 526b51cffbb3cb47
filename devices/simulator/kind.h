// The simulator as a kind of device: of the gallery's profiles, and of files.
#ifndef ZR_DEVICES_SIMULATOR_KIND_H
#define ZR_DEVICES_SIMULATOR_KIND_H

#include "devices/device.h"

namespace simulator {

// "simulator". A device is asked for by a name of the gallery or by the file of a profile, see
// devices/simulator/profile/reader.h; "healthy" when nothing is given.
devices::Kind kind();

}  // namespace simulator

#endif
