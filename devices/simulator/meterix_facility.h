// The simulated counter-report facility: channels with counts that stand still or rise.
#ifndef ZR_DEVICES_SIMULATOR_METERIX_FACILITY_H
#define ZR_DEVICES_SIMULATOR_METERIX_FACILITY_H

#include <memory>

#include "devices/simulator/profile/meterix_profile.h"
#include "devices/simulator/stream_progress.h"
#include "platform/welkin/meterix.h"

namespace simulator {

// Any thread. The difference leaves a count absent when either snapshot lacks it, and counts a
// channel that the baseline does not have from zero.
std::shared_ptr<platform::MeterixFacility> makeMeterixFacility(
    MeterixProfile profile, std::shared_ptr<const StreamProgress> progress);

}  // namespace simulator

#endif
