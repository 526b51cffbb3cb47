#include "platform/work_queue.h"

#include <deque>
#include <map>
#include <optional>
#include <thread>
#include <utility>

#include <pthread.h>
#include <sys/resource.h>
#include <unistd.h>

#include "platform/deadline.h"
#include "platform/mutex.h"

namespace platform {

namespace {

using Clock = std::chrono::steady_clock;

constexpr std::size_t kThreadNameLength = 15;
constexpr int kUserInteractiveNice = -5;
constexpr int kBackgroundNice = 10;

// Runs `body` on a thread of its own that nobody joins. An exception that leaves it ends the process
// where it was thrown, so that the debugger shows the culprit.
template <class Body>
void startThread(Body body) {
    std::thread([body = std::move(body)]() noexcept { body(); }).detach();
}

void nameThisThread(const std::string& name) {
    pthread_setname_np(pthread_self(), name.substr(0, kThreadNameLength).c_str());
}

}  // namespace

// What the owner, the thread and the delayed items share. It outlives the owner, and its thread ends
// by itself, so that whoever drops the last reference never waits.
class WorkQueue::State : public std::enable_shared_from_this<State> {
  public:
    State(std::string name, Priority priorityClass)
        : label(std::move(name)), priority(priorityClass) {}

    const std::string label;
    const Priority priority;

    void push(Item item) {
        {
            const MutexLock lock(_mutex);
            if (!_hasThread) {  // first: should there be no thread to be had, nothing was queued
                startThread([self = shared_from_this()] { self->_serve(); });
                _hasThread = true;
            }
            _items.push_back(std::move(item));
        }
        _changed.notifyAll();
    }

    void ownerHasGone() {
        {
            const MutexLock lock(_mutex);
            _hasOwner = false;
        }
        _changed.notifyAll();
    }

  private:
    void _serve() {
        nameThisThread(label);
        // Refused without the right to raise a priority; the thread then keeps the one it has.
        setpriority(PRIO_PROCESS, static_cast<id_t>(gettid()),
                    priority == Priority::Background ? kBackgroundNice : kUserInteractiveNice);
        while (std::optional<Item> item = _next()) {
            (*item)();
        }
    }

    // The next item, as soon as there is one; nothing once none can come from the owner any more.
    std::optional<Item> _next() {
        const MutexLock lock(_mutex);
        while (_items.empty()) {
            if (!_hasOwner) {
                _hasThread = false;
                return std::nullopt;
            }
            _changed.wait(_mutex);
        }
        std::optional<Item> item(std::move(_items.front()));
        _items.pop_front();
        return item;
    }

    Mutex _mutex;
    Condition _changed;
    std::deque<Item> _items ZR_GUARDED_BY(_mutex);
    bool _hasThread ZR_GUARDED_BY(_mutex) = false;
    bool _hasOwner ZR_GUARDED_BY(_mutex) = true;
};

// Where the delayed items of all queues wait.
class WorkQueue::Timer {
  public:
    // Never destroyed: its thread may wait in it while the process exits.
    static Timer& shared() {
        static Timer& timer = *new Timer;
        return timer;
    }

    void add(Clock::time_point due, std::shared_ptr<State> queue, Item item) {
        const MutexLock lock(_mutex);
        if (!_hasThread) {
            startThread([this] { _serve(); });
            _hasThread = true;
        }
        const auto added = _pending.emplace(due, Delayed{std::move(queue), std::move(item)});
        if (added == _pending.begin()) {
            _changed.notifyAll();
        }
    }

  private:
    struct Delayed {
        std::shared_ptr<State> queue;
        Item item;
    };
    using Pending = std::multimap<Clock::time_point, Delayed>;  // of equal times, the first added

    void _serve() {
        nameThisThread("delayed items");
        while (Pending::node_type due = _next()) {
            due.mapped().queue->push(std::move(due.mapped().item));
        }
    }

    // The next item, as soon as it is due; nothing when none is pending.
    Pending::node_type _next() {
        const MutexLock lock(_mutex);
        while (!_pending.empty() && _pending.begin()->first > Clock::now()) {
            const Clock::time_point due = _pending.begin()->first;
            _changed.waitUntil(_mutex, due);
        }
        if (_pending.empty()) {
            _hasThread = false;
            return {};
        }
        return _pending.extract(_pending.begin());
    }

    Mutex _mutex;
    Condition _changed;
    Pending _pending ZR_GUARDED_BY(_mutex);
    bool _hasThread ZR_GUARDED_BY(_mutex) = false;
};

WorkQueue::WorkQueue(std::string label, Priority priority)
    : _state(std::make_shared<State>(std::move(label), priority)) {}
WorkQueue::~WorkQueue() {
    _state->ownerHasGone();
}

const std::string& WorkQueue::label() const {
    return _state->label;
}
WorkQueue::Priority WorkQueue::priority() const {
    return _state->priority;
}

void WorkQueue::async(Item item) {
    _state->push(std::move(item));
}

void WorkQueue::after(std::chrono::nanoseconds delay, Item item) {
    if (delay <= std::chrono::nanoseconds::zero()) {
        async(std::move(item));
    } else {
        Timer::shared().add(deadlineAfter(delay), _state, std::move(item));
    }
}

}  // namespace platform
