// The wake-up and the work queue under Relacy: what weak memory orders allow, which the scheduler of the other
// programs does not show.
//
//   weak_memory [PREEMPTIONS [ORDERS]]    every execution with at most that many (2), then random ones (20000)
//
// At the first failure it prints Relacy's history of the execution, step by step, and ends with status 1. Delayed
// items are not among the tests: Relacy gives up executions that wait with a time limit, which leaves the
// timer as it was.
//
// Relacy wants to see everything in one translation unit, and its own operator new in all of it.
#include <algorithm>
#include <array>
#include <atomic>
#include <chrono>
#include <concepts>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <functional>
#include <iostream>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <type_traits>
#include <utility>
#include <vector>

#include <pthread.h>
#include <sys/resource.h>
#include <unistd.h>

// Not relacy.hpp: it makes macros of new, delete and the memory orders.
// clang-format off: each needs those before it
#include <relacy/atomic.hpp>
#include <relacy/atomic_fence.hpp>
#include <relacy/base.hpp>
#include <relacy/context.hpp>
#include <relacy/context_base_impl.hpp>
#include <relacy/stdlib/condition_variable.hpp>
#include <relacy/stdlib/event.hpp>
#include <relacy/stdlib/mutex.hpp>
#include <relacy/stdlib/semaphore.hpp>
#include <relacy/test_suite.hpp>
#include <relacy/thread_local.hpp>
#include <relacy/var.hpp>
// clang-format on

#include "platform/sync.h"
//
#include "platform/number.cpp"
#include "platform/run_tag.cpp"
#include "platform/wakeup.h"
#include "platform/work_queue.cpp"

// The process keeps its name and its niceness.
std::chrono::steady_clock::time_point std::chrono::steady_clock::now() noexcept {
    return weak_memory::now;
}
extern "C" int pthread_setname_np(pthread_t /*thread*/, const char* /*name*/) noexcept {
    return 0;
}
extern "C" int setpriority(__priority_which_t /*which*/, id_t /*who*/, int /*priority*/) noexcept {
    return 0;
}

namespace {

using platform::WorkQueue;

unsigned ended = 0;  // executions that came to their end

template <class Derived, rl::thread_id_t staticThreads, rl::thread_id_t dynamicThreads>
struct Suite : rl::test_suite<Derived, staticThreads> {
    static rl::thread_id_t const dynamic_thread_count = dynamicThreads;

    void before() { weak_memory::now = {}; }
    void after() {
        ++ended;
        for (weak_memory::Lasting* object : weak_memory::lasting) {
            object->endExecution();
        }
        static_cast<Derived*>(this)->check();
    }
};

// What a thread wrote before wake() is seen after wait(): twice in a row.
struct WakeupPublishes : Suite<WakeupPublishes, 2, 0> {
    platform::Wakeup there;
    platform::Wakeup back;
    rl::var<int> data;

    void thread(unsigned index) {
        for (int round = 0; round < 2; ++round) {
            if (index == 0) {
                data($) = round;
                there.wake();
                back.wait();
            } else {
                there.wait();
                RL_ASSERT(data($) == round);
                back.wake();
            }
        }
    }
    void check() {}
};

// Two threads post; the items count.
struct TwoPosters : Suite<TwoPosters, 2, 4> {
    std::optional<WorkQueue> queue;
    rl::var<int> ran;

    void before() {
        Suite::before();
        ran($) = 0;
        queue.emplace("queue", WorkQueue::Priority::Background);
    }
    void thread(unsigned /*index*/) {
        queue->async([this] { ran($) = ran($) + 1; });
    }
    void check() {
        RL_ASSERT(ran($) == 2);
        queue.reset();
    }
};

// A thread holds the queue, posts and lets go of both.
struct HeldPoster : Suite<HeldPoster, 1, 2> {
    rl::var<int> ran;

    void before() {
        Suite::before();
        ran($) = 0;
    }
    void thread(unsigned /*index*/) {
        WorkQueue queue("queue", WorkQueue::Priority::Background);
        const WorkQueue::Hold hold(queue);
        queue.async([this] { ran($) = ran($) + 1; });
        queue.async([this] { ran($) = ran($) + 1; });
    }
    void check() { RL_ASSERT(ran($) == 2); }
};

template <class Test>
bool explore(const char* name, unsigned preemptions, unsigned orders) {
    for (const bool all : {true, false}) {
        rl::test_params params;
        std::ostream nowhere(
            nullptr);  // not a stream that allocates: Relacy's operator new is at work
        params.search_type = all ? rl::sched_bound : rl::sched_random;
        params.context_bound = preemptions;
        params.iteration_count = orders;
        params.execution_depth_limit = 5000;
        params.output_stream = &std::cout;
        params.progress_stream = &nowhere;
        ended = 0;
        if (!rl::simulate<Test>(params) || ended == 0) {
            std::cout << "weak-memory." << name << ": FAILED\n";
            return false;
        }
        std::cout << "weak-memory." << name << ": " << ended << " executions ";
        if (all) {
            std::cout << "with at most " << preemptions << " preemptions";
        } else {
            std::cout << "at random";
        }
        std::cout << ": passed" << std::endl;
    }
    return true;
}

}  // namespace

int main(int argc, char** argv) {
    const auto number = [&](int at, unsigned otherwise) {
        return argc > at ? static_cast<unsigned>(std::strtoul(argv[at], nullptr, 10)) : otherwise;
    };
    const unsigned preemptions = number(1, 2);
    const unsigned orders = number(2, 20'000);
    {  // what is never destroyed is made outside of all executions
        WorkQueue queue("warm-up", WorkQueue::Priority::Background);
        const WorkQueue::Hold hold(queue);
    }
    for (auto bodies = std::move(weak_memory::bodies); auto& body : bodies) {
        body();
    }
    weak_memory::bodies.clear();
    const bool passed = explore<WakeupPublishes>("wakeup-publishes", preemptions, orders) &&
                        explore<TwoPosters>("two-posters", preemptions, orders) &&
                        explore<HeldPoster>("held-poster", preemptions, orders);
    return passed ? 0 : 1;
}
