#include "devices/simulator/display_service.h"

#include <utility>

namespace simulator {

namespace {

constexpr platform::DisplayId kMainDisplay = 1;
constexpr platform::RegistryObject kMainDisplayObject = 0x51;

class SimulatedDisplays final : public platform::DisplayService {
  public:
    explicit SimulatedDisplays(DisplayProfile profile) : _profile(std::move(profile)) {}

    int mainDisplay(platform::DisplayId& display) override {
        if (_profile.mainDisplayStatus == 0) {
            display = kMainDisplay;
        }
        return _profile.mainDisplayStatus;
    }

    platform::RegistryObject registryObject(platform::DisplayId display) override {
        return display == kMainDisplay && _profile.registryService ? kMainDisplayObject : 0;
    }

  private:
    const DisplayProfile _profile;
};

class SimulatedRegistry final : public platform::DeviceRegistry {
  public:
    explicit SimulatedRegistry(const DisplayProfile& profile) {
        platform::MutableDictionary powerInfo;
        if (profile.powerPanel) {
            powerInfo.set(platform::kDisplayPowerInfoPanel, profile.powered);
        }
        platform::MutableDictionary debugInfo;
        if (profile.powerInfo) {
            debugInfo.set(platform::kDisplayPowerInfo, platform::Dictionary(std::move(powerInfo)));
        }
        if (profile.property) {
            _debugInfo = platform::Dictionary(std::move(debugInfo));
        }
    }

    platform::Value property(platform::RegistryObject object, std::string_view name) override {
        const bool known = object == kMainDisplayObject && name == platform::kDisplayDebugInfo;
        return known ? _debugInfo : platform::Value();
    }

  private:
    platform::Value _debugInfo;
};

}  // namespace

std::shared_ptr<platform::DisplayService> makeDisplayService(const DisplayProfile& profile) {
    return std::make_shared<SimulatedDisplays>(profile);
}

std::shared_ptr<platform::DeviceRegistry> makeDeviceRegistry(const DisplayProfile& profile) {
    return std::make_shared<SimulatedRegistry>(profile);
}

}  // namespace simulator
