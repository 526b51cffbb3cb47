#include <utility>

#include "devices/recording/replayed.h"

namespace recording {

namespace {

using platform::Value;

constexpr int kNotRecorded = -1;  // a status

class ReplayedDisplay final : public platform::DisplayService {
  public:
    explicit ReplayedDisplay(ScriptRef script) : _script(std::move(script)) {}

    int mainDisplay(platform::DisplayId& display) override {
        const Value answer = _script->take(Operation::MainDisplay, 0, {}, nullptr);
        const platform::List* parts = answer.list();
        if (parts == nullptr || parts->size() != 2) {
            return kNotRecorded;
        }
        const int status = (*parts)[0].asNumber().as<int>();
        if (status == 0) {
            display = (*parts)[1].asNumber().as<platform::DisplayId>();
        }
        return status;
    }
    platform::RegistryObject registryObject(platform::DisplayId display) override {
        return _script->take(Operation::RegistryObject, 0, display, nullptr)
            .asNumber()
            .as<platform::RegistryObject>();
    }

  private:
    const ScriptRef _script;
};

class ReplayedRegistry final : public platform::DeviceRegistry {
  public:
    explicit ReplayedRegistry(ScriptRef script) : _script(std::move(script)) {}

    Value property(platform::RegistryObject object, std::string_view name) override {
        return _script->take(Operation::Property, 0, platform::List{object, name}, nullptr);
    }

  private:
    const ScriptRef _script;
};

}  // namespace

std::shared_ptr<platform::DisplayService> replayDisplay(ScriptRef script) {
    return std::make_shared<ReplayedDisplay>(std::move(script));
}

std::shared_ptr<platform::DeviceRegistry> replayRegistry(ScriptRef script) {
    return std::make_shared<ReplayedRegistry>(std::move(script));
}

}  // namespace recording
