// What threads synchronize through: a mutex whose uses clang's thread-safety analysis checks, its scoped
// lock and its condition, atomics, semaphores, a word to sleep on, and the start of a thread. The platform
// and the module use nothing else, so that another header in place of this one sees, and can order, every
// step.
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

// A word that any thread may change and that threads can sleep on, on the bare system call: no lock is
// taken and none is taken back.
class SleepWord {
  public:
    explicit SleepWord(std::uint32_t value) : _word(value) {}

    std::uint32_t load(std::memory_order order) const { return _word.load(order); }
    std::uint32_t exchange(std::uint32_t value, std::memory_order order) {
        return _word.exchange(value, order);
    }
    // Whether the word was `expected`; it is `value` then.
    bool replace(std::uint32_t expected, std::uint32_t value, std::memory_order order) {
        return _word.compare_exchange_strong(expected, value, order);
    }

    // Sleeps when the word is `value`, until wakeOne(); may wake for no reason.
    void sleepAt(std::uint32_t value) { _futex(FUTEX_WAIT_PRIVATE, value); }
    void wakeOne() { _futex(FUTEX_WAKE_PRIVATE, 1); }

  private:
    void _futex(int operation, std::uint32_t value) {
        syscall(SYS_futex, &_word, operation, value, nullptr, nullptr, 0);
    }

    std::atomic<std::uint32_t> _word;
};

// Lets other threads have the processor.
inline void yieldProcessor() {
    sched_yield();
}

// Runs `body` on a thread of its own that is not joined. An exception that leaves it ends the process
// where it was thrown, so that the debugger shows the culprit. Throws std::system_error when no thread
// can be started.
template <class Body>
void startThread(Body body) {
    std::thread([body = std::move(body)]() mutable noexcept { body(); }).detach();
}

}  // namespace platform

#endif
