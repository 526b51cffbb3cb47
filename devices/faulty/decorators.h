// The decorators around a device's services. Each numbers the calls and deliveries that pass through it, and
// makes them fail as the injector says.
#ifndef ZR_DEVICES_FAULTY_DECORATORS_H
#define ZR_DEVICES_FAULTY_DECORATORS_H

#include <memory>

#include "devices/faulty/injector.h"
#include "platform/display.h"
#include "platform/welkin/capture.h"
#include "platform/welkin/hid.h"
#include "platform/welkin/meterix.h"

namespace faulty {

using InjectorRef = std::shared_ptr<Injector>;

// None of the services may be null.
std::shared_ptr<WLISPCapturePlugIn> decorateCapture(std::shared_ptr<WLISPCapturePlugIn> plugIn,
                                                    InjectorRef injector);
std::shared_ptr<platform::MeterixFacility> decorateMeterix(
    std::shared_ptr<platform::MeterixFacility> facility, InjectorRef injector);
std::shared_ptr<platform::HidFacility> decorateHid(std::shared_ptr<platform::HidFacility> facility,
                                                   InjectorRef injector);
std::shared_ptr<platform::DisplayService> decorateDisplay(
    std::shared_ptr<platform::DisplayService> service, InjectorRef injector);
std::shared_ptr<platform::DeviceRegistry> decorateRegistry(
    std::shared_ptr<platform::DeviceRegistry> registry, InjectorRef injector);

}  // namespace faulty

#endif
