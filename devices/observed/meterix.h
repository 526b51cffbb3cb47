// The decorator around the counter reports.
#ifndef ZR_DEVICES_OBSERVED_METERIX_H
#define ZR_DEVICES_OBSERVED_METERIX_H

#include <memory>

#include "devices/observed/reporter.h"
#include "platform/welkin/meterix.h"

namespace observed {

// Reports each snapshot and the facility's errors, and as a broken rule a snapshot that does not have
// one sample per channel. Null for a null facility.
std::shared_ptr<platform::MeterixFacility> observeMeterix(
    std::shared_ptr<platform::MeterixFacility> facility, const Reporter& reporter);

}  // namespace observed

#endif
