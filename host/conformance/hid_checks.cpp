// The promises of the HID manager and its devices (platform/welkin/hid.h), on the sensor that the image experiment
// uses.
#include <algorithm>
#include <array>
#include <chrono>
#include <memory>
#include <set>
#include <thread>
#include <utility>
#include <vector>

#include "host/conformance/conformance.h"
#include "platform/deadline.h"
#include "platform/run_loop.h"
#include "platform/welkin/hid.h"

namespace host {

namespace {

using platform::Dictionary;
using platform::ErrorSlot;
using Clock = std::chrono::steady_clock;
using platform::RunLoop;
using Devices = std::vector<std::shared_ptr<WLIOHIDDeviceInterface>>;

enum Check : std::size_t {
    Slot,
    Twice,
    Stranger,
    Unscheduled,
    OtherThread,
    WakeUp,
    ReportId,
    OpenTwice,
    CloseTwice
};

constexpr Promise kPromises[] = {
    kSlotPromise,
    {"manager that returns a device twice", "devices() has each matched device once; none is null"},
    {"device that does not match", "A device matches a dictionary when it has every entry of it"},
    {"reports delivered while not scheduled", "Only a scheduled device calls its callback", false},
    {"reports on another thread",
     "The callback runs on the thread whose run loop the device is scheduled on", false},
    {"lost wake-up", "A report wakes the run loop that the device is scheduled on", false},
    {"report without its ID", "The data of every report begins with its report ID byte"},
    {"open that succeeds twice", "open() fails when the device is open already"},
    {"close that succeeds twice", "close() fails when the device is not open"},
};

constexpr std::string_view kMode = platform::kRunLoopDefaultMode;
constexpr std::chrono::milliseconds kSilence{
    200};                        // in which a report would have come that must not
constexpr double kPatience = 5;  // seconds for a report that must come
constexpr std::size_t kReports = 3;

// The sensor, as the image experiment asks for it and sets it up: a recording answers the same calls.
const Dictionary& sensorUsage() {
    static const auto& usage = *new Dictionary{{platform::kHidPrimaryUsagePage, 0xFF00},
                                               {platform::kHidPrimaryUsage, 0x24}};
    return usage;
}
constexpr std::int64_t kModes[] = {171, 172};  // active power, images only

// What the callback saw. It is called on the run loop's thread; by a broken device on any, at any time.
struct Seen {
    explicit Seen(std::shared_ptr<Checks> of) : checks(std::move(of)) {}

    const std::shared_ptr<Checks> checks;  // a broken device may call when nobody waits any more
    const std::thread::id thread = std::this_thread::get_id();
    const std::shared_ptr<RunLoop> runLoop = RunLoop::forThisThread();

    platform::Mutex mutex;
    platform::Condition changed;
    bool isScheduled ZR_GUARDED_BY(mutex) = false;
    std::size_t reports ZR_GUARDED_BY(mutex) = 0;

    void report(std::int64_t id, std::span<const std::byte> data, const platform::ErrorRef& error) {
        const platform::MutexLock lock(mutex);
        ++reports;
        changed.notifyAll();
        if (!isScheduled) {
            checks->broken(Unscheduled, "a report came while the device was not scheduled");
        }
        checks->decide(OtherThread, std::this_thread::get_id() == thread,
                       "a report came on another thread than the run loop's");
        if (error == nullptr) {
            checks->decide(
                ReportId, !data.empty() && std::to_integer<std::int64_t>(data.front()) == id,
                platform::format("report %@ begins with another byte", platform::Number(id)));
        }
        if (reports == kReports) {
            runLoop->stop();
        }
    }

    // A report that comes in this time breaks the promise.
    void awaitSilence() {
        const platform::MutexLock lock(mutex);
        isScheduled = false;
        const std::size_t before = reports;
        const auto deadline = platform::deadlineAfter(kSilence);
        while (reports == before && Clock::now() < deadline) {
            changed.waitUntil(mutex, deadline);
        }
    }
    std::size_t count() {
        const platform::MutexLock lock(mutex);
        return reports;
    }
};

Devices find(WLHIDManager& manager, const std::vector<Dictionary>& matching) {
    manager.enumerateDevicesMatching(matching);
    return manager.devices();
}

void checkOnce(Checks& checks, const Devices& devices) {
    const std::set<std::shared_ptr<WLIOHIDDeviceInterface>> different(devices.begin(),
                                                                      devices.end());
    checks.decide(Twice, different.size() == devices.size() && different.count(nullptr) == 0,
                  platform::format("%lu devices, %lu of them different and not null",
                                   devices.size(), different.size() - different.count(nullptr)));
}

// The sensor alone, then by two dictionaries that it matches, then by one that nothing matches.
std::shared_ptr<WLIOHIDDeviceInterface> findSensor(Checks& checks, WLHIDManager& manager) {
    const Devices found = find(manager, {sensorUsage()});
    if (found.empty() || found.front() == nullptr) {
        checks.giveUp("there is no sensor of usage page 0xFF00 and usage 0x24");
        return nullptr;
    }
    checkOnce(checks, found);
    Devices twice;
    const Dictionary page{{platform::kHidPrimaryUsagePage, 0xFF00}};
    if (checks.answered([&] { twice = find(manager, {sensorUsage(), page}); })) {
        checkOnce(checks, twice);
    }
    Devices strangers;
    const Dictionary nothing{{platform::kHidPrimaryUsagePage, 0xFFFF},
                             {platform::kHidPrimaryUsage, 0xFFFF}};
    if (checks.answered(Stranger, [&] { strangers = find(manager, {nothing}); })) {
        checks.decide(
            Stranger, strangers.empty(),
            platform::format("%lu devices match a usage that none has", strangers.size()));
    }
    return found.front();
}

// A second call of an operation that can succeed only once.
template <class Call>
void checkOnlyOnce(Checks& checks, std::size_t check, const Call& call) {
    bool isDone = false;
    if (checks.answered(check, [&] { isDone = call(); })) {
        checks.decide(check, !isDone, "the second call returns true");
    }
}

void receive(Checks& checks, Seen& seen, WLIOHIDDeviceInterface& sensor) {
    {
        const platform::MutexLock lock(seen.mutex);
        seen.isScheduled = true;
    }
    sensor.scheduleWithRunLoop(seen.runLoop, kMode);
    const std::size_t before = seen.count();
    const platform::RunLoopOutcome outcome = seen.runLoop->run(kMode, kPatience);
    if (seen.count() > before) {
        checks.kept(WakeUp);
    } else if (outcome == platform::RunLoopOutcome::TimedOut) {
        // A report that is there already comes with the next turn.
        seen.runLoop->run(kMode, 0);
        if (seen.count() > before) {
            checks.broken(WakeUp,
                          "a report waited for a turn of the loop that something else began");
        }
    }
    checks.giveUp(
        platform::format("no report came within %@ s", platform::Number(kPatience).text()));
    sensor.unscheduleFromRunLoop(seen.runLoop, kMode);
    const bool hasReported = seen.count() > before;
    seen.awaitSilence();
    // A sensor that never sends a report is silent in any case.
    if (hasReported) {
        checks.kept(Unscheduled);
    }
}

}  // namespace

std::vector<CheckRecord> checkHid(const devices::Device& device) {
    const auto shared = std::make_shared<Checks>(kPromises, device.unanswered);
    Checks& checks = *shared;
    const auto manager = device.services.hid->createManager();
    if (manager == nullptr) {
        checks.giveUp("the device has no HID manager");
        return checks.records();
    }
    const auto sensor = findSensor(checks, *manager);
    if (sensor == nullptr ||
        !checks.call(Slot, "open()", [&](ErrorSlot error) { return sensor->open(error); })) {
        return checks.records();
    }
    checkOnlyOnce(checks, OpenTwice, [&] { return sensor->open(nullptr); });
    const auto seen = std::make_shared<Seen>(shared);
    sensor->setInputReportCallback(
        [seen](std::int64_t id, std::span<const std::byte> data, const platform::ErrorRef& error) {
            seen->report(id, data, error);
        });
    bool isStreaming = true;
    for (const std::int64_t mode : kModes) {
        const std::array data{static_cast<std::byte>(mode), std::byte{1}};
        isStreaming =
            isStreaming &&
            checks.call(
                Slot, platform::format("setFeatureReportWithID() of %@", platform::Number(mode)),
                [&](ErrorSlot error) { return sensor->setFeatureReportWithID(mode, data, error); });
    }
    if (isStreaming) {
        seen->awaitSilence();
        receive(checks, *seen, *sensor);
    }
    sensor->setInputReportCallback(nullptr);
    if (checks.call(Slot, "close()", [&](ErrorSlot error) { return sensor->close(error); })) {
        checkOnlyOnce(checks, CloseTwice, [&] { return sensor->close(nullptr); });
    }
    return checks.records();
}

}  // namespace host
