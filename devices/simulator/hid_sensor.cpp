#include "devices/simulator/hid_sensor.h"

#include <chrono>
#include <deque>
#include <set>
#include <string_view>
#include <thread>
#include <utility>

#include <pthread.h>

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

constexpr std::size_t kMostQueued = 64;

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
    void setInputReportCallback(WLHIDInputReportCallback callback) override;
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
    using Callback = std::shared_ptr<const WLHIDInputReportCallback>;

    // The device on a run loop. The reports that still wait when it ends are lost.
    struct Delivery {
        std::weak_ptr<RunLoop> runLoop;
        std::string mode;
        std::shared_ptr<platform::RunLoopSource> source;
        bool producing = false;  // these two are guarded by the sensor's mutex
        std::deque<SensorReport> queue;
    };
    using DeliveryRef = std::shared_ptr<Delivery>;

    bool _isOpen();
    DeliveryRef _currentDelivery();
    void _endDelivery();
    void _letGo();

    // The sensor's thread.
    void _startProducing();
    void _produce(const DeliveryRef& delivery, std::uint64_t number);
    bool _enqueue(const DeliveryRef& delivery, SensorReport report, Clock::time_point due);

    // The run loop's thread.
    void _deliverOne(const DeliveryRef& delivery);

    const HidDeviceProfile _profile;
    const double _speed;

    platform::Mutex _mutex;
    platform::Condition _changed;
    State _state ZR_GUARDED_BY(_mutex) = State::Closed;
    std::set<std::int64_t> _modesOn ZR_GUARDED_BY(_mutex);  // by the ID of their feature report
    Callback _callback ZR_GUARDED_BY(_mutex);
    DeliveryRef _delivery ZR_GUARDED_BY(_mutex);  // null while it is not scheduled
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

void Sensor::setInputReportCallback(WLHIDInputReportCallback callback) {
    Callback other;  // the one before goes without the lock: it may own anything
    if (callback) {
        other = std::make_shared<const WLHIDInputReportCallback>(std::move(callback));
    }
    const MutexLock lock(_mutex);
    _callback.swap(other);
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
    const auto delivery = std::make_shared<Delivery>();
    delivery->runLoop = runLoop;
    delivery->mode = mode;
    delivery->source = std::make_shared<platform::RunLoopSource>(
        [weakSelf = weak_from_this(), weakDelivery = std::weak_ptr(delivery)] {
            const auto self = weakSelf.lock();
            const auto delivery = weakDelivery.lock();
            if (self != nullptr && delivery != nullptr) {
                self->_deliverOne(delivery);
            }
        });
    runLoop->addSource(delivery->source, mode);
    {
        const MutexLock lock(_mutex);
        _delivery = delivery;
    }
    _startProducing();
}

void Sensor::unscheduleFromRunLoop(const std::shared_ptr<RunLoop>& runLoop, std::string_view mode) {
    const DeliveryRef delivery = _currentDelivery();
    if (delivery != nullptr && delivery->runLoop.lock() == runLoop && delivery->mode == mode) {
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
    Callback dropped;  // without the lock
    const MutexLock lock(_mutex);
    _callback.swap(dropped);
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
        _changed.notifyAll();
    }
    if (ended != nullptr) {
        if (const auto runLoop = ended->runLoop.lock()) {
            runLoop->removeSource(ended->source, ended->mode);
        }
    }
}

// Once the device is scheduled and in its modes.
void Sensor::_startProducing() {
    const MutexLock lock(_mutex);
    const bool ready = !_profile.needsFeatureReports || (_modesOn.contains(kPowerModeReportID) &&
                                                         _modesOn.contains(kStreamingModeReportID));
    if (ready && _profile.reportsPerSecond > 0 && _delivery != nullptr &&
        !std::exchange(_delivery->producing, true)) {
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
        if (!_enqueue(delivery, std::move(*report), due)) {
            return;
        }
        delivery->source->signal();
        if (last) {
            return;
        }
    }
}

// Waits until the report is due and has room; false when the delivery has ended.
bool Sensor::_enqueue(const DeliveryRef& delivery, SensorReport report, Clock::time_point due) {
    const MutexLock lock(_mutex);
    for (;;) {
        if (_delivery != delivery) {
            return false;
        }
        if (Clock::now() < due) {
            _changed.waitUntil(_mutex, due);
        } else if (delivery->queue.size() == kMostQueued) {
            _changed.wait(_mutex);
        } else {
            _nextReport = report.number + 1;
            delivery->queue.push_back(std::move(report));
            return true;
        }
    }
}

void Sensor::_deliverOne(const DeliveryRef& delivery) {
    SensorReport report;
    Callback callback;
    bool more;
    {
        const MutexLock lock(_mutex);
        if (_delivery != delivery || delivery->queue.empty()) {
            return;
        }
        report = std::move(delivery->queue.front());
        delivery->queue.pop_front();
        more = !delivery->queue.empty();
        _changed.notifyAll();
        callback = _callback;
        if (report.unplugged) {
            _state = State::Unplugged;
        }
    }
    if (more) {
        delivery->source->signal();
    }
    if (report.unplugged) {
        _endDelivery();
    } else if (callback != nullptr) {
        (*callback)(report.id, report.data, report.error);
    }
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
