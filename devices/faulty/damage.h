// Values as a broken device would return them.
#ifndef ZR_DEVICES_FAULTY_DAMAGE_H
#define ZR_DEVICES_FAULTY_DAMAGE_H

#include "devices/faulty/fault.h"
#include "platform/value.h"

namespace faulty {

// The value, damaged in one of the ways AbsentValue, Empty, WrongKind and WrongEntries. Only a dictionary
// has entries: another value keeps what it is then.
platform::Value damaged(const platform::Value& value, Way way);

}  // namespace faulty

#endif
