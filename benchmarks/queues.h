// The contenders for a serial queue: WorkQueue, and what an engineer would use instead. Each runs its items
// in order on one thread, at the nice level that it is made with if the process may have it; its destructor
// runs what is queued and then ends the thread.
#ifndef ZR_BENCHMARKS_QUEUES_H
#define ZR_BENCHMARKS_QUEUES_H

#include <asio.hpp>
#include <atomic>
#include <condition_variable>
#include <deque>
#include <functional>
#include <mutex>
#include <thread>
#include <utility>

#include <concurrentqueue/blockingconcurrentqueue.h>
#include <linux/futex.h>
#include <oneapi/tbb/flow_graph.h>
#include <oneapi/tbb/global_control.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "platform/work_queue.h"

namespace queues {

// The level of a UserInteractive WorkQueue.
inline constexpr int kUserInteractive = -5;
inline constexpr int kBackground = 10;

// Refused without the privilege to raise a priority; the thread keeps its level then.
inline void setNice(int nice) {
    setpriority(PRIO_PROCESS, static_cast<id_t>(gettid()), nice);
}

// Context switches of the process since it started.
inline double contextSwitches() {
    rusage used{};
    getrusage(RUSAGE_SELF, &used);
    return static_cast<double>(used.ru_nvcsw + used.ru_nivcsw);
}

// Puts the calling thread at a level as long as it lives.
class NiceScope {
  public:
    explicit NiceScope(int nice) { setNice(nice); }
    ~NiceScope() { setNice(_before); }
    NiceScope(const NiceScope&) = delete;
    NiceScope& operator=(const NiceScope&) = delete;

  private:
    const int _before = getpriority(PRIO_PROCESS, static_cast<id_t>(gettid()));
};

class Here {
  public:
    static constexpr const char* kName = "here";
    explicit Here(int nice)
        : _queue("benchmark",
                 nice == kBackground ? platform::WorkQueue::Priority::Background
                                     : platform::WorkQueue::Priority::UserInteractive) {}
    template <class Item>
    void async(Item item) {
        _queue.async(std::move(item));
    }

  private:
    platform::WorkQueue _queue;
    platform::WorkQueue::Hold _hold{_queue};
};

class LockedDeque {
  public:
    static constexpr const char* kName = "mutex+deque";
    explicit LockedDeque(int nice) : _thread([this, nice] { _serve(nice); }) {}
    ~LockedDeque() { async(nullptr); }
    void async(std::function<void()> item) {
        {
            const std::lock_guard lock(_mutex);
            _items.push_back(std::move(item));
        }
        _changed.notify_one();
    }

  private:
    void _serve(int nice) {
        setNice(nice);
        while (const auto item = _next()) {
            item();
        }
    }
    std::function<void()> _next() {
        std::unique_lock lock(_mutex);
        _changed.wait(lock, [this] { return !_items.empty(); });
        auto item = std::move(_items.front());
        _items.pop_front();
        return item;
    }

    std::mutex _mutex;
    std::condition_variable _changed;
    std::deque<std::function<void()>> _items;
    std::jthread _thread;
};

class AsioContext {
  public:
    static constexpr const char* kName = "asio io_context";
    explicit AsioContext(int nice)
        : _thread([this, nice] {
            setNice(nice);
            _context.run();
        }) {}
    ~AsioContext() { _work.reset(); }
    template <class Item>
    void async(Item item) {
        asio::post(_context, std::move(item));
    }

  protected:
    asio::io_context _context{1};  // one thread runs it

  private:
    asio::executor_work_guard<asio::io_context::executor_type> _work{_context.get_executor()};
    std::jthread _thread;
};

class AsioStrand : public AsioContext {
  public:
    static constexpr const char* kName = "asio strand";
    using AsioContext::AsioContext;
    template <class Item>
    void async(Item item) {
        asio::post(_strand, std::move(item));
    }

  private:
    asio::strand<asio::io_context::executor_type> _strand{_context.get_executor()};
};

class TbbSerialNode {
  public:
    static constexpr const char* kName = "tbb serial node";
    explicit TbbSerialNode(int nice) {
        async([nice] { setNice(nice); });
    }
    ~TbbSerialNode() { _graph.wait_for_all(); }
    void async(std::function<void()> item) { _node.try_put(std::move(item)); }

  private:
    using Item = std::function<void()>;
    // The posting thread and one worker, which the process keeps.
    tbb::global_control _threads{tbb::global_control::max_allowed_parallelism, 2};
    tbb::flow::graph _graph;
    tbb::flow::function_node<Item> _node{_graph, tbb::flow::serial, [](const Item& item) {
                                             item();
                                             return tbb::flow::continue_msg();
                                         }};
};

class ConcurrentQueue {
  public:
    static constexpr const char* kName = "moodycamel (lock-free)";
    explicit ConcurrentQueue(int nice) : _thread([this, nice] { _serve(nice); }) {}
    ~ConcurrentQueue() { async(nullptr); }
    void async(std::function<void()> item) { _items.enqueue(std::move(item)); }

  private:
    void _serve(int nice) {
        setNice(nice);
        while (true) {
            std::function<void()> item;
            _items.wait_dequeue(item);
            if (item == nullptr) {
                return;
            }
            item();
        }
    }

    moodycamel::BlockingConcurrentQueue<std::function<void()>> _items;
    std::jthread _thread;
};

// Not a queue: room for one item, and what the operating system needs to wake a thread for it.
class BareFutex {
  public:
    static constexpr const char* kName = "bare futex";
    explicit BareFutex(int nice) : _thread([this, nice] { _serve(nice); }) {}
    ~BareFutex() { async(nullptr); }
    void async(std::function<void()> item) {
        _item = std::move(item);
        _word.store(1, std::memory_order_release);
        syscall(SYS_futex, &_word, FUTEX_WAKE_PRIVATE, 1, nullptr, nullptr, 0);
    }

  private:
    void _serve(int nice) {
        setNice(nice);
        while (true) {
            while (_word.load(std::memory_order_acquire) == 0) {
                syscall(SYS_futex, &_word, FUTEX_WAIT_PRIVATE, 0, nullptr, nullptr, 0);
            }
            const auto item = std::move(_item);
            _word.store(0, std::memory_order_release);
            if (item == nullptr) {
                return;
            }
            item();
        }
    }

    std::function<void()> _item;
    std::atomic<std::uint32_t> _word{0};
    std::jthread _thread;
};

// Calls `visit` with a null pointer of each contender's type.
template <class... Queues, class Visit>
void visitEach(Visit visit) {
    (visit(static_cast<Queues*>(nullptr)), ...);
}
template <class Visit>
void visitAll(Visit visit) {
    visitEach<Here, LockedDeque, AsioContext, AsioStrand, TbbSerialNode, ConcurrentQueue>(visit);
}

}  // namespace queues

#endif
