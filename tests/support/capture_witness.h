// Sees what an observed device delivers, and which rules it or its client breaks.
#ifndef ZR_TESTS_SUPPORT_CAPTURE_WITNESS_H
#define ZR_TESTS_SUPPORT_CAPTURE_WITNESS_H

#include <chrono>
#include <string>
#include <utility>
#include <vector>

#include "devices/observed/observer.h"
#include "platform/deadline.h"
#include "platform/sync.h"
#include "tests/support/eventually.h"

namespace test {

class CaptureWitness final : public observed::Observer {
  public:
    using Errors = std::vector<std::pair<std::string, platform::ErrorRef>>;

    void frameDelivered(const observed::DeliveredFrame& frame) override { _add(_frames, frame); }
    void eventDelivered(const observed::DeliveredEvent& event) override { _add(_events, event); }
    void errorReported(std::string_view call, const platform::ErrorRef& error) override {
        _add(_errors, {std::string(call), error});
    }
    void misused(std::string_view what) override { _add(_misuses, std::string(what)); }

    // What there was so far, once there is `count` of it; fewer when that does not come.
    std::vector<observed::DeliveredFrame> waitFor(std::size_t count) {
        return _wait(_frames, count);
    }
    std::vector<observed::DeliveredEvent> events() { return _wait(_events, 0); }
    Errors errors() { return _wait(_errors, 0); }
    std::vector<std::string> waitForMisuses(std::size_t count) { return _wait(_misuses, count); }

  private:
    template <class T>
    void _add(std::vector<T>& seen, T one) {
        const platform::MutexLock lock(_mutex);
        seen.push_back(std::move(one));
        _changed.notifyAll();
    }
    template <class T>
    std::vector<T> _wait(const std::vector<T>& seen, std::size_t count) {
        const auto deadline = platform::deadlineAfter(kGenerous);
        const platform::MutexLock lock(_mutex);
        while (seen.size() < count && std::chrono::steady_clock::now() < deadline) {
            _changed.waitUntil(_mutex, deadline);
        }
        return seen;
    }

    platform::Mutex _mutex;
    platform::Condition _changed;
    // Guarded by the mutex.
    std::vector<observed::DeliveredFrame> _frames;
    std::vector<observed::DeliveredEvent> _events;
    Errors _errors;
    std::vector<std::string> _misuses;
};

}  // namespace test

#endif
