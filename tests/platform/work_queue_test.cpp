#include "platform/work_queue.h"

#include <array>
#include <atomic>
#include <cmath>
#include <latch>
#include <random>
#include <semaphore>
#include <system_error>
#include <thread>
#include <vector>

#include <sys/resource.h>
#include <unistd.h>

#include <gmock/gmock.h>

#include "platform/log.h"
#include "platform/run_tag.h"
#include "tests/platform/threads.h"
#include "tests/support/eventually.h"

namespace {

using namespace std::chrono_literals;
using platform::WorkQueue;
using Clock = std::chrono::steady_clock;
using Priority = platform::WorkQueue::Priority;
using std::chrono::nanoseconds;
using test::eventually;
using test::threadSeconds;
using test::threadsNamed;

TEST(WorkQueue, RunsTheItemsOfManyThreadsOneAtATimeInOrder) {
    constexpr int kThreads = 4;
    constexpr int kItemsEach = 1000;
    std::vector<std::vector<int>> ran(kThreads);  // touched by items only: the queue is the lock
    std::latch done(1);
    WorkQueue queue("order", Priority::UserInteractive);
    {
        std::vector<std::jthread> threads;
        for (int thread = 0; thread < kThreads; ++thread) {
            threads.emplace_back([&queue, &ran, thread] {
                for (int i = 0; i < kItemsEach; ++i) {
                    queue.async([&ran, thread, i] { ran[thread].push_back(i); });
                }
            });
        }
    }
    queue.async([&done] { done.count_down(); });
    done.wait();
    for (const auto& items : ran) {
        ASSERT_EQ(items.size(), static_cast<std::size_t>(kItemsEach));
        EXPECT_TRUE(std::is_sorted(items.begin(), items.end()));
    }
}

TEST(WorkQueue, WaitsForAnItemWithoutWork) {
    constexpr std::chrono::milliseconds kWait{100};
    std::latch done(1);
    double before = 0;
    double used = 0;
    WorkQueue queue("idle", Priority::UserInteractive);
    const WorkQueue::Hold hold(queue);                          // one thread runs both
    queue.after(kWait / 2, [&] { before = threadSeconds(); });  // it has waited once
    queue.after(kWait / 2 + kWait, [&] {
        used = threadSeconds() - before;
        done.count_down();
    });
    done.wait();
    // On a busy machine a thread that does not sleep gets a part of the time only.
    EXPECT_LT(used, std::chrono::duration<double>(kWait).count() / 20);
}

// What an item captured moves with it, whether it lies inside the item or not, and goes once.
TEST(WorkQueue, RunsItemsOfEverySize) {
    const auto life = std::make_shared<int>();
    std::atomic<int> sum = 0;
    std::latch done(3);
    WorkQueue queue("sizes", Priority::Background);
    const auto add = [&]<std::size_t Size>(std::array<char, Size> load) {
        load.back() = 1;
        queue.async([&, life, load, moveOnly = std::make_unique<int>(2)] {
            sum += load.back() + *moveOnly;
            done.count_down();
        });
    };
    add(std::array<char, 1>());
    add(std::array<char, 16>());
    add(std::array<char, 4096>());
    done.wait();
    EXPECT_EQ(sum, 9);
    EXPECT_TRUE(eventually([&] { return life.use_count() == 1; }));
}

// Work belongs to the run that asked for it, through items, delayed items and what they release.
TEST(WorkQueue, GivesAnItemTheRunTagOfItsPoster) {
    std::vector<platform::RunTag> tags;  // touched by items only
    std::latch done(1);
    const auto note = [&tags] { tags.push_back(platform::currentRunTag()); };
    const auto atEnd = [&note](int*) { note(); };
    {
        WorkQueue queue("tags", Priority::UserInteractive);
        const platform::RunTagScope seventh(7);
        {
            const platform::RunTagScope eighth(8);
            queue.async([&note, last = std::shared_ptr<int>(nullptr, atEnd)] { note(); });
        }
        queue.async([&] {
            note();
            const platform::RunTagScope ninth(9);
            queue.after(1ms, [&] {
                note();
                done.count_down();
            });
        });
        done.wait();
    }
    EXPECT_THAT(tags, testing::ElementsAre(8, 8, 7, 9));
    EXPECT_EQ(platform::currentRunTag(), 0U);
}

TEST(WorkQueue, ReleasesWhatAnItemCapturedBeforeTheNextStarts) {
    std::vector<std::string> events;
    std::vector<std::thread::id> threads;
    std::latch done(1);
    const auto note = [&](const char* event) {
        events.emplace_back(event);
        threads.push_back(std::this_thread::get_id());
    };
    WorkQueue queue("captures", Priority::UserInteractive);
    // Queued from an item, so that both wait in the queue before the first runs.
    queue.async([&] {
        const auto captured = std::shared_ptr<void>(nullptr, [&](void*) { note("released"); });
        queue.async([&, captured] { note("first"); });
        queue.async([&] { note("second"), done.count_down(); });
    });
    done.wait();
    EXPECT_THAT(events, ::testing::ElementsAre("first", "released", "second"));
    EXPECT_THAT(threads, ::testing::Each(threads[0]));
    EXPECT_NE(threads[0], std::this_thread::get_id());
}

TEST(WorkQueue, HasANamedThreadWhileItHasItemsOrIsHeld) {
    const std::string name = "ife of a thread";
    const auto threads = [&name](std::size_t own, std::size_t timers) {
        return eventually(
            [&] { return threadsNamed(name) == own && threadsNamed("delayed items") == timers; });
    };
    const int inherited = getpriority(PRIO_PROCESS, static_cast<id_t>(gettid()));
    for (const Priority priority : {Priority::UserInteractive, Priority::Background}) {
        auto queue = std::make_unique<WorkQueue>("life of a thread", priority);
        EXPECT_EQ(queue->label(), "life of a thread");
        EXPECT_EQ(queue->priority(), priority);
        EXPECT_EQ(threadsNamed(name), 0U);
        std::binary_semaphore wake(0);
        std::latch done(1);
        int nice = 0;
        queue->async([&] {
            wake.acquire();
            nice = getpriority(PRIO_PROCESS, static_cast<id_t>(gettid()));
            done.count_down();
        });
        EXPECT_TRUE(threads(1, 0));
        wake.release();
        done.wait();
        if (priority == Priority::Background) {
            EXPECT_TRUE(nice == 10 || (nice > 10 && nice == inherited)) << nice;
        } else {
            EXPECT_TRUE(nice == -5 || nice == inherited) << nice;
        }
        EXPECT_TRUE(threads(0, 0));
        auto first = std::make_unique<WorkQueue::Hold>(*queue);
        auto second = std::make_unique<WorkQueue::Hold>(*queue);
        first = nullptr;
        queue->async([] {});
        EXPECT_TRUE(threads(1, 1));
        queue = nullptr;  // a hold may end after its queue
        EXPECT_TRUE(threads(1, 1));
        std::thread([&second] { second = nullptr; }).join();
        EXPECT_TRUE(threads(0, 0));
    }
}

// Items come while the thread is about to end for want of items and holds: each has to run.
TEST(WorkQueue, LosesNoItemAtTheEndOfItsThread) {
    constexpr int kRounds = 3000;
    WorkQueue queue("last item", Priority::UserInteractive);
    int ran = 0;  // not atomic: the items are in order, and so is each with the next round
    for (int round = 0; round < kRounds; ++round) {
        std::binary_semaphore done(0);
        auto hold = round % 2 == 0 ? std::make_shared<WorkQueue::Hold>(queue) : nullptr;
        queue.async([&, hold = std::move(hold)]() mutable {
            hold = nullptr;
            ++ran;
            done.release();
        });
        done.acquire();
    }
    EXPECT_EQ(ran, kRounds);
}

TEST(WorkQueue, QueuesWithoutAThreadToBeHadWhenItIsHeld) {
    WorkQueue held("held", Priority::UserInteractive);
    WorkQueue other("other", Priority::UserInteractive);
    std::string order;
    const auto dropped = std::make_shared<int>();
    std::latch done(1);
    {
        const WorkQueue::Hold hold(held);
        const test::NoThreads noThreads;
        EXPECT_THROW(other.async([dropped] {}), std::system_error);
        EXPECT_THROW(other.after(0s, [dropped] {}), std::system_error);
        EXPECT_THROW(WorkQueue::Hold another(other), std::system_error);
        EXPECT_EQ(dropped.use_count(), 1);
        // Due items for which there is no thread wait for one; those of the held queue do not.
        other.after(1ms, [&] { order += 'a'; });
        other.after(5ms, [&] {
            order += 'b';
            done.count_down();
        });
        std::latch ran(2);
        held.async([&] { ran.count_down(); });
        held.after(20ms, [&] { ran.count_down(); });
        ran.wait();
        EXPECT_EQ(order, "");
        EXPECT_THROW(other.async([dropped] {}), std::system_error);
    }
    done.wait();
    EXPECT_EQ(order, "ab");

    EXPECT_TRUE(eventually([] { return threadsNamed("delayed items") == 0; }));
    const test::NoThreads noThreads;
    EXPECT_THROW(other.after(1h, [dropped] {}), std::system_error);
    EXPECT_THROW(WorkQueue::Hold hold(other), std::system_error);
    EXPECT_EQ(dropped.use_count(), 1);
}

TEST(WorkQueue, IsNotHeldWhenThereIsNoThreadForDelayedItems) {
    EXPECT_TRUE(eventually([] { return threadsNamed("delayed items") == 0; }));
    WorkQueue queue("half held", Priority::UserInteractive);
    std::latch running(1);
    std::latch go(1);
    queue.async([&] {
        running.count_down();
        go.wait();
    });
    running.wait();
    {
        const test::NoThreads noThreads;
        EXPECT_THROW(WorkQueue::Hold hold(queue), std::system_error);
    }
    go.count_down();
    EXPECT_TRUE(eventually([] { return threadsNamed("half held") == 0; }));
}

TEST(WorkQueue, RunsWhatItHasWhenItsOwnerGoesInsideAnItem) {
    std::latch done(2);
    std::latch delayed(1);
    auto queue = std::make_unique<WorkQueue>("owner in item", Priority::Background);
    std::latch queued(1);
    queue->async([&] {
        queued.wait();
        queue->async([&] { done.count_down(); });
        queue->after(100ms, [&] { delayed.count_down(); });
        queue.reset();
    });
    queue->async([&] { done.count_down(); });
    queued.count_down();
    done.wait();
    EXPECT_TRUE(eventually([] { return threadsNamed("owner in item") == 0; }));
    delayed.wait();  // it had a thread of its own
    EXPECT_TRUE(eventually(
        [] { return threadsNamed("owner in item") == 0 && threadsNamed("delayed items") == 0; }));
}

TEST(WorkQueue, QueuesAtOnceWhatHasNoDelay) {
    std::string order;
    std::latch queued(1);
    std::latch done(1);
    WorkQueue queue("no delay", Priority::UserInteractive);
    queue.async([&] { queued.wait(), order += 'a'; });
    queue.after(0ns, [&] { order += 'b'; });
    queue.after(-1ns, [&] { order += 'c'; });
    queue.after(nanoseconds::min(), [&] { order += 'd'; });
    queue.after(std::chrono::duration<double>(std::nan("")), [&] { order += 'e'; });
    queue.async([&] { done.count_down(); });
    queued.count_down();
    done.wait();
    EXPECT_EQ(order, "abcde");
}

// Which of two items is due first is certain when the latest time of one lies before the earliest of
// the other.
TEST(WorkQueue, RunsDelayedItemsInTheOrderOfTheirTimes) {
    struct Item {
        Clock::time_point earliest;  // when it may be due
        Clock::time_point latest;
        Clock::time_point ran;
        int place = 0;
    };
    constexpr int kItems = 300;
    std::vector<Item> items(kItems);
    std::atomic<int> places[2] = {0, 0};
    std::latch done(kItems);
    WorkQueue queues[] = {{"delayed 0", Priority::UserInteractive},
                          {"delayed 1", Priority::Background}};
    std::mt19937 random(1);
    for (int i = 0; i < kItems; ++i) {
        const nanoseconds delay = std::chrono::microseconds(1 + random() % 20'000);
        Item& item = items[i];
        item.earliest = Clock::now() + delay - 1ns;  // a delay is truncated
        queues[i % 2].after(delay, [&item, &places, &done, i] {
            item.ran = Clock::now();
            item.place = places[i % 2]++;
            done.count_down();
        });
        item.latest = Clock::now() + delay;
    }
    done.wait();
    for (int i = 0; i < kItems; ++i) {
        EXPECT_GE(items[i].ran, items[i].earliest);
        for (int j = i % 2; j < kItems; j += 2) {
            if (items[i].latest < items[j].earliest) {
                EXPECT_LT(items[i].place, items[j].place) << i << ' ' << j;
            }
        }
    }
}

// The queue may end before async() returns. Only the sanitizers see it when that is a fault.
TEST(WorkQueue, AnItemMayBeTheOnlyOwnerOfItsQueue) {
    constexpr int kQueues = 100;
    std::latch done(kQueues);
    for (int i = 0; i < kQueues; ++i) {
        auto owner = std::make_shared<WorkQueue>("owned by item", Priority::UserInteractive);
        WorkQueue& queue = *owner;
        queue.async([owner = std::move(owner), &done] { done.count_down(); });
    }
    done.wait();
}

// Leaves the process while items wait without end, are pending, and use what the process shares.
void exitWithItemsUnderWay() {
    std::latch never(1);
    std::latch started(2);
    WorkQueue stuck("stuck", Priority::UserInteractive);
    stuck.async([&] {
        started.count_down();
        never.wait();
    });
    auto busy = std::make_shared<WorkQueue>("busy", Priority::Background);
    busy->async([&, busy] {
        started.count_down();
        const platform::Log log("tests", "exit");
        while (true) {
            log.write(platform::LogLevel::Debug, [] { return "never"; });
            busy->after(1h, [] { _exit(4); });
            std::this_thread::sleep_for(1ms);
        }
    });
    WorkQueue other("other", Priority::UserInteractive);
    other.after(nanoseconds::max(), [] { _exit(2); });
    other.after(1h, [] { _exit(1); });
    started.wait();
    for (int i = 0; i < 20; ++i) {  // each comes while later ones are being waited for
        std::latch ran(1);
        other.after(1us, [&ran] { ran.count_down(); });
        ran.wait();
    }
    std::exit(0);
}

TEST(WorkQueueDeathTest, NoItemKeepsTheProcessFromExitingAndNeverIsNotNow) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    const auto start = Clock::now();
    EXPECT_EXIT(exitWithItemsUnderWay(), ::testing::ExitedWithCode(0), "");
    EXPECT_LT(Clock::now() - start, 60s);
}

TEST(WorkQueueDeathTest, AnExceptionThatLeavesAnItemEndsTheProcess) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_DEATH(
        {
            WorkQueue queue("throws", Priority::UserInteractive);
            queue.async([] { throw std::runtime_error("the culprit"); });
            eventually([] { return false; });
        },
        "the culprit");
}

}  // namespace
