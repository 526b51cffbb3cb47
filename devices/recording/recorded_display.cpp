#include <utility>

#include "devices/recording/recorded.h"

namespace recording {

namespace {

using platform::ErrorSlot;
using platform::Value;

class RecordedDisplay final : public platform::DisplayService {
  public:
    RecordedDisplay(std::shared_ptr<DisplayService> inner, RecorderRef recorder)
        : _inner(std::move(inner)), _recorder(std::move(recorder)) {}

    int mainDisplay(platform::DisplayId& display) override {
        return _recorder->call(
            Operation::MainDisplay, 0, {}, nullptr,
            [&](ErrorSlot /*slot*/) { return _inner->mainDisplay(display); },
            [&](int status) {
                return platform::List{status, status == 0 ? Value(display) : Value()};
            });
    }
    platform::RegistryObject registryObject(platform::DisplayId display) override {
        return _recorder->call(Operation::RegistryObject, 0, display, nullptr,
                               [&](ErrorSlot /*slot*/) { return _inner->registryObject(display); });
    }

  private:
    const std::shared_ptr<DisplayService> _inner;
    const RecorderRef _recorder;
};

class RecordedRegistry final : public platform::DeviceRegistry {
  public:
    RecordedRegistry(std::shared_ptr<DeviceRegistry> inner, RecorderRef recorder)
        : _inner(std::move(inner)), _recorder(std::move(recorder)) {}

    Value property(platform::RegistryObject object, std::string_view name) override {
        return _recorder->call(Operation::Property, 0, platform::List{object, name}, nullptr,
                               [&](ErrorSlot /*slot*/) { return _inner->property(object, name); });
    }

  private:
    const std::shared_ptr<DeviceRegistry> _inner;
    const RecorderRef _recorder;
};

}  // namespace

std::shared_ptr<platform::DisplayService> recordDisplay(
    std::shared_ptr<platform::DisplayService> service, const RecorderRef& recorder) {
    return service != nullptr ? std::make_shared<RecordedDisplay>(std::move(service), recorder)
                              : nullptr;
}

std::shared_ptr<platform::DeviceRegistry> recordRegistry(
    std::shared_ptr<platform::DeviceRegistry> registry, const RecorderRef& recorder) {
    return registry != nullptr ? std::make_shared<RecordedRegistry>(std::move(registry), recorder)
                               : nullptr;
}

}  // namespace recording
