// Sees what a simulated device delivers and what its client does wrong.
#ifndef ZR_TESTS_SUPPORT_CAPTURE_WITNESS_H
#define ZR_TESTS_SUPPORT_CAPTURE_WITNESS_H

#include <chrono>
#include <string>
#include <vector>

#include "platform/deadline.h"
#include "platform/mutex.h"
#include "simulator/observer.h"

namespace test {

inline constexpr std::chrono::seconds kGenerous{60};

class CaptureWitness final : public simulator::Observer {
  public:
    void frameDelivered(const simulator::DeliveredFrame& frame) override {
        const platform::MutexLock lock(_mutex);
        _frames.push_back(frame);
        _changed.notifyAll();
    }
    void misused(std::string_view what) override {
        const platform::MutexLock lock(_mutex);
        _misuses.emplace_back(what);
    }

    // The frames so far, once there are `count` of them; fewer when they do not come.
    std::vector<simulator::DeliveredFrame> waitFor(std::size_t count) {
        const auto deadline = platform::deadlineAfter(kGenerous);
        const platform::MutexLock lock(_mutex);
        while (_frames.size() < count && std::chrono::steady_clock::now() < deadline) {
            _changed.waitUntil(_mutex, deadline);
        }
        return _frames;
    }
    std::vector<std::string> misuses() {
        const platform::MutexLock lock(_mutex);
        return _misuses;
    }

  private:
    platform::Mutex _mutex;
    platform::Condition _changed;
    std::vector<simulator::DeliveredFrame> _frames ZR_GUARDED_BY(_mutex);
    std::vector<std::string> _misuses ZR_GUARDED_BY(_mutex);
};

}  // namespace test

#endif
