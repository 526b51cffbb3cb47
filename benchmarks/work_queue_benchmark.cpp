// What an item costs: queued in bursts, and from queueing it to knowing that it ran.
#include "platform/work_queue.h"

#include <condition_variable>
#include <deque>
#include <functional>
#include <latch>
#include <mutex>
#include <thread>

#include <benchmark/benchmark.h>

namespace {

// The least that a serial queue can be: a locked deque and a thread that is joined at the end.
class PlainQueue {
  public:
    ~PlainQueue() {
        {
            const std::lock_guard lock(_mutex);
            _over = true;
        }
        _changed.notify_one();
    }
    void async(std::function<void()> item) {
        {
            const std::lock_guard lock(_mutex);
            _items.push_back(std::move(item));
        }
        _changed.notify_one();
    }

  private:
    void _serve() {
        std::unique_lock lock(_mutex);
        while (true) {
            _changed.wait(lock, [this] { return _over || !_items.empty(); });
            if (_items.empty()) {
                return;
            }
            const auto item = std::move(_items.front());
            _items.pop_front();
            lock.unlock();
            item();
            lock.lock();
        }
    }

    std::mutex _mutex;
    std::condition_variable _changed;
    std::deque<std::function<void()>> _items;
    bool _over = false;
    std::jthread _thread{[this] { _serve(); }};
};

// An item as the capture thread queues one: it holds a reference to an object.
template <class Queue>
void queueBursts(benchmark::State& state, Queue& queue) {
    const auto items = state.range(0);
    const auto object = std::make_shared<std::int64_t>(0);
    for (auto _ : state) {
        std::latch done(1);
        for (std::int64_t i = 1; i < items; ++i) {
            queue.async([object] { ++*object; });
        }
        queue.async([object, &done] {
            ++*object;
            done.count_down();
        });
        done.wait();
    }
    state.SetItemsProcessed(state.iterations() * items);
}

void workQueue(benchmark::State& state) {
    platform::WorkQueue queue("benchmark", platform::WorkQueue::Priority::UserInteractive);
    const platform::WorkQueue::Hold hold(queue);
    queueBursts(state, queue);
}
void plainQueueBaseline(benchmark::State& state) {
    PlainQueue queue;
    queueBursts(state, queue);
}
BENCHMARK(workQueue)->Arg(1)->Arg(1000)->UseRealTime();
BENCHMARK(plainQueueBaseline)->Arg(1)->Arg(1000)->UseRealTime();

// A queue made, used once and dropped: the cost of a thread.
void workQueueOfOneItem(benchmark::State& state) {
    for (auto _ : state) {
        std::latch done(1);
        platform::WorkQueue("benchmark", platform::WorkQueue::Priority::UserInteractive)
            .async([&done] { done.count_down(); });
        done.wait();
    }
}
void threadBaseline(benchmark::State& state) {
    for (auto _ : state) {
        std::latch done(1);
        std::thread([&done] { done.count_down(); }).detach();
        done.wait();
    }
}
BENCHMARK(workQueueOfOneItem)->UseRealTime();
BENCHMARK(threadBaseline)->UseRealTime();

}  // namespace
