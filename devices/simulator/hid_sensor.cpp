#include "devices/simulator/hid_sensor.h"

#include <chrono>
#include <set>
#include <string_view>
#include <thread>
#include <utility>

#include <pthread.h>

#include "devices/report_delivery.h"
#include "devices/simulator/due_time.h"
#include "devices/simulator/image_report.h"
#include "devices/usage_match.h"
#include "platform/number.h"
#include "platform/sync.h"

namespace simulator {

namespace {

using platform::ErrorSlot;
using platform::MutexLock;
using platform::RunLoop;
using Clock = std::chrono::steady_clock;

// The feature reports that set the modes which the sensor needs for images, and the value of both.
constexpr std::int64_t kPowerModeReportID = 171;
constexpr std::int64_t kStreamingModeReportID = 172;
constexpr std::byte kModeOn{1};

// A device as one user sees it.
//
// Owner    The user's handle, its thread while it makes reports, and its event source while that
//          delivers one: it may die on any of their threads.
// Threads  Any; no lock is held while a callback or a run loop is called.
class Sensor final : public WLIOHIDDeviceInterface, public std::enable_shared_from_this<Sensor> {
  public:
    Sensor(HidDeviceProfile profile, double speed) : _profile(std::move(profile)), _speed(speed) {}

    // What the user holds. The device closes when it goes.
    std::shared_ptr<WLIOHIDDeviceInterface> makeHandle() {
        return {this, [self = shared_from_this()](WLIOHIDDeviceInterface*) { self->_letGo(); }};
    }

    bool open(ErrorSlot error) override;
    void setInputReportCallback(WLHIDInputReportCallback callback) override {
        _callback.set(std::move(callback));
    }
    bool setFeatureReportWithID(std::int64_t reportID,
                                std::span<const std::byte> data,
                                ErrorSlot error) override;
    void scheduleWithRunLoop(const std::shared_ptr<RunLoop>& runLoop,
                             std::string_view mode) override;
    void unscheduleFromRunLoop(const std::shared_ptr<RunLoop>& runLoop,
                               std::string_view mode) override;
    bool close(ErrorSlot error) override;

  private:
    enum class State { Closed, Open, Unplugged };
    using Delivery = devices::ReportDelivery<SensorReport>;
    using DeliveryRef = std::shared_ptr<Delivery>;

    bool _isOpen();
    DeliveryRef _currentDelivery();
    void _endDelivery();
    void _letGo();

    // The sensor's thread.
    void _startProducing();
    void _produce(const DeliveryRef& delivery, std::uint64_t number);
    bool _take(const DeliveryRef& delivery, std::uint64_t number);

    // The run loop's thread.
    bool _receive(const SensorReport& report);

    const HidDeviceProfile _profile;
    const double _speed;

    devices::ReportCallback _callback;

    platform::Mutex _mutex;
    State _state ZR_GUARDED_BY(_mutex) = State::Closed;
    std::set<std::int64_t> _modesOn ZR_GUARDED_BY(_mutex);  // by the ID of their feature report
    DeliveryRef _delivery ZR_GUARDED_BY(_mutex);            // null while it is not scheduled
    bool _isProducing ZR_GUARDED_BY(_mutex) = false;        // for the delivery
    std::uint64_t _nextReport ZR_GUARDED_BY(_mutex) = 1;
};

bool Sensor::open(ErrorSlot error) {
    const MutexLock lock(_mutex);
    if (_state != State::Closed || _profile.open.strikes(error)) {
        return false;
    }
    _state = State::Open;
    _nextReport = 1;
    return true;
}

bool Sensor::setFeatureReportWithID(std::int64_t reportID,
                                    std::span<const std::byte> data,
                                    ErrorSlot error) {
    if (!_isOpen() || data.empty() || std::to_integer<std::int64_t>(data.front()) != reportID) {
        return false;
    }
    const auto fault = _profile.featureReports.find(reportID);
    if (fault != _profile.featureReports.end() && fault->second.strikes(error)) {
        return false;
    }
    if (data.size() == 2 && data[1] == kModeOn) {
        const MutexLock lock(_mutex);
        _modesOn.insert(reportID);
    }
    _startProducing();
    return true;
}

void Sensor::scheduleWithRunLoop(const std::shared_ptr<RunLoop>& runLoop, std::string_view mode) {
    if (!_isOpen()) {
        return;
    }
    _endDelivery();
    DeliveryRef delivery =
        Delivery::start(runLoop, mode, [weak = weak_from_this()](const SensorReport& report) {
            const auto self = weak.lock();
            return self != nullptr && self->_receive(report);
        });
    {
        const MutexLock lock(_mutex);
        _delivery = std::move(delivery);
        _isProducing = false;
    }
    _startProducing();
}

void Sensor::unscheduleFromRunLoop(const std::shared_ptr<RunLoop>& runLoop, std::string_view mode) {
    const DeliveryRef delivery = _currentDelivery();
    if (delivery != nullptr && delivery->isOn(runLoop, mode)) {
        _endDelivery();
    }
}

bool Sensor::close(ErrorSlot error) {
    _endDelivery();
    {
        const MutexLock lock(_mutex);
        if (_state != State::Open) {
            return false;
        }
        _state = State::Closed;
        _modesOn.clear();
    }
    return !_profile.close.strikes(error);
}

void Sensor::_letGo() {
    _endDelivery();
    _callback.set({});
}

bool Sensor::_isOpen() {
    const MutexLock lock(_mutex);
    return _state == State::Open;
}

Sensor::DeliveryRef Sensor::_currentDelivery() {
    const MutexLock lock(_mutex);
    return _delivery;
}

void Sensor::_endDelivery() {
    DeliveryRef ended;
    {
        const MutexLock lock(_mutex);
        ended.swap(_delivery);
    }
    if (ended != nullptr) {
        ended->end();
    }
}

// Once the device is scheduled and in its modes.
void Sensor::_startProducing() {
    const MutexLock lock(_mutex);
    const bool ready = !_profile.needsFeatureReports || (_modesOn.contains(kPowerModeReportID) &&
                                                         _modesOn.contains(kStreamingModeReportID));
    if (ready && _profile.reportsPerSecond > 0 && _delivery != nullptr &&
        !std::exchange(_isProducing, true)) {
        std::thread([self = shared_from_this(), delivery = _delivery, number = _nextReport] {
            self->_produce(delivery, number);
        }).detach();
    }
}

void Sensor::_produce(const DeliveryRef& delivery, std::uint64_t number) {
    pthread_setname_np(pthread_self(), "hid sensor");
    const Clock::time_point started = Clock::now();
    const std::uint64_t before = number - 1;
    while (auto report = nextReport(_profile, number)) {
        number = report->number + 1;
        const bool last = report->unplugged;
        const auto reports = static_cast<double>(report->number - before);
        const auto due = dueTime(started, reports / _profile.reportsPerSecond, _speed);
        if (!delivery->awaitTime(due) || !delivery->awaitRoom() ||
            !_take(delivery, report->number) || !delivery->add(std::move(*report)) || last) {
            return;
        }
    }
}

// The next delivery begins after that report; false when the one that asks is not the sensor's any more.
bool Sensor::_take(const DeliveryRef& delivery, std::uint64_t number) {
    const MutexLock lock(_mutex);
    if (_delivery != delivery) {
        return false;
    }
    _nextReport = number + 1;
    return true;
}

bool Sensor::_receive(const SensorReport& report) {
    if (report.unplugged) {
        const MutexLock lock(_mutex);
        _state = State::Unplugged;
        return false;
    }
    _callback.call(report.id, report.data, report.error);
    return true;
}

// What a facility and its managers share.
struct Bus {
    const HidProfile profile;
    const double speed;
};

// Threads: one at a time.
class SimulatedManager final : public WLHIDManager {
  public:
    explicit SimulatedManager(std::shared_ptr<const Bus> bus) : _bus(std::move(bus)) {}

    void enumerateDevicesMatching(const std::vector<platform::Dictionary>& matching) override {
        _devices.clear();
        for (const HidDeviceProfile& device : _bus->profile.devices) {
            if (devices::matchesAny(device.usagePage, device.usage, matching)) {
                _devices.push_back(std::make_shared<Sensor>(device, _bus->speed)->makeHandle());
            }
        }
    }

    std::vector<std::shared_ptr<WLIOHIDDeviceInterface>> devices() override { return _devices; }

  private:
    const std::shared_ptr<const Bus> _bus;
    std::vector<std::shared_ptr<WLIOHIDDeviceInterface>> _devices;
};

class SimulatedFacility final : public platform::HidFacility {
  public:
    explicit SimulatedFacility(std::shared_ptr<const Bus> bus) : _bus(std::move(bus)) {}

    std::shared_ptr<WLHIDManager> createManager() override {
        return _bus->profile.managerAvailable ? std::make_shared<SimulatedManager>(_bus) : nullptr;
    }

  private:
    const std::shared_ptr<const Bus> _bus;
};

}  // namespace

std::shared_ptr<platform::HidFacility> makeHidFacility(HidProfile profile, double speed) {
    return std::make_shared<SimulatedFacility>(
        std::make_shared<const Bus>(Bus{.profile = std::move(profile), .speed = speed}));
}

}  // namespace simulator
