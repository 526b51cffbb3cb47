#include <string_view>
#include <utility>

#include "devices/faulty/damage.h"
#include "devices/faulty/decorators.h"

namespace faulty {

namespace {

constexpr Way kStatusWays[] = {Way::WithoutError};
constexpr Way kPropertyWays[] = {Way::AbsentValue, Way::Empty, Way::WrongKind, Way::WrongEntries};
constexpr int kFailedStatus = -1;

class FaultyDisplay final : public platform::DisplayService {
  public:
    FaultyDisplay(std::shared_ptr<DisplayService> inner, InjectorRef injector)
        : _inner(std::move(inner)), _injector(std::move(injector)) {}

    int mainDisplay(platform::DisplayId& display) override {
        const auto strike = _injector->take(StepKind::Call, "mainDisplay", {}, kStatusWays);
        return strike.has_value() ? kFailedStatus : _inner->mainDisplay(display);
    }
    platform::RegistryObject registryObject(platform::DisplayId display) override {
        const auto strike = _injector->take(StepKind::Call, "registryObject", {}, kNoObject);
        return strike.has_value() ? platform::RegistryObject() : _inner->registryObject(display);
    }

  private:
    const std::shared_ptr<DisplayService> _inner;
    const std::shared_ptr<Injector> _injector;
};

class FaultyRegistry final : public platform::DeviceRegistry {
  public:
    FaultyRegistry(std::shared_ptr<DeviceRegistry> inner, InjectorRef injector)
        : _inner(std::move(inner)), _injector(std::move(injector)) {}

    platform::Value property(platform::RegistryObject object, std::string_view name) override {
        return _injector->call(
            "property", name, kPropertyWays, nullptr,
            [&] { return _inner->property(object, name); }, damaged);
    }

  private:
    const std::shared_ptr<DeviceRegistry> _inner;
    const std::shared_ptr<Injector> _injector;
};

}  // namespace

std::shared_ptr<platform::DisplayService> decorateDisplay(
    std::shared_ptr<platform::DisplayService> service, InjectorRef injector) {
    return std::make_shared<FaultyDisplay>(std::move(service), std::move(injector));
}

std::shared_ptr<platform::DeviceRegistry> decorateRegistry(
    std::shared_ptr<platform::DeviceRegistry> registry, InjectorRef injector) {
    return std::make_shared<FaultyRegistry>(std::move(registry), std::move(injector));
}

}  // namespace faulty
