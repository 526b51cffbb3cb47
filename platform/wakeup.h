// Wakeup: what one thread waits on until another wakes it.
#ifndef ZR_PLATFORM_WAKEUP_H
#define ZR_PLATFORM_WAKEUP_H

#include <atomic>
#include <chrono>
#include <cstdint>

#include "platform/sync.h"

namespace platform {

// Waking a sleeping thread costs both sides microseconds. So a wait that follows a short one first watches
// for its end without sleeping, and lets others have the processor meanwhile: who is to wake this thread
// may wait for the same core.
class Wakeup {
  public:
    // Returns when wake() has been called since the last wait returned, once for any number of calls. One
    // thread at a time.
    void wait() {
        const auto begin = Clock::now();
        if (_lastWaitWasShort) {
            while (_word.load(std::memory_order_relaxed) == Unset &&
                   Clock::now() - begin < kShort) {
                yieldProcessor();
            }
        }
        if (_word.replace(Unset, Asleep, std::memory_order_acquire)) {
            while (_word.load(std::memory_order_acquire) == Asleep) {
                _word.sleepAt(Asleep);
            }
        }
        _word.exchange(Unset, std::memory_order_acquire);
        _lastWaitWasShort = Clock::now() - begin < kShort;
    }

    // Any thread. The object must live until this returns, even if the waiting thread goes on before.
    void wake() {
        if (_word.exchange(Set, std::memory_order_acq_rel) == Asleep) {
            _word.wakeOne();
        }
    }

  private:
    using Clock = std::chrono::steady_clock;
    // Ten times what it takes to wake a thread. With half of it, frames at full speed still put threads to
    // sleep on a slow machine.
    static constexpr std::chrono::microseconds kShort{40};

    enum State : std::uint32_t { Unset, Set, Asleep };

    SleepWord _word{Unset};
    bool _lastWaitWasShort = false;  // belongs to the waiting thread
};

}  // namespace platform

#endif
