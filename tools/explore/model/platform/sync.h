// In place of platform/sync.h when orders are explored: the same classes, on the scheduler.
#ifndef ZR_PLATFORM_SYNC_H
#define ZR_PLATFORM_SYNC_H

#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <utility>

#include "tools/explore/scheduler.h"

#define ZR_GUARDED_BY(mutex)
#define ZR_REQUIRES(mutex)

namespace platform {

class Mutex {
  public:
    ~Mutex() { interleavings::expect(!_locked, "a locked mutex is destroyed"); }

    void lock() {
        _object.step("lock");
        _take();
    }
    void unlock() {
        const bool isLeftOut = _object.isLeftOut();
        _give();
        if (!isLeftOut) {  // the mutex may have ended when others have gone
            interleavings::step("after unlock");
        }
    }
    bool tryLock() {
        _object.step("tryLock");
        return !std::exchange(_locked, true);
    }

  private:
    friend class Condition;
    void _take() {
        while (_locked) {
            _object.wait("lock");
        }
        _locked = true;
    }
    void _give() {
        interleavings::expect(_locked, "a mutex is unlocked that is not locked");
        _locked = false;
        _object.wakeAll();
    }

    interleavings::Object _object{"mutex"};
    bool _locked = false;
};

class MutexLock {
  public:
    explicit MutexLock(Mutex& mutex) : _mutex(mutex) { _mutex.lock(); }
    ~MutexLock() { _mutex.unlock(); }
    MutexLock(const MutexLock&) = delete;
    MutexLock& operator=(const MutexLock&) = delete;

  private:
    Mutex& _mutex;
};

class Condition {
  public:
    void wait(Mutex& mutex) { waitUntil(mutex, interleavings::TimePoint::max()); }
    void waitUntil(Mutex& mutex, interleavings::TimePoint deadline) {
        _object.step("wait");
        mutex._give();
        _object.wait("wait", deadline, true);
        mutex._take();
    }
    void notifyAll() {
        _object.step("notifyAll");
        _object.wakeAll();
    }

  private:
    interleavings::Object _object{"condition"};
};

template <class T>
class Atomic {
  public:
    Atomic(T value) : _value(value) {}  // NOLINT: as std::atomic

    T load(std::memory_order /*order*/ = std::memory_order_seq_cst) const {
        _object.step("load");
        return _value;
    }
    void store(T value, std::memory_order /*order*/ = std::memory_order_seq_cst) {
        _object.step("store");
        _value = value;
    }
    T exchange(T value, std::memory_order /*order*/ = std::memory_order_seq_cst) {
        _object.step("exchange");
        return std::exchange(_value, value);
    }
    T operator++() {
        _object.step("increment");
        return ++_value;
    }

  private:
    interleavings::Object _object{"atomic"};
    T _value;
};

class Semaphore {
  public:
    explicit Semaphore(std::ptrdiff_t count) : _count(count) {}

    void acquire() {
        _object.step("acquire");
        while (_count == 0) {
            _object.wait("acquire");
        }
        --_count;
    }
    void release() {
        _object.step("release");
        interleavings::expect(++_releases == 1, "a semaphore is signalled twice");
        ++_count;
        _object.wakeAll();
    }

  private:
    interleavings::Object _object{"semaphore"};
    std::ptrdiff_t _count;
    int _releases = 0;
};

class SleepWord {
  public:
    explicit SleepWord(std::uint32_t value) : _value(value) {}

    std::uint32_t load(std::memory_order /*order*/) const {
        _object.step("load");
        return _value;
    }
    std::uint32_t exchange(std::uint32_t value, std::memory_order /*order*/) {
        _object.step("exchange");
        return std::exchange(_value, value);
    }
    bool replace(std::uint32_t expected, std::uint32_t value, std::memory_order /*order*/) {
        _object.step("replace");
        if (_value != expected) {
            return false;
        }
        _value = value;
        return true;
    }
    void sleepAt(std::uint32_t value) {
        _object.step("sleepAt");
        if (_value == value) {
            _object.wait("sleepAt", interleavings::TimePoint::max(), true);
        }
    }
    void wakeOne() {
        _object.step("wakeOne");
        _object.wakeOne();
    }

  private:
    interleavings::Object _object{"sleep word"};
    std::uint32_t _value;
};

inline void yieldProcessor() {
    interleavings::yield();
}

template <class Body>
void startThread(Body body) {
    interleavings::start([body = std::make_shared<Body>(std::move(body))]() mutable {
        (*body)();
        body.reset();
    });
}

}  // namespace platform

#endif
