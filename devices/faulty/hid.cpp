#include <utility>

#include "devices/faulty/decorators.h"
#include "devices/observed/wrapper_table.h"
#include "platform/number.h"

namespace faulty {

namespace {

using platform::ErrorSlot;
using RunLoopRef = std::shared_ptr<platform::RunLoop>;
using HidDevices = std::vector<std::shared_ptr<WLIOHIDDeviceInterface>>;

constexpr Way kListWays[] = {Way::Empty};
constexpr Way kReportWays[] = {Way::WithError, Way::Empty, Way::WrongKind, Way::Lost};

// What the device calls in place of the client's callback.
class FaultyCallback {
  public:
    FaultyCallback(WLHIDInputReportCallback client, InjectorRef injector)
        : _client(std::make_shared<const WLHIDInputReportCallback>(std::move(client)))
        , _injector(std::move(injector)) {}

    void operator()(std::int64_t reportID,
                    std::span<const std::byte> data,
                    const platform::ErrorRef& error) const {
        const auto strike = _injector->take(StepKind::Report, {}, {}, kReportWays);
        if (!strike.has_value()) {
            (*_client)(reportID, data, error);
        } else if (strike->fault.way == Way::WithError) {
            (*_client)(reportID, data, strike->error);
        } else if (strike->fault.way == Way::Empty) {
            (*_client)(reportID, {}, error);
        } else if (strike->fault.way == Way::WrongKind) {
            (*_client)(reportID + 1, data, error);
        }
    }

  private:
    std::shared_ptr<const WLHIDInputReportCallback> _client;  // copies of this are one callback
    InjectorRef _injector;
};

class FaultyHidDevice final : public WLIOHIDDeviceInterface {
  public:
    FaultyHidDevice(std::shared_ptr<WLIOHIDDeviceInterface> inner, InjectorRef injector)
        : _inner(std::move(inner)), _injector(std::move(injector)) {}

    bool open(ErrorSlot error) override {
        return _injector->call("open", {}, error, [&] { return _inner->open(error); });
    }
    void setInputReportCallback(WLHIDInputReportCallback callback) override {
        if (!_injector->passes(callback ? "setInputReportCallback"
                                        : "setInputReportCallback to none")) {
            return;
        }
        if (callback) {
            callback = FaultyCallback(std::move(callback), _injector);
        }
        _inner->setInputReportCallback(std::move(callback));
    }
    bool setFeatureReportWithID(std::int64_t reportID,
                                std::span<const std::byte> data,
                                ErrorSlot error) override {
        return _injector->call(
            "setFeatureReportWithID", platform::Number(reportID).text(), error,
            [&] { return _inner->setFeatureReportWithID(reportID, data, error); });
    }
    void scheduleWithRunLoop(const RunLoopRef& runLoop, std::string_view mode) override {
        if (_injector->passes("scheduleWithRunLoop")) {
            _inner->scheduleWithRunLoop(runLoop, mode);
        }
    }
    void unscheduleFromRunLoop(const RunLoopRef& runLoop, std::string_view mode) override {
        if (_injector->passes("unscheduleFromRunLoop")) {
            _inner->unscheduleFromRunLoop(runLoop, mode);
        }
    }
    bool close(ErrorSlot error) override {
        return _injector->call("close", {}, error, [&] { return _inner->close(error); });
    }

  private:
    const std::shared_ptr<WLIOHIDDeviceInterface> _inner;
    const InjectorRef _injector;
};

class FaultyManager final : public WLHIDManager {
  public:
    FaultyManager(std::shared_ptr<WLHIDManager> inner, InjectorRef injector)
        : _inner(std::move(inner)), _injector(std::move(injector)) {}

    void enumerateDevicesMatching(const std::vector<platform::Dictionary>& matching) override {
        if (_injector->passes("enumerateDevicesMatching")) {
            _inner->enumerateDevicesMatching(matching);
        }
    }
    HidDevices devices() override {
        HidDevices devices = _injector->call(
            "devices", {}, kListWays, nullptr, [&] { return _inner->devices(); },
            [](const auto& /*devices*/, Way /*way*/) { return HidDevices(); });
        for (auto& device : devices) {
            device = _wrappers.wrap(device, [&] { return _injector; });
        }
        return devices;
    }

  private:
    const std::shared_ptr<WLHIDManager> _inner;
    const InjectorRef _injector;
    observed::WrapperTable<WLIOHIDDeviceInterface, Injector, FaultyHidDevice> _wrappers;
};

class FaultyHid final : public platform::HidFacility {
  public:
    FaultyHid(std::shared_ptr<HidFacility> inner, InjectorRef injector)
        : _inner(std::move(inner)), _injector(std::move(injector)) {}

    std::shared_ptr<WLHIDManager> createManager() override {
        if (_injector->take(StepKind::Call, "createManager", {}, kNoObject).has_value()) {
            return nullptr;
        }
        auto manager = _inner->createManager();
        return manager != nullptr ? std::make_shared<FaultyManager>(std::move(manager), _injector)
                                  : nullptr;
    }

  private:
    const std::shared_ptr<HidFacility> _inner;
    const InjectorRef _injector;
};

}  // namespace

std::shared_ptr<platform::HidFacility> decorateHid(std::shared_ptr<platform::HidFacility> facility,
                                                   InjectorRef injector) {
    return std::make_shared<FaultyHid>(std::move(facility), std::move(injector));
}

}  // namespace faulty
