// What threads synchronize through: a mutex whose uses clang's thread-safety analysis checks, its scoped
// lock and its condition, atomics, semaphores, a wake-up for one thread, and the start of a thread. The
// platform and the module use nothing else, so that another header in place of this one sees, and can
// order, every step.
//
// Fields say which mutex guards them with ZR_GUARDED_BY; functions that need it held with
// ZR_REQUIRES. Under other compilers the annotations expand to nothing.
#ifndef ZR_PLATFORM_SYNC_H
#define ZR_PLATFORM_SYNC_H

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <mutex>
#include <semaphore>
#include <thread>
#include <utility>

#include <linux/futex.h>
#include <sched.h>
#include <sys/syscall.h>
#include <unistd.h>

#if defined(__clang__)
#define ZR_THREAD_ANNOTATION(x) __attribute__((x))
#else
#define ZR_THREAD_ANNOTATION(x)
#endif
#define ZR_CAPABILITY(name) ZR_THREAD_ANNOTATION(capability(name))
#define ZR_SCOPED_CAPABILITY ZR_THREAD_ANNOTATION(scoped_lockable)
#define ZR_GUARDED_BY(mutex) ZR_THREAD_ANNOTATION(guarded_by(mutex))
#define ZR_REQUIRES(mutex) ZR_THREAD_ANNOTATION(requires_capability(mutex))
#define ZR_ACQUIRE(...) ZR_THREAD_ANNOTATION(acquire_capability(__VA_ARGS__))
#define ZR_RELEASE(...) ZR_THREAD_ANNOTATION(release_capability(__VA_ARGS__))
#define ZR_TRY_ACQUIRE(...) ZR_THREAD_ANNOTATION(try_acquire_capability(__VA_ARGS__))
#define ZR_RETURNS_MUTEX(mutex) ZR_THREAD_ANNOTATION(lock_returned(mutex))

namespace platform {

class ZR_CAPABILITY("mutex") Mutex {
  public:
    Mutex() = default;
    Mutex(const Mutex&) = delete;
    Mutex& operator=(const Mutex&) = delete;

    void lock() ZR_ACQUIRE() { _mutex.lock(); }
    void unlock() ZR_RELEASE() { _mutex.unlock(); }
    bool tryLock() ZR_TRY_ACQUIRE(true) { return _mutex.try_lock(); }

  private:
    friend class Condition;
    std::mutex _mutex;
};

class ZR_SCOPED_CAPABILITY MutexLock {
  public:
    explicit MutexLock(Mutex& mutex) ZR_ACQUIRE(mutex) : _mutex(mutex) { _mutex.lock(); }
    ~MutexLock() ZR_RELEASE() { _mutex.unlock(); }
    MutexLock(const MutexLock&) = delete;
    MutexLock& operator=(const MutexLock&) = delete;

  private:
    Mutex& _mutex;
};

// Waits give the mutex up and hold it again when they return; they may wake for no reason.
class Condition {
  public:
    void wait(Mutex& mutex) ZR_REQUIRES(mutex) {
        Held held(mutex._mutex);
        _condition.wait(held.lock);
    }
    // Waits until notified or `deadline`; the clock's last time point means no limit.
    void waitUntil(Mutex& mutex, std::chrono::steady_clock::time_point deadline)
        ZR_REQUIRES(mutex) {
        Held held(mutex._mutex);
        if (deadline == std::chrono::steady_clock::time_point::max()) {
            _condition.wait(held.lock);
        } else {
            _condition.wait_until(held.lock, deadline);
        }
    }
    void notifyAll() { _condition.notify_all(); }

  private:
    // Lends an already locked mutex to the standard library and takes it back still locked.
    struct Held {
        explicit Held(std::mutex& mutex) : lock(mutex, std::adopt_lock) {}
        ~Held() { lock.release(); }
        std::unique_lock<std::mutex> lock;
    };
    std::condition_variable _condition;
};

template <class T>
using Atomic = std::atomic<T>;

using Semaphore = std::counting_semaphore<>;

// What one thread waits on until another wakes it. The thread sleeps on the bare system call: no lock is
// taken and none is taken back.
//
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
                sched_yield();
            }
        }
        std::uint32_t seen = Unset;
        if (_word.compare_exchange_strong(seen, Asleep, std::memory_order_acquire)) {
            while (_word.load(std::memory_order_acquire) == Asleep) {
                _futex(FUTEX_WAIT_PRIVATE, Asleep);
            }
        }
        _word.exchange(Unset, std::memory_order_acquire);
        _lastWaitWasShort = Clock::now() - begin < kShort;
    }

    // Any thread. The object must live until this returns, even if the waiting thread goes on before.
    void wake() {
        if (_word.exchange(Set, std::memory_order_acq_rel) == Asleep) {
            _futex(FUTEX_WAKE_PRIVATE, 1);
        }
    }

  private:
    using Clock = std::chrono::steady_clock;
    // Ten times what it takes to wake a thread. With half of it, frames at full speed still put threads to
    // sleep on a slow machine.
    static constexpr std::chrono::microseconds kShort{40};

    enum State : std::uint32_t { Unset, Set, Asleep };

    void _futex(int operation, std::uint32_t value) {
        syscall(SYS_futex, &_word, operation, value, nullptr, nullptr, 0);
    }

    std::atomic<std::uint32_t> _word{Unset};
    bool _lastWaitWasShort = false;  // belongs to the waiting thread
};

// Runs `body` on a thread of its own that is not joined. An exception that leaves it ends the process
// where it was thrown, so that the debugger shows the culprit. Throws std::system_error when no thread
// can be started.
template <class Body>
void startThread(Body body) {
    std::thread([body = std::move(body)]() mutable noexcept { body(); }).detach();
}

}  // namespace platform

#endif
