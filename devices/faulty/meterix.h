// The counter reports, with faults.
#ifndef ZR_DEVICES_FAULTY_METERIX_H
#define ZR_DEVICES_FAULTY_METERIX_H

#include <memory>

#include "devices/faulty/injector.h"
#include "platform/welkin/meterix.h"

namespace faulty {

std::shared_ptr<platform::MeterixFacility> faultyMeterix(
    std::shared_ptr<platform::MeterixFacility> facility, std::shared_ptr<Injector> injector);

}  // namespace faulty

#endif
