#include <deque>
#include <map>
#include <string>
#include <utility>

#include "devices/recording/argument_values.h"
#include "devices/recording/playback.h"
#include "devices/recording/replayed.h"
#include "platform/sync.h"

namespace recording {

namespace {

using platform::ErrorSlot;
using platform::MutexLock;
using platform::RunLoop;
using platform::Value;

// A sensor on a run loop: a source that delivers one report per turn once the playback says that its time has come.
class ReplayedDelivery : public std::enable_shared_from_this<ReplayedDelivery> {
  public:
    // Receives a report, on the run loop's thread.
    using Receive = std::function<void(const Report& report)>;

    ReplayedDelivery(const std::shared_ptr<RunLoop>& runLoop, std::string_view mode)
        : _runLoop(runLoop), _mode(mode) {}

    // `deliveries` belong to the script.
    void start(const ScriptRef& script, const Deliveries& deliveries, Receive receive) {
        _source = std::make_shared<platform::RunLoopSource>(
            [weak = weak_from_this(), receive = std::move(receive)] {
                if (const auto self = weak.lock()) {
                    self->_deliverOne(receive);
                }
            });
        _runLoop.lock()->addSource(_source, _mode);
        _playback = std::make_shared<Playback>(
            deliveries, script->speed(),
            [weak = weak_from_this(), script, &deliveries](std::size_t index) {
                if (const auto self = weak.lock()) {
                    self->_queue(deliveries.contents[index]);
                }
            });
        _playback->start();
    }
    void end() {
        _playback->abandon();
        _removeSource();
        const MutexLock lock(_mutex);
        _ready.clear();
        _hasEnded = true;
    }

    bool isOn(const std::shared_ptr<RunLoop>& runLoop, std::string_view mode) const {
        return _runLoop.lock() == runLoop && _mode == mode;
    }

  private:
    void _queue(const Content& content) {
        {
            const MutexLock lock(_mutex);
            if (_hasEnded) {
                return;
            }
            _ready.push_back(&content);
        }
        _source->signal();
    }
    void _deliverOne(const Receive& receive) {
        const Content* content = nullptr;
        bool more = false;
        {
            const MutexLock lock(_mutex);
            if (_ready.empty()) {
                return;
            }
            content = _ready.front();
            _ready.pop_front();
            more = !_ready.empty();
        }
        if (more) {
            _source->signal();
        }
        if (const auto* report = std::get_if<Report>(content)) {
            receive(*report);
        } else {
            _removeSource();
        }
    }
    void _removeSource() {
        if (const auto runLoop = _runLoop.lock()) {
            runLoop->removeSource(_source, _mode);
        }
    }

    const std::weak_ptr<RunLoop> _runLoop;
    const std::string _mode;
    std::shared_ptr<platform::RunLoopSource> _source;
    std::shared_ptr<Playback> _playback;

    platform::Mutex _mutex;
    std::deque<const Content*> _ready ZR_GUARDED_BY(_mutex);
    bool _hasEnded ZR_GUARDED_BY(_mutex) = false;
};

// What a sensor calls: shared with a delivery in progress, which may outlive the sensor.
struct CallbackSlot {
    using Callback = std::shared_ptr<const WLHIDInputReportCallback>;

    Callback get() {
        const MutexLock lock(mutex);
        return callback;
    }
    // The one before goes without the lock: it may own anything.
    void set(Callback other) {
        const MutexLock lock(mutex);
        callback.swap(other);
    }

    platform::Mutex mutex;
    Callback callback ZR_GUARDED_BY(mutex);
};

class ReplayedSensor final : public WLIOHIDDeviceInterface {
  public:
    ReplayedSensor(ScriptRef script, ObjectId id) : _script(std::move(script)), _id(id) {}
    ReplayedSensor(const ReplayedSensor&) = delete;
    ReplayedSensor& operator=(const ReplayedSensor&) = delete;
    ~ReplayedSensor() override {
        _endDelivery();
        _callback->set(nullptr);
    }

    bool open(ErrorSlot error) override { return _isTrue(Operation::Open, {}, error); }
    void setInputReportCallback(WLHIDInputReportCallback callback) override {
        const bool isSet = callback != nullptr;
        _script->take(Operation::SetCallback, _id, isSet, nullptr);
        _callback->set(isSet ? std::make_shared<const WLHIDInputReportCallback>(std::move(callback))
                             : nullptr);
    }
    bool setFeatureReportWithID(std::int64_t reportID,
                                std::span<const std::byte> data,
                                ErrorSlot error) override {
        return _isTrue(Operation::SetFeatureReport, platform::List{reportID, bytesText(data)},
                       error);
    }
    void scheduleWithRunLoop(const std::shared_ptr<RunLoop>& runLoop,
                             std::string_view mode) override {
        _script->take(Operation::Schedule, _id, mode, nullptr);
        _endDelivery();
        auto delivery = std::make_shared<ReplayedDelivery>(runLoop, mode);
        delivery->start(_script, _script->deliveries(_id, ++_schedules),
                        [slot = _callback](const Report& report) {
                            if (const auto callback = slot->get()) {
                                (*callback)(report.reportID, std::as_bytes(std::span(report.data)),
                                            report.error);
                            }
                        });
        const MutexLock lock(_mutex);
        _delivery = std::move(delivery);
    }
    void unscheduleFromRunLoop(const std::shared_ptr<RunLoop>& runLoop,
                               std::string_view mode) override {
        _script->take(Operation::Unschedule, _id, mode, nullptr);
        const auto delivery = _currentDelivery();
        if (delivery != nullptr && delivery->isOn(runLoop, mode)) {
            _endDelivery();
        }
    }
    bool close(ErrorSlot error) override {
        _endDelivery();
        return _isTrue(Operation::Close, {}, error);
    }

  private:
    using DeliveryRef = std::shared_ptr<ReplayedDelivery>;

    bool _isTrue(Operation operation, const Value& arguments, ErrorSlot error) {
        return _script->take(operation, _id, arguments, error).asNumber().isTrue();
    }
    DeliveryRef _currentDelivery() {
        const MutexLock lock(_mutex);
        return _delivery;
    }
    void _endDelivery() {
        DeliveryRef ended;
        {
            const MutexLock lock(_mutex);
            ended.swap(_delivery);
        }
        if (ended != nullptr) {
            ended->end();
        }
    }

    const ScriptRef _script;
    const ObjectId _id;
    const std::shared_ptr<CallbackSlot> _callback = std::make_shared<CallbackSlot>();
    std::uint32_t _schedules = 0;

    platform::Mutex _mutex;
    DeliveryRef _delivery ZR_GUARDED_BY(_mutex);  // null while it is not scheduled
};

// One thread at a time uses it.
class ReplayedManager final : public WLHIDManager {
  public:
    ReplayedManager(ScriptRef script, ObjectId id) : _script(std::move(script)), _id(id) {}

    void enumerateDevicesMatching(const std::vector<platform::Dictionary>& matching) override {
        _script->take(Operation::Enumerate, _id, withoutObjects(dictionariesValue(matching)),
                      nullptr);
    }
    std::vector<std::shared_ptr<WLIOHIDDeviceInterface>> devices() override {
        std::vector<std::shared_ptr<WLIOHIDDeviceInterface>> devices;
        const Value answer = _script->take(Operation::Devices, _id, {}, nullptr);
        if (answer.list() != nullptr) {
            for (const Value& entry : *answer.list()) {
                devices.push_back(_sensorOf(entry.asNumber().as<ObjectId>()));
            }
        }
        return devices;
    }

  private:
    std::shared_ptr<WLIOHIDDeviceInterface> _sensorOf(ObjectId id) {
        auto sensor = _sensors[id].lock();
        if (sensor == nullptr) {
            sensor = std::make_shared<ReplayedSensor>(_script, id);
            _sensors[id] = sensor;
        }
        return sensor;
    }

    const ScriptRef _script;
    const ObjectId _id;
    std::map<ObjectId, std::weak_ptr<WLIOHIDDeviceInterface>> _sensors;
};

class ReplayedHid final : public platform::HidFacility {
  public:
    explicit ReplayedHid(ScriptRef script) : _script(std::move(script)) {}

    std::shared_ptr<WLHIDManager> createManager() override {
        const Value answer = _script->take(Operation::CreateManager, 0, {}, nullptr);
        return answer.isPresent()
                   ? std::make_shared<ReplayedManager>(_script, answer.asNumber().as<ObjectId>())
                   : nullptr;
    }

  private:
    const ScriptRef _script;
};

}  // namespace

std::shared_ptr<platform::HidFacility> replayHid(ScriptRef script) {
    return std::make_shared<ReplayedHid>(std::move(script));
}

}  // namespace recording
