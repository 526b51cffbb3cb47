#include "devices/linux/display.h"

#include <utility>

#include "devices/linux/device_log.h"
#include "devices/linux/system_problem.h"
#include "platform/text_format.h"

namespace linux_device {

namespace {

constexpr platform::DisplayId kMainDisplay = 1;
constexpr platform::RegistryObject kMainDisplayObject = 1;

class LinuxDisplays final : public platform::DisplayService {
  public:
    LinuxDisplays(DisplayDescription display, Machine machine)
        : _display(std::move(display)), _machine(std::move(machine)) {}

    int mainDisplay(platform::DisplayId& display) override {
        const int status = _look();
        if (status == 0) {
            display = kMainDisplay;
        }
        return status;
    }

    platform::RegistryObject registryObject(platform::DisplayId display) override {
        return display == kMainDisplay && _look() == 0 ? kMainDisplayObject : 0;
    }

  private:
    int _look() const {
        try {
            connectorFolder(_display, _machine);
            return 0;
        } catch (const SystemProblem& problem) {
            logProblem(std::string("display: ") + problem.what());
            return problem.code();
        }
    }

    const DisplayDescription _display;
    const Machine _machine;
};

class LinuxRegistry final : public platform::DeviceRegistry {
  public:
    LinuxRegistry(DisplayDescription display, Machine machine)
        : _display(std::move(display)), _machine(std::move(machine)) {}

    platform::Value property(platform::RegistryObject object, std::string_view name) override {
        if (object != kMainDisplayObject || name != platform::kDisplayDebugInfo) {
            return {};
        }
        std::string folder;
        platform::MutableDictionary info;
        try {
            folder = connectorFolder(_display, _machine);
            info.set(platform::kDisplayPowerInfoPanel, _isPowered(folder));
        } catch (const SystemProblem& problem) {
            logProblem(std::string("display: ") + problem.what());
            if (folder.empty()) {
                return {};
            }
        }
        return platform::Dictionary{
            {platform::kDisplayPowerInfo, platform::Dictionary(std::move(info))}};
    }

  private:
    bool _isPowered(const std::string& folder) const {
        bool isPowered = true;
        for (const auto& [file, content] : _display.on) {
            const std::string path = platform::format("%@/%@", folder, file);
            const std::string is = _machine.readLine(path);
            if (is != content) {
                logProblem(platform::format(R"(display: %@ is "%@", not "%@")", path, is, content));
                isPowered = false;
            }
        }
        return isPowered;
    }

    const DisplayDescription _display;
    const Machine _machine;
};

}  // namespace

std::string connectorFolder(const DisplayDescription& display, const Machine& machine) {
    return machine.find({.path = "/sys/class/drm/" + display.connector});
}

std::shared_ptr<platform::DisplayService> makeDisplayService(const DisplayDescription& display,
                                                             const Machine& machine) {
    return std::make_shared<LinuxDisplays>(display, machine);
}

std::shared_ptr<platform::DeviceRegistry> makeDeviceRegistry(const DisplayDescription& display,
                                                             const Machine& machine) {
    return std::make_shared<LinuxRegistry>(display, machine);
}

}  // namespace linux_device
