#include "devices/observed/hid.h"

#include <algorithm>
#include <cstdint>
#include <optional>
#include <utility>

#include "devices/observed/wrapper_table.h"
#include "platform/run_loop.h"
#include "platform/run_tag.h"
#include "platform/sync.h"

namespace observed {

namespace {

using platform::ErrorSlot;
using platform::MutexLock;
using platform::RunLoop;

constexpr std::int64_t kImageReportID = 118;
constexpr std::size_t kImageReportSize = 792;  // bytes, report ID included

constexpr std::string_view kNotOpen = "on a HID device that is not open";
constexpr std::string_view kOtherThread = "on another thread than the run loop's";

bool canHoldImage(std::int64_t reportID,
                  std::span<const std::byte> data,
                  const platform::ErrorRef& error) {
    return error == nullptr && reportID == kImageReportID && data.size() >= kImageReportSize;
}

// What is known of a device, shared by its wrapper and the callback that lies in the device. Any thread.
class HidWatch {
  public:
    explicit HidWatch(Reporter reporter) : _reporter(std::move(reporter)) {}

    const Reporter& reporter() const { return _reporter; }

    // Whether the device is open; nothing when that is not known.
    std::optional<bool> isOpen() const {
        const MutexLock lock(_mutex);
        return _open;
    }
    void opened() {
        const MutexLock lock(_mutex);
        _open = true;
        _images = 0;
    }
    void closed(bool succeeded) {
        const MutexLock lock(_mutex);
        if (_open != false) {
            _open = succeeded ? std::optional(false) : std::nullopt;
        }
        _schedules.clear();
    }

    void scheduled(const std::shared_ptr<RunLoop>& runLoop, std::string_view mode) {
        const MutexLock lock(_mutex);
        _schedules.push_back({runLoop, std::string(mode)});
    }
    // A null run loop stands for one that is gone.
    void unscheduled(const std::shared_ptr<RunLoop>& runLoop, std::string_view mode) {
        const MutexLock lock(_mutex);
        std::erase_if(_schedules, [&](const Schedule& schedule) {
            return schedule.mode == mode &&
                   (runLoop == nullptr ? schedule.runLoop.expired() : _isOf(schedule, runLoop));
        });
    }

    // Whether the device may be used on this thread: on any as long as it is not scheduled.
    bool isOnItsThread() const {
        const auto current = RunLoop::current();
        const MutexLock lock(_mutex);
        bool bound = false;
        for (const Schedule& schedule : _schedules) {
            if (current != nullptr && _isOf(schedule, current)) {
                return true;
            }
            bound = bound || !schedule.runLoop.expired();
        }
        return !bound;
    }

    void checkThread(const Call& call) const {
        if (!isOnItsThread()) {
            _reporter.misused(call, kOtherThread);
        }
    }
    void checkCallbackThread() {
        if (!isOnItsThread()) {
            {
                const MutexLock lock(_mutex);
                if (std::exchange(_callbackThreadReported, true)) {
                    return;
                }
            }
            _reporter.misused(platform::format("the report callback was called %@", kOtherThread));
        }
    }

    std::uint64_t countImage() {
        const MutexLock lock(_mutex);
        return ++_images;
    }

  private:
    struct Schedule {
        std::weak_ptr<RunLoop> runLoop;
        std::string mode;
    };

    // Without a reference to the scheduled one, which could become the last.
    static bool _isOf(const Schedule& schedule, const std::shared_ptr<RunLoop>& runLoop) {
        return !schedule.runLoop.owner_before(runLoop) && !runLoop.owner_before(schedule.runLoop);
    }

    const Reporter _reporter;

    mutable platform::Mutex _mutex;
    std::optional<bool> _open ZR_GUARDED_BY(_mutex) = false;
    std::vector<Schedule> _schedules ZR_GUARDED_BY(_mutex);
    std::uint64_t _images ZR_GUARDED_BY(_mutex) = 0;  // since the device was opened
    bool _callbackThreadReported ZR_GUARDED_BY(_mutex) = false;
};

// What the device calls in place of the client's callback.
class WatchedCallback {
  public:
    WatchedCallback(WLHIDInputReportCallback client, std::shared_ptr<HidWatch> watch)
        : _client(std::make_shared<const WLHIDInputReportCallback>(std::move(client)))
        , _watch(std::move(watch)) {}

    void operator()(std::int64_t reportID,
                    std::span<const std::byte> data,
                    const platform::ErrorRef& error) const {
        const platform::RunTagScope scope(_run);
        _watch->checkCallbackThread();
        if (error != nullptr) {
            _watch->reporter().report(
                [&](Observer& observer) { observer.errorReported("input report", error); });
        }
        const std::uint64_t image = canHoldImage(reportID, data, error) ? _watch->countImage() : 0;
        (*_client)(reportID, data, error);
        if (image != 0) {
            _watch->reporter().report([&](Observer& observer) { observer.imageDelivered(image); });
        }
    }

  private:
    std::shared_ptr<const WLHIDInputReportCallback> _client;  // copies of this are one callback
    std::shared_ptr<HidWatch> _watch;
    platform::RunTag _run = platform::currentRunTag();
};

class ObservedHidDevice final : public WLIOHIDDeviceInterface {
  public:
    ObservedHidDevice(std::shared_ptr<WLIOHIDDeviceInterface> inner,
                      std::shared_ptr<HidWatch> watch)
        : _inner(std::move(inner)), _watch(std::move(watch)) {}

    bool open(ErrorSlot error) override {
        const Call call{"open()"};
        if (_watch->isOpen() == true) {
            _reporter().misused(call, "on a HID device that is open");
        }
        const bool opened =
            _reporter().call(call, error, [&](ErrorSlot slot) { return _inner->open(slot); });
        if (opened) {
            _watch->opened();
        }
        return opened;
    }

    void setInputReportCallback(WLHIDInputReportCallback callback) override {
        _watch->checkThread({"setInputReportCallback()"});
        if (callback) {
            callback = WatchedCallback(std::move(callback), _watch);
        }
        _inner->setInputReportCallback(std::move(callback));
    }

    bool setFeatureReportWithID(std::int64_t reportID,
                                std::span<const std::byte> data,
                                ErrorSlot error) override {
        const Call call{"setFeatureReportWithID()"};
        _watch->checkThread(call);
        if (_watch->isOpen() == false) {
            _reporter().misused(call, kNotOpen);
        } else if (data.empty() || std::to_integer<std::int64_t>(data.front()) != reportID) {
            _reporter().misused(call, "with data that does not begin with the report ID");
        }
        return _reporter().call(call, error, [&](ErrorSlot slot) {
            return _inner->setFeatureReportWithID(reportID, data, slot);
        });
    }

    void scheduleWithRunLoop(const std::shared_ptr<RunLoop>& runLoop,
                             std::string_view mode) override {
        const Call call{"scheduleWithRunLoop()"};
        if (_watch->isOpen() == false) {
            _reporter().misused(call, kNotOpen);
        } else {
            _watch->scheduled(runLoop, mode);
            _watch->checkThread(call);
        }
        _inner->scheduleWithRunLoop(runLoop, mode);
    }

    void unscheduleFromRunLoop(const std::shared_ptr<RunLoop>& runLoop,
                               std::string_view mode) override {
        _watch->checkThread({"unscheduleFromRunLoop()"});
        _watch->unscheduled(runLoop, mode);
        _inner->unscheduleFromRunLoop(runLoop, mode);
    }

    bool close(ErrorSlot error) override {
        const Call call{"close()"};
        _watch->checkThread(call);
        const bool closed =
            _reporter().call(call, error, [&](ErrorSlot slot) { return _inner->close(slot); });
        _watch->closed(closed);
        return closed;
    }

  private:
    const Reporter& _reporter() const { return _watch->reporter(); }

    const std::shared_ptr<WLIOHIDDeviceInterface> _inner;
    const std::shared_ptr<HidWatch> _watch;
};

class ObservedManager final : public WLHIDManager {
  public:
    ObservedManager(std::shared_ptr<WLHIDManager> inner, Reporter reporter)
        : _inner(std::move(inner)), _reporter(std::move(reporter)) {}

    void enumerateDevicesMatching(const std::vector<platform::Dictionary>& matching) override {
        _inner->enumerateDevicesMatching(matching);
    }

    std::vector<std::shared_ptr<WLIOHIDDeviceInterface>> devices() override {
        auto devices = _inner->devices();
        for (auto& device : devices) {
            device = _wrappers.wrap(device, [&] { return std::make_shared<HidWatch>(_reporter); });
        }
        return devices;
    }

  private:
    const std::shared_ptr<WLHIDManager> _inner;
    const Reporter _reporter;
    WrapperTable<WLIOHIDDeviceInterface, HidWatch, ObservedHidDevice> _wrappers;
};

class ObservedHid final : public platform::HidFacility {
  public:
    ObservedHid(std::shared_ptr<HidFacility> inner, Reporter reporter)
        : _inner(std::move(inner)), _reporter(std::move(reporter)) {}

    std::shared_ptr<WLHIDManager> createManager() override {
        auto manager = _inner->createManager();
        return manager != nullptr ? std::make_shared<ObservedManager>(std::move(manager), _reporter)
                                  : nullptr;
    }

  private:
    const std::shared_ptr<HidFacility> _inner;
    const Reporter _reporter;
};

}  // namespace

std::shared_ptr<platform::HidFacility> observeHid(std::shared_ptr<platform::HidFacility> facility,
                                                  const Reporter& reporter) {
    return facility != nullptr ? std::make_shared<ObservedHid>(std::move(facility), reporter)
                               : nullptr;
}

}  // namespace observed
