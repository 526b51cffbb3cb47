#include <algorithm>
#include <atomic>
#include <limits>
#include <string>
#include <utility>
#include <vector>

#include "devices/observed/wrapper_table.h"
#include "devices/recording/argument_values.h"
#include "devices/recording/recorded.h"
#include "platform/sync.h"

namespace recording {

namespace {

using platform::ErrorSlot;
using platform::RunLoop;
using platform::Value;

// What is known of a sensor, shared by its wrapper, the callback that lies in the device and the watches of run
// loops.
struct SensorState {
    explicit SensorState(RecorderRef with) : recorder(std::move(with)), id(recorder->newObject()) {}

    const RecorderRef recorder;
    const ObjectId id;
    std::atomic<std::uint32_t> schedules{0};  // the client counts, the delivering thread reads
};
using SensorStateRef = std::shared_ptr<SensorState>;

// What the device calls in place of the client's callback. The entry comes first, as with frames.
class RecordedCallback {
  public:
    RecordedCallback(WLHIDInputReportCallback client, SensorStateRef sensor)
        : _client(std::make_shared<const WLHIDInputReportCallback>(std::move(client)))
        , _sensor(std::move(sensor)) {}

    void operator()(std::int64_t reportID,
                    std::span<const std::byte> data,
                    const platform::ErrorRef& error) const {
        _sensor->recorder->add(_sensor->recorder->now(), Report{.sensor = _sensor->id,
                                                                .schedule = _sensor->schedules,
                                                                .reportID = reportID,
                                                                .data = bytesText(data),
                                                                .error = error});
        (*_client)(reportID, data, error);
    }

  private:
    std::shared_ptr<const WLHIDInputReportCallback> _client;  // copies of this are one callback
    SensorStateRef _sensor;
};

// Looks, at the end of each run of the loop, whether the sensor has taken its source away: the loop ends then for
// want of one.
class LoopWatch {
  public:
    LoopWatch(const std::shared_ptr<RunLoop>& runLoop,
              std::string_view mode,
              const SensorStateRef& sensor)
        : _runLoop(runLoop), _mode(mode) {
        // Before the client's own observers, which may unschedule the sensor.
        _observer->activities = platform::RunLoopExit;
        _observer->order = std::numeric_limits<int>::min();
        _observer->callback = [weak = _runLoop, mode = _mode, sensor](std::uint32_t /*activity*/) {
            const auto loop = weak.lock();
            if (loop != nullptr && !loop->hasSources(mode)) {
                sensor->recorder->add(
                    sensor->recorder->now(),
                    Vanished{.sensor = sensor->id, .schedule = sensor->schedules});
            }
        };
        runLoop->addObserver(_observer, _mode);
    }
    LoopWatch(const LoopWatch&) = delete;
    LoopWatch& operator=(const LoopWatch&) = delete;
    ~LoopWatch() {
        if (const auto loop = _runLoop.lock()) {
            loop->removeObserver(_observer, _mode);
        }
    }

    bool isOf(const std::shared_ptr<RunLoop>& runLoop, std::string_view mode) const {
        return _runLoop.lock() == runLoop && _mode == mode;
    }

  private:
    const std::weak_ptr<RunLoop> _runLoop;
    const std::string _mode;
    const std::shared_ptr<platform::RunLoopObserver> _observer =
        std::make_shared<platform::RunLoopObserver>();
};

class RecordedSensor final : public WLIOHIDDeviceInterface {
  public:
    RecordedSensor(std::shared_ptr<WLIOHIDDeviceInterface> inner, SensorStateRef state)
        : _inner(std::move(inner)), _state(std::move(state)) {}

    bool open(ErrorSlot error) override {
        return _call(Operation::Open, {}, error,
                     [&](ErrorSlot slot) { return _inner->open(slot); });
    }
    void setInputReportCallback(WLHIDInputReportCallback callback) override {
        const bool isSet = callback != nullptr;
        if (isSet) {
            callback = RecordedCallback(std::move(callback), _state);
        }
        _callVoid(Operation::SetCallback, isSet,
                  [&] { _inner->setInputReportCallback(std::move(callback)); });
    }
    bool setFeatureReportWithID(std::int64_t reportID,
                                std::span<const std::byte> data,
                                ErrorSlot error) override {
        return _call(
            Operation::SetFeatureReport, platform::List{reportID, bytesText(data)}, error,
            [&](ErrorSlot slot) { return _inner->setFeatureReportWithID(reportID, data, slot); });
    }
    void scheduleWithRunLoop(const std::shared_ptr<RunLoop>& runLoop,
                             std::string_view mode) override {
        ++_state->schedules;
        auto watch = std::make_unique<LoopWatch>(runLoop, mode, _state);
        {
            const platform::MutexLock lock(_mutex);
            _watches.push_back(std::move(watch));
        }
        _callVoid(Operation::Schedule, mode, [&] { _inner->scheduleWithRunLoop(runLoop, mode); });
    }
    void unscheduleFromRunLoop(const std::shared_ptr<RunLoop>& runLoop,
                               std::string_view mode) override {
        _endWatches([&](const LoopWatch& watch) { return watch.isOf(runLoop, mode); });
        _callVoid(Operation::Unschedule, mode,
                  [&] { _inner->unscheduleFromRunLoop(runLoop, mode); });
    }
    bool close(ErrorSlot error) override {
        _endWatches([](const LoopWatch& /*watch*/) { return true; });
        return _call(Operation::Close, {}, error,
                     [&](ErrorSlot slot) { return _inner->close(slot); });
    }

    ObjectId id() const { return _state->id; }

  private:
    template <class Inner>
    bool _call(Operation operation, Value arguments, ErrorSlot error, Inner inner) {
        return _state->recorder->call(operation, _state->id, std::move(arguments), error, inner);
    }
    template <class Inner>
    void _callVoid(Operation operation, Value arguments, Inner inner) {
        const Microseconds began = _state->recorder->now();
        inner();
        _state->recorder->add(began, Call{operation, _state->id, std::move(arguments), {}, {}});
    }
    template <class Matches>
    void _endWatches(Matches matches) {
        std::vector<std::unique_ptr<LoopWatch>> ended;  // without the lock
        const platform::MutexLock lock(_mutex);
        const auto kept = std::stable_partition(
            _watches.begin(), _watches.end(), [&](const auto& watch) { return !matches(*watch); });
        std::move(kept, _watches.end(), std::back_inserter(ended));
        _watches.erase(kept, _watches.end());
    }

    const std::shared_ptr<WLIOHIDDeviceInterface> _inner;
    const SensorStateRef _state;

    platform::Mutex _mutex;
    std::vector<std::unique_ptr<LoopWatch>> _watches ZR_GUARDED_BY(_mutex);
};

class RecordedManager final : public WLHIDManager {
  public:
    RecordedManager(std::shared_ptr<WLHIDManager> inner, RecorderRef recorder)
        : _inner(std::move(inner)), _recorder(std::move(recorder)), _id(_recorder->newObject()) {}

    void enumerateDevicesMatching(const std::vector<platform::Dictionary>& matching) override {
        const Microseconds began = _recorder->now();
        _inner->enumerateDevicesMatching(matching);
        _recorder->add(
            began,
            Call{Operation::Enumerate, _id, withoutObjects(dictionariesValue(matching)), {}, {}});
    }
    std::vector<std::shared_ptr<WLIOHIDDeviceInterface>> devices() override {
        return _recorder->call(
            Operation::Devices, _id, {}, nullptr,
            [&](ErrorSlot /*slot*/) {
                auto devices = _inner->devices();
                for (auto& device : devices) {
                    device = _wrappers.wrap(
                        device, [&] { return std::make_shared<SensorState>(_recorder); });
                }
                return devices;
            },
            [](const auto& devices) {
                platform::MutableList ids;
                for (const auto& device : devices) {
                    const auto* sensor = dynamic_cast<const RecordedSensor*>(device.get());
                    ids.push_back(sensor != nullptr ? Value(sensor->id()) : Value());
                }
                return platform::List(std::move(ids));
            });
    }

    ObjectId id() const { return _id; }

  private:
    const std::shared_ptr<WLHIDManager> _inner;
    const RecorderRef _recorder;
    const ObjectId _id;
    observed::WrapperTable<WLIOHIDDeviceInterface, SensorState, RecordedSensor> _wrappers;
};

class RecordedHid final : public platform::HidFacility {
  public:
    RecordedHid(std::shared_ptr<HidFacility> inner, RecorderRef recorder)
        : _inner(std::move(inner)), _recorder(std::move(recorder)) {}

    std::shared_ptr<WLHIDManager> createManager() override {
        return _recorder->call(
            Operation::CreateManager, 0, {}, nullptr,
            [&](ErrorSlot /*slot*/) {
                auto manager = _inner->createManager();
                return manager != nullptr
                           ? std::make_shared<RecordedManager>(std::move(manager), _recorder)
                           : nullptr;
            },
            [](const auto& manager) {
                return manager != nullptr ? Value(manager->id()) : Value();
            });
    }

  private:
    const std::shared_ptr<HidFacility> _inner;
    const RecorderRef _recorder;
};

}  // namespace

std::shared_ptr<platform::HidFacility> recordHid(std::shared_ptr<platform::HidFacility> facility,
                                                 const RecorderRef& recorder) {
    return facility != nullptr ? std::make_shared<RecordedHid>(std::move(facility), recorder)
                               : nullptr;
}

}  // namespace recording
