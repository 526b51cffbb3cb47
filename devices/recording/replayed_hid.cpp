#include <map>
#include <utility>

#include "devices/recording/argument_values.h"
#include "devices/recording/playback.h"
#include "devices/recording/replayed.h"
#include "devices/report_delivery.h"
#include "platform/sync.h"

namespace recording {

namespace {

using platform::ErrorSlot;
using platform::MutexLock;
using platform::RunLoop;
using platform::Value;

// A sensor on a run loop, and the playback that adds a report when its time has come.
struct ReplayedDelivery {
    std::shared_ptr<devices::ReportDelivery<const Content*>> reports;
    std::shared_ptr<Playback> playback;
};

class ReplayedSensor final : public WLIOHIDDeviceInterface {
  public:
    ReplayedSensor(ScriptRef script, ObjectId id) : _script(std::move(script)), _id(id) {}
    ReplayedSensor(const ReplayedSensor&) = delete;
    ReplayedSensor& operator=(const ReplayedSensor&) = delete;
    ~ReplayedSensor() override {
        _endDelivery();
        _callback->set({});
    }

    bool open(ErrorSlot error) override { return _isTrue(Operation::Open, {}, error); }
    void setInputReportCallback(WLHIDInputReportCallback callback) override {
        _script->take(Operation::SetCallback, _id, callback != nullptr, nullptr);
        _callback->set(std::move(callback));
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
        auto reports = devices::ReportDelivery<const Content*>::start(
            runLoop, mode, [callback = _callback](const Content* content) {
                const auto* report = std::get_if<Report>(content);
                if (report != nullptr) {
                    callback->call(report->reportID, std::as_bytes(std::span(report->data)),
                                   report->error);
                }
                return report != nullptr;
            });
        const Deliveries& deliveries = _script->deliveries(_id, ++_schedules);
        auto playback =
            std::make_shared<Playback>(deliveries, _script->speed(),
                                       [reports, &deliveries, script = _script](std::size_t index) {
                                           if (reports->awaitRoom()) {
                                               reports->add(&deliveries.contents[index]);
                                           }
                                       });
        playback->start();
        const MutexLock lock(_mutex);
        _delivery = {std::move(reports), std::move(playback)};
    }
    void unscheduleFromRunLoop(const std::shared_ptr<RunLoop>& runLoop,
                               std::string_view mode) override {
        _script->take(Operation::Unschedule, _id, mode, nullptr);
        const auto reports = _currentReports();
        if (reports != nullptr && reports->isOn(runLoop, mode)) {
            _endDelivery();
        }
    }
    bool close(ErrorSlot error) override {
        _endDelivery();
        return _isTrue(Operation::Close, {}, error);
    }

  private:
    bool _isTrue(Operation operation, const Value& arguments, ErrorSlot error) {
        return _script->take(operation, _id, arguments, error).asNumber().isTrue();
    }
    std::shared_ptr<devices::ReportDelivery<const Content*>> _currentReports() {
        const MutexLock lock(_mutex);
        return _delivery.reports;
    }
    void _endDelivery() {
        ReplayedDelivery ended;
        {
            const MutexLock lock(_mutex);
            std::swap(ended, _delivery);
        }
        if (ended.reports != nullptr) {
            ended.reports->end();
            ended.playback->abandon();
        }
    }

    const ScriptRef _script;
    const ObjectId _id;
    // Shared with a delivery in progress, which may outlive the sensor.
    const std::shared_ptr<devices::ReportCallback> _callback =
        std::make_shared<devices::ReportCallback>();
    std::uint32_t _schedules = 0;

    platform::Mutex _mutex;
    ReplayedDelivery _delivery ZR_GUARDED_BY(_mutex);  // empty while it is not scheduled
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
