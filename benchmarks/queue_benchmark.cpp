// Serial queues: what queueing an item costs, an item's whole way, and waking a queue that sleeps.
#include <algorithm>
#include <array>
#include <chrono>
#include <memory>
#include <semaphore>
#include <string>
#include <thread>
#include <vector>

#include <benchmark/benchmark.h>

#include "benchmarks/allocations.h"
#include "benchmarks/queues.h"

namespace {

using Clock = std::chrono::steady_clock;
using queues::kUserInteractive;

double nanoseconds(Clock::duration duration) {
    return std::chrono::duration<double, std::nano>(duration).count();
}

// What the capture thread hands over: a buffer, a weak reference to the experiment, 24 bytes of time.
struct Captures {
    std::shared_ptr<std::int64_t> buffer = std::make_shared<std::int64_t>(0);
    std::weak_ptr<std::int64_t> owner = buffer;
    std::array<std::int64_t, 3> time{1, 2, 3};
};

template <class Queue>
void postOne(Queue& queue, const Captures& captures) {
    queue.async([buffer = captures.buffer, owner = captures.owner, time = captures.time] {
        if (owner.lock() != nullptr) {
            *buffer += time[2];
        }
    });
}

// Queues items while the worker is kept busy; they run outside the measured time.
template <class Queue>
void post(benchmark::State& state) {
    const queues::NiceScope scope(kUserInteractive);
    std::binary_semaphore begun(0);
    std::binary_semaphore release(0);
    std::binary_semaphore over(0);
    Queue queue(kUserInteractive);
    const Captures captures;
    std::uint64_t allocations = 0;
    const auto round = [&] {
        queue.async([&begun, &release] {
            begun.release();
            release.acquire();
        });
        begun.acquire();
        const std::uint64_t allocated = allocationsOfThisThread().count;
        const auto start = Clock::now();
        for (std::int64_t i = 0; i < state.range(0); ++i) {
            postOne(queue, captures);
        }
        const auto elapsed = Clock::now() - start;
        allocations += allocationsOfThisThread().count - allocated;
        queue.async([&over] { over.release(); });
        release.release();
        over.acquire();
        return elapsed;
    };
    round();  // what the queue keeps for later is there from now on
    allocations = 0;
    for (auto _ : state) {
        state.SetIterationTime(std::chrono::duration<double>(round()).count());
    }
    const auto items = state.iterations() * state.range(0);
    state.SetItemsProcessed(items);
    state.counters["allocations"] = static_cast<double>(allocations) / static_cast<double>(items);
}

// From the first item's queueing until the last one ran.
template <class Queue, int kPosterNice>
void through(benchmark::State& state) {
    const queues::NiceScope scope(kPosterNice);
    std::binary_semaphore over(0);
    Queue queue(kUserInteractive);
    const Captures captures;
    const double before = queues::contextSwitches();
    for (auto _ : state) {
        for (std::int64_t i = 1; i < state.range(0); ++i) {
            postOne(queue, captures);
        }
        queue.async([&over] { over.release(); });
        over.acquire();
    }
    const auto items = state.iterations() * state.range(0);
    state.SetItemsProcessed(items);
    state.counters["switches"] = (queues::contextSwitches() - before) / static_cast<double>(items);
}

double median(std::vector<double>& samples) {
    const auto middle = samples.begin() + static_cast<std::ptrdiff_t>(samples.size() / 2);
    std::nth_element(samples.begin(), middle, samples.end());
    return *middle;
}

// From queueing an item to its start on a worker that sleeps, and how long queueing took of that.
template <class Queue, int kPosterNice>
void wake(benchmark::State& state) {
    constexpr std::chrono::microseconds kUntilItSleeps{200};
    const queues::NiceScope scope(kPosterNice);
    std::binary_semaphore over(0);
    Clock::time_point started;
    Queue queue(kUserInteractive);
    std::vector<double> starts;
    std::vector<double> postings;
    for (auto _ : state) {
        std::this_thread::sleep_for(kUntilItSleeps);
        const auto before = Clock::now();
        queue.async([&started, &over] {
            started = Clock::now();
            over.release();
        });
        const auto posted = Clock::now();
        over.acquire();
        starts.push_back(nanoseconds(started - before));
        postings.push_back(nanoseconds(posted - before));
        state.SetIterationTime(starts.back() * 1e-9);
    }
    state.counters["start"] = median(starts);
    state.counters["posting"] = median(postings);
}

// A queue that is made, used once and dropped: the cost of a thread.
void unheldQueue(benchmark::State& state) {
    std::binary_semaphore over(0);
    for (auto _ : state) {
        platform::WorkQueue("benchmark", platform::WorkQueue::Priority::UserInteractive)
            .async([&over] { over.release(); });
        over.acquire();
    }
    state.SetItemsProcessed(state.iterations());
}
void bareThread(benchmark::State& state) {
    std::binary_semaphore over(0);
    for (auto _ : state) {
        std::thread([&over] { over.release(); }).detach();
        over.acquire();
    }
    state.SetItemsProcessed(state.iterations());
}

template <class Queue>
std::string named(const std::string& row) {
    return row + "/" + Queue::kName;
}

template <class Queue>
void registerWake() {
    benchmark::RegisterBenchmark(named<Queue>("wake").c_str(), wake<Queue, kUserInteractive>)
        ->Iterations(1000)
        ->UseManualTime();
}
template <class Queue>
void registerRaised() {
    benchmark::RegisterBenchmark(named<Queue>("through-raised").c_str(), through<Queue, 0>)
        ->Arg(20'000)
        ->UseRealTime();
    benchmark::RegisterBenchmark(named<Queue>("wake-raised").c_str(), wake<Queue, 0>)
        ->Iterations(1000)
        ->UseManualTime();
}

[[maybe_unused]] const bool registered = [] {
    queues::visitAll([]<class Queue>(Queue*) {
        benchmark::RegisterBenchmark(named<Queue>("post").c_str(), post<Queue>)
            ->Arg(1000)
            ->UseManualTime();
        benchmark::RegisterBenchmark(named<Queue>("through").c_str(),
                                     through<Queue, kUserInteractive>)
            ->Arg(20'000)
            ->UseRealTime();
        registerWake<Queue>();
    });
    // As many items as a device has buffers, or fewer: for the allocations.
    benchmark::RegisterBenchmark("post/here", post<queues::Here>)
        ->Arg(16)
        ->Iterations(1000)
        ->UseManualTime();
    registerWake<queues::BareFutex>();
    registerRaised<queues::Here>();
    registerRaised<queues::LockedDeque>();
    benchmark::RegisterBenchmark("thread/here", unheldQueue)->UseRealTime();
    benchmark::RegisterBenchmark("thread/bare thread", bareThread)->UseRealTime();
    return true;
}();

}  // namespace
