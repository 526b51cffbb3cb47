// The display service and the device registry, with faults.
#ifndef ZR_DEVICES_FAULTY_DISPLAY_H
#define ZR_DEVICES_FAULTY_DISPLAY_H

#include <memory>

#include "devices/faulty/injector.h"
#include "platform/display.h"

namespace faulty {

std::shared_ptr<platform::DisplayService> faultyDisplay(
    std::shared_ptr<platform::DisplayService> service, std::shared_ptr<Injector> injector);

std::shared_ptr<platform::DeviceRegistry> faultyRegistry(
    std::shared_ptr<platform::DeviceRegistry> registry, std::shared_ptr<Injector> injector);

}  // namespace faulty

#endif
