#include "devices/faulty/faulty_device.h"

#include <string_view>
#include <utility>

#include "devices/faulty/capture.h"
#include "devices/faulty/display.h"
#include "devices/faulty/hid.h"
#include "devices/faulty/injector.h"
#include "devices/faulty/meterix.h"

namespace faulty {

namespace {

template <class Service, class Faulty>
std::shared_ptr<Service> decorate(std::shared_ptr<Service> service,
                                  std::string_view name,
                                  const std::shared_ptr<Injector>& injector,
                                  Faulty faulty) {
    const bool available =
        service != nullptr && !injector->take(StepKind::Service, name, {}, kNoObject).has_value();
    return available ? faulty(std::move(service), injector) : nullptr;
}

}  // namespace

FaultyDevice::FaultyDevice(const Factory& make, std::vector<Fault> faults)
    : _injector(std::make_shared<Injector>(std::move(faults))), _services(make()) {
    _services.capture = decorate(std::move(_services.capture), "capture", _injector, faultyCapture);
    _services.meterix = decorate(std::move(_services.meterix), "meterix", _injector, faultyMeterix);
    _services.hid = decorate(std::move(_services.hid), "hid", _injector, faultyHid);
    _services.display = decorate(std::move(_services.display), "display", _injector, faultyDisplay);
    _services.registry =
        decorate(std::move(_services.registry), "registry", _injector, faultyRegistry);
}

std::vector<Step> FaultyDevice::steps() const {
    return _injector->steps();
}

std::vector<Strike> FaultyDevice::strikes() const {
    return _injector->strikes();
}

}  // namespace faulty
