#include "platform/work_queue.h"

#include <algorithm>
#include <exception>
#include <map>
#include <optional>
#include <utility>

#include <pthread.h>
#include <sys/resource.h>
#include <unistd.h>

#include "platform/deadline.h"
#include "platform/item_line.h"
#include "platform/run_tag.h"
#include "platform/sync.h"
#include "platform/wakeup.h"

namespace platform {

namespace {

using Clock = std::chrono::steady_clock;

constexpr std::size_t kThreadNameLength = 15;
constexpr int kUserInteractiveNice = -5;
constexpr int kBackgroundNice = 10;

// How long a queue with due items waits for another attempt to start its thread.
constexpr std::chrono::milliseconds kRetryDelay{10};

// Linux keeps 15 characters: the last ones, because labels that belong together begin alike.
void nameThisThread(const std::string& name) {
    const std::size_t kept = std::min(name.size(), kThreadNameLength);
    pthread_setname_np(pthread_self(), name.c_str() + name.size() - kept);
}

}  // namespace

// What the owner, the holds, the thread and the delayed items share. It outlives the owner, and its
// thread ends by itself, so that dropping the last reference never waits.
class WorkQueue::State : public std::enable_shared_from_this<State> {
  public:
    State(std::string name, Priority priorityClass)
        : label(std::move(name)), priority(priorityClass) {}

    const std::string label;
    const Priority priority;

    void push(WorkItem&& item, RunTag run) {
        // Once the lock is given up, the item may have run and dropped every other reference.
        std::shared_ptr<State> waiting;
        {
            const MutexLock lock(_mutex);
            _needThread();  // first: if none can be started, nothing was queued
            _items.add(std::move(item), run);
            if (std::exchange(_isWaiting, false)) {
                waiting = shared_from_this();
            }
        }
        if (waiting != nullptr) {
            waiting->_wakeup.wake();
        }
    }

    // Queues a delayed item whose time has come, or nothing when there is none. False when no
    // thread can be started for what is queued: it stays queued until a later call succeeds.
    bool pushDue(std::optional<Queued> item) {
        {
            const MutexLock lock(_mutex);
            if (item.has_value()) {
                _items.add(std::move(item->item), item->run);
            }
            try {
                if (!_items.isEmpty()) {
                    _needThread();
                }
            } catch (const std::exception&) {
                return false;
            }
            _isWaiting = false;
        }
        _wakeup.wake();
        return true;
    }

    void hold() {
        const MutexLock lock(_mutex);
        _needThread();
        ++_holds;
    }
    void release() {
        {
            const MutexLock lock(_mutex);
            --_holds;
        }
        _wakeup.wake();
    }

  private:
    void _needThread() ZR_REQUIRES(_mutex) {
        if (!_hasThread) {
            startThread([self = shared_from_this()] { self->_serve(); });
            _hasThread = true;
        }
    }

    void _serve() {
        nameThisThread(label);
        // Refused without the privilege to raise priorities; the thread then keeps the one it has.
        setpriority(PRIO_PROCESS, static_cast<id_t>(gettid()),
                    priority == Priority::Background ? kBackgroundNice : kUserInteractiveNice);
        ItemLine taken;
        while (_takeAll(taken)) {
            taken.run();
        }
    }

    // Moves the items into `taken`, which is empty, as soon as there are any; false when the thread is to
    // end. That is decided under the lock that saw the queue empty: an item that comes later starts
    // another thread.
    bool _takeAll(ItemLine& taken) {
        while (true) {
            {
                const MutexLock lock(_mutex);
                _isWaiting = false;
                if (!_items.isEmpty()) {
                    taken.takeAll(_items);
                    return true;
                }
                if (_holds == 0) {
                    _hasThread = false;
                    return false;
                }
                _isWaiting = true;
            }
            _wakeup.wait();
        }
    }

    Mutex _mutex;
    Wakeup _wakeup;
    ItemLine _items ZR_GUARDED_BY(_mutex);
    bool _hasThread ZR_GUARDED_BY(_mutex) = false;
    bool _isWaiting ZR_GUARDED_BY(_mutex) = false;  // and not woken yet
    std::size_t _holds ZR_GUARDED_BY(_mutex) = 0;
};

// Where the delayed items of all queues wait.
class WorkQueue::Timer {
  public:
    // Never destroyed: its thread may wait in it while the process exits.
    static Timer& shared() {
        static Timer& timer = *new Timer;
        return timer;
    }

    void add(Clock::time_point due, std::shared_ptr<State> queue, Queued item) {
        const MutexLock lock(_mutex);
        _needThread();
        const auto added = _pending.emplace(due, Delayed{std::move(queue), std::move(item)});
        if (added == _pending.begin()) {
            _changed.notifyAll();
        }
    }

    void hold() {
        const MutexLock lock(_mutex);
        _needThread();
        ++_holds;
    }
    void release() {
        const MutexLock lock(_mutex);
        --_holds;
        _changed.notifyAll();
    }

  private:
    struct Delayed {
        std::shared_ptr<State> queue;
        // Nothing when it was queued already, but no thread could be started for it.
        std::optional<Queued> item;
    };
    using Pending = std::multimap<Clock::time_point, Delayed>;  // of equal times, the first added

    void _needThread() ZR_REQUIRES(_mutex) {
        if (!_hasThread) {
            startThread([this] { _serve(); });
            _hasThread = true;
        }
    }

    void _serve() {
        nameThisThread("delayed items");
        while (Pending::node_type due = _next()) {
            Delayed& delayed = due.mapped();
            if (!delayed.queue->pushDue(std::exchange(delayed.item, std::nullopt))) {
                due.key() = Clock::now() + kRetryDelay;
                const MutexLock lock(_mutex);
                _pending.insert(std::move(due));
            }
        }
    }

    // The next item, as soon as it is due; nothing when the thread is to end.
    Pending::node_type _next() {
        const MutexLock lock(_mutex);
        while (true) {
            if (_pending.empty()) {
                if (_holds == 0) {
                    _hasThread = false;
                    return {};
                }
                _changed.wait(_mutex);
            } else if (const auto due = _pending.begin()->first; due > Clock::now()) {
                _changed.waitUntil(_mutex, due);
            } else {
                return _pending.extract(_pending.begin());
            }
        }
    }

    Mutex _mutex;
    Condition _changed;
    Pending _pending ZR_GUARDED_BY(_mutex);
    bool _hasThread ZR_GUARDED_BY(_mutex) = false;
    std::size_t _holds ZR_GUARDED_BY(_mutex) = 0;
};

WorkQueue::Hold::Hold(const WorkQueue& queue) : _state(queue._state) {
    _state->hold();
    try {
        Timer::shared().hold();
    } catch (...) {
        _state->release();
        throw;
    }
}
WorkQueue::Hold::~Hold() {
    Timer::shared().release();
    _state->release();
}

WorkQueue::WorkQueue(std::string label, Priority priority)
    : _state(std::make_shared<State>(std::move(label), priority)) {}
WorkQueue::~WorkQueue() = default;

const std::string& WorkQueue::label() const {
    return _state->label;
}
WorkQueue::Priority WorkQueue::priority() const {
    return _state->priority;
}

void WorkQueue::async(Item&& item) {
    _state->push(std::move(item), currentRunTag());
}

void WorkQueue::after(std::chrono::duration<double> delay, Item&& item) {
    if (delay.count() > 0) {
        Timer::shared().add(deadlineAfter(delay), _state, {std::move(item), currentRunTag()});
    } else {
        async(std::move(item));
    }
}

}  // namespace platform
