// Sees what a simulated device delivers and what its client does wrong.
#ifndef ZR_TESTS_SUPPORT_CAPTURE_WITNESS_H
#define ZR_TESTS_SUPPORT_CAPTURE_WITNESS_H

#include <chrono>
#include <string>
#include <vector>

#include "devices/observed/observer.h"
#include "platform/deadline.h"
#include "platform/mutex.h"

namespace test {

inline constexpr std::chrono::seconds kGenerous{60};

class CaptureWitness final : public observed::Observer {
  public:
    void frameDelivered(const observed::DeliveredFrame& frame) override {
        const platform::MutexLock lock(_mutex);
        _frames.push_back(frame);
        _changed.notifyAll();
    }
    void misused(std::string_view what) override {
        const platform::MutexLock lock(_mutex);
        _misuses.emplace_back(what);
        _changed.notifyAll();
    }

    // What there was so far, once there is `count` of it; fewer when that does not come.
    std::vector<observed::DeliveredFrame> waitFor(std::size_t count) {
        return _wait(_frames, count);
    }
    std::vector<std::string> waitForMisuses(std::size_t count) { return _wait(_misuses, count); }

  private:
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
    std::vector<std::string> _misuses;
};

}  // namespace test

#endif
