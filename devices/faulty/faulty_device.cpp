#include "devices/faulty/faulty_device.h"

#include <string_view>
#include <utility>

#include "devices/faulty/decorators.h"

namespace faulty {

namespace {

template <class Service, class Decorate>
std::shared_ptr<Service> decorated(std::shared_ptr<Service> service,
                                   std::string_view name,
                                   const InjectorRef& injector,
                                   Decorate decorate) {
    const bool available =
        service != nullptr && !injector->take(StepKind::Service, name, {}, kNoObject).has_value();
    return available ? decorate(std::move(service), injector) : nullptr;
}

}  // namespace

FaultyDevice::FaultyDevice(const Factory& make, std::vector<Fault> faults)
    : _injector(std::make_shared<Injector>(std::move(faults))), _services(make()) {
    _services.capture =
        decorated(std::move(_services.capture), "capture", _injector, decorateCapture);
    _services.meterix =
        decorated(std::move(_services.meterix), "meterix", _injector, decorateMeterix);
    _services.hid = decorated(std::move(_services.hid), "hid", _injector, decorateHid);
    _services.display =
        decorated(std::move(_services.display), "display", _injector, decorateDisplay);
    _services.registry =
        decorated(std::move(_services.registry), "registry", _injector, decorateRegistry);
}

std::vector<Step> FaultyDevice::steps() const {
    return _injector->steps();
}

std::vector<Strike> FaultyDevice::strikes() const {
    return _injector->strikes();
}

}  // namespace faulty
