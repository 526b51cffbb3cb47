// How input reports get from a HID device's thread to the client that scheduled the device on a run loop.
#ifndef ZR_DEVICES_REPORT_DELIVERY_H
#define ZR_DEVICES_REPORT_DELIVERY_H

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <functional>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <utility>

#include "platform/run_loop.h"
#include "platform/sync.h"
#include "platform/welkin/hid.h"

namespace devices {

// ReportDelivery: a device on a run loop. Each report wakes the loop, and one is received per turn, so that a stop
// of the loop takes effect between two reports.
//
// Owner    The device while it is scheduled, and the thread that adds reports: one thread. It ends when the last
//          of them lets go of it.
// Threads  Any. No lock is held while a report is received or the run loop is called.
template <class Report>
class ReportDelivery {
  public:
    // Called on the run loop's thread. False when the report was the last: then the delivery ends. What it owns may
    // own the device, but not the delivery.
    using Receive = std::function<bool(Report& report)>;

    static constexpr std::size_t kMostWaiting = 64;

    static std::shared_ptr<ReportDelivery> start(const std::shared_ptr<platform::RunLoop>& runLoop,
                                                 std::string_view mode,
                                                 Receive receive) {
        std::shared_ptr<ReportDelivery> delivery(new ReportDelivery(runLoop, mode));
        delivery->_source = std::make_shared<platform::RunLoopSource>(
            [weak = std::weak_ptr(delivery), receive = std::move(receive)] {
                if (const auto self = weak.lock()) {
                    self->_receiveOne(receive);
                }
            });
        runLoop->addSource(delivery->_source, mode);
        return delivery;
    }
    ReportDelivery(const ReportDelivery&) = delete;
    ReportDelivery& operator=(const ReportDelivery&) = delete;
    ~ReportDelivery() { end(); }

    // Whether it was started on that loop in that mode; a loop that is gone is null.
    bool isOn(const std::shared_ptr<platform::RunLoop>& runLoop, std::string_view mode) const {
        return _runLoop.lock() == runLoop && _mode == mode;
    }

    // Returns at that time; false, at once, when the delivery has ended.
    bool awaitTime(std::chrono::steady_clock::time_point time) {
        const platform::MutexLock lock(_mutex);
        while (!_hasEnded && std::chrono::steady_clock::now() < time) {
            _changed.waitUntil(_mutex, time);
        }
        return !_hasEnded;
    }
    // Returns when less than kMostWaiting reports wait; false when the delivery has ended.
    bool awaitRoom() {
        const platform::MutexLock lock(_mutex);
        while (!_hasEnded && _waiting.size() >= kMostWaiting) {
            _changed.wait(_mutex);
        }
        return !_hasEnded;
    }
    // False when the delivery has ended: then the report is lost.
    bool add(Report report) {
        {
            const platform::MutexLock lock(_mutex);
            if (_hasEnded) {
                return false;
            }
            _waiting.push_back(std::move(report));
        }
        _source->signal();
        return true;
    }

    // The loop loses its source, and the reports that wait are not received; one that is being received goes on.
    void end() {
        {
            const platform::MutexLock lock(_mutex);
            _hasEnded = true;
            _changed.notifyAll();
        }
        const auto runLoop = _runLoop.lock();
        if (runLoop != nullptr && _source != nullptr) {  // null when there was no memory for it
            runLoop->removeSource(_source, _mode);
        }
    }

  private:
    ReportDelivery(const std::shared_ptr<platform::RunLoop>& runLoop, std::string_view mode)
        : _runLoop(runLoop), _mode(mode) {}

    void _receiveOne(const Receive& receive) {
        Report report;
        bool more;
        {
            const platform::MutexLock lock(_mutex);
            if (_hasEnded || _waiting.empty()) {
                return;
            }
            report = std::move(_waiting.front());
            _waiting.pop_front();
            more = !_waiting.empty();
            _changed.notifyAll();
        }
        if (more) {
            _source->signal();
        }
        if (!receive(report)) {
            end();
        }
    }

    const std::weak_ptr<platform::RunLoop> _runLoop;
    const std::string _mode;
    std::shared_ptr<platform::RunLoopSource> _source;

    platform::Mutex _mutex;
    platform::Condition _changed;
    std::deque<Report> _waiting ZR_GUARDED_BY(_mutex);
    bool _hasEnded ZR_GUARDED_BY(_mutex) = false;
};

// ReportCallback: the function that a client set to receive a device's reports.
//
// Threads  Any. No lock is held while a client's function is called or destroyed.
class ReportCallback {
  public:
    // An empty function removes the one before.
    void set(WLHIDInputReportCallback callback) {
        std::shared_ptr<const WLHIDInputReportCallback> other;
        if (callback) {
            other = std::make_shared<const WLHIDInputReportCallback>(std::move(callback));
        }
        const platform::MutexLock lock(_mutex);
        _callback.swap(other);
    }

    // Does nothing when there is none.
    void call(std::int64_t reportID,
              std::span<const std::byte> data,
              const platform::ErrorRef& error) {
        std::shared_ptr<const WLHIDInputReportCallback> callback;
        {
            const platform::MutexLock lock(_mutex);
            callback = _callback;
        }
        if (callback != nullptr) {
            (*callback)(reportID, data, error);
        }
    }

  private:
    platform::Mutex _mutex;
    std::shared_ptr<const WLHIDInputReportCallback> _callback ZR_GUARDED_BY(_mutex);
};

}  // namespace devices

#endif
