// In place of platform/sync.h under Relacy, which also explores what weak memory orders allow. Only what the
// work queue uses. An object that is made outside of an execution is set up anew in each.
#ifndef ZR_PLATFORM_SYNC_H
#define ZR_PLATFORM_SYNC_H

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <utility>
#include <vector>

#define ZR_GUARDED_BY(mutex)
#define ZR_REQUIRES(mutex)

namespace weak_memory {

using TimePoint = std::chrono::steady_clock::time_point;

inline TimePoint now;

// Where a line of the product stands does not matter to an execution.
inline rl::debug_info place() {
    return $;
}

struct Lasting {
    virtual void endExecution() = 0;

  protected:
    ~Lasting() = default;
};
inline std::vector<Lasting*> lasting;              // objects made outside of an execution
inline std::vector<std::function<void()>> bodies;  // of threads started outside of an execution

template <class T>
class Made final : public Lasting {
  public:
    Made() {
        if (rl::is_ctx()) {
            _object.emplace();
        } else {
            lasting.push_back(this);
        }
    }
    ~Made() {
        if (!rl::is_ctx()) {
            std::erase(lasting, this);
        }
    }
    Made(const Made&) = delete;
    Made& operator=(const Made&) = delete;

    T& operator*() {
        if (!_object.has_value()) {
            _object.emplace();
        }
        return *_object;
    }
    void endExecution() override { _object.reset(); }

  private:
    std::optional<T> _object;
};

constexpr rl::memory_order order(std::memory_order order) {
    switch (order) {
        case std::memory_order_relaxed:
            return rl::mo_relaxed;
        case std::memory_order_consume:
        case std::memory_order_acquire:
            return rl::mo_acquire;
        case std::memory_order_release:
            return rl::mo_release;
        case std::memory_order_acq_rel:
            return rl::mo_acq_rel;
        default:
            return rl::mo_seq_cst;
    }
}

}  // namespace weak_memory

namespace platform {

class Mutex {
  public:
    void lock() {
        if (rl::is_ctx()) {
            (*_mutex).lock(weak_memory::place());
        }
    }
    void unlock() {
        if (rl::is_ctx()) {
            (*_mutex).unlock(weak_memory::place());
        }
    }

  private:
    friend class Condition;
    weak_memory::Made<rl::mutex> _mutex;
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
    void wait(Mutex& mutex) { (*_condition).wait(*mutex._mutex, weak_memory::place()); }
    // May end at once: the deadline is then past.
    void waitUntil(Mutex& mutex, weak_memory::TimePoint deadline) {
        (*_condition).wait_until(*mutex._mutex, 0, weak_memory::place());
        weak_memory::now = std::max(weak_memory::now, deadline);
    }
    void notifyAll() {
        if (rl::is_ctx()) {
            (*_condition).notify_all(weak_memory::place());
        }
    }

  private:
    weak_memory::Made<rl::condition_variable> _condition;
};

class SleepWord {
  public:
    explicit SleepWord(std::uint32_t value) {
        if (rl::is_ctx()) {
            (*_word).store(value, rl::mo_relaxed, weak_memory::place());
        }
    }

    std::uint32_t load(std::memory_order order) {
        return (*_word).load(weak_memory::order(order), weak_memory::place());
    }
    std::uint32_t exchange(std::uint32_t value, std::memory_order order) {
        return rl::is_ctx()
                   ? (*_word).exchange(value, weak_memory::order(order), weak_memory::place())
                   : value;
    }
    bool replace(std::uint32_t expected, std::uint32_t value, std::memory_order order) {
        return (*_word).compare_exchange_strong(expected, value, weak_memory::order(order),
                                                weak_memory::place());
    }
    // As the kernel does it: the word is read under the lock that a waker takes.
    void sleepAt(std::uint32_t value) {
        const MutexLock lock(_kernel);
        if ((*_word).load(rl::mo_relaxed, weak_memory::place()) == value) {
            _woken.wait(_kernel);
        }
    }
    void wakeOne() {
        const MutexLock lock(_kernel);
        _woken.notifyAll();
    }

  private:
    weak_memory::Made<rl::atomic<std::uint32_t>> _word;
    Mutex _kernel;
    Condition _woken;
};

inline void yieldProcessor() {
    weak_memory::now += std::chrono::microseconds(40);
    rl::ctx().yield(1, weak_memory::place());
}

template <class Body>
void startThread(Body body) {
    if (!rl::is_ctx()) {
        weak_memory::bodies.push_back(std::move(body));
        return;
    }
    auto* kept = new Body(std::move(body));
    rl::ctx().create_thread(
        [](void* kept) -> void* {
            const std::unique_ptr<Body> body(static_cast<Body*>(kept));
            (*body)();
            return nullptr;
        },
        kept);
}

}  // namespace platform

#endif
