// The HID bus, with faults.
#ifndef ZR_DEVICES_FAULTY_HID_H
#define ZR_DEVICES_FAULTY_HID_H

#include <memory>

#include "devices/faulty/injector.h"
#include "platform/welkin/hid.h"

namespace faulty {

std::shared_ptr<platform::HidFacility> faultyHid(std::shared_ptr<platform::HidFacility> facility,
                                                 std::shared_ptr<Injector> injector);

}  // namespace faulty

#endif
