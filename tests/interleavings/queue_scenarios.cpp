// The work queue and its delayed items.
#include <algorithm>
#include <memory>
#include <optional>
#include <system_error>
#include <vector>

#include <fmt/format.h>

#include "platform/sync.h"
#include "platform/work_queue.h"
#include "tools/explore/scenario.h"
#include "tools/explore/scheduler.h"

namespace interleavings {

namespace {

using platform::WorkQueue;
using std::chrono::milliseconds;

// What the items of one queue did. An item that runs while another does is a failure.
class Record {
  public:
    // Item `number` runs; another thread may go meanwhile.
    void run(int number) {
        expect(!_running, "two items run at once");
        _running = true;
        step("runs item {}", number);
        _running = false;
        _ran.push_back(number);
    }
    WorkQueue::Item item(int number) {
        return [this, number] { run(number); };
    }

    void expectRan(const std::vector<std::vector<int>>& allowed) const {
        expect(std::find(allowed.begin(), allowed.end(), _ran) != allowed.end(),
               "the items that ran: {}", fmt::join(_ran, " "));
    }

  private:
    std::vector<int> _ran;
    bool _running = false;
};

std::shared_ptr<WorkQueue> makeQueue() {
    return std::make_shared<WorkQueue>("queue", WorkQueue::Priority::Background);
}

// Two threads queue items, and both lose the queue; with `held`, a thread waits for the items.
std::function<void()> twoPosters(bool held) {
    const auto record = std::make_shared<Record>();
    auto queue = makeQueue();
    std::optional<WorkQueue::Hold> hold;
    if (held) {
        hold.emplace(*queue);
    }
    platform::startThread([queue, record] {
        queue->async(record->item(1));
        queue->async(record->item(2));
    });
    queue->async(record->item(3));
    queue = nullptr;
    return [record] { record->expectRan({{1, 2, 3}, {1, 3, 2}, {3, 1, 2}}); };
}

// The queue's thread is about to end when the second item comes.
std::function<void()> itemWhileThreadEnds() {
    const auto record = std::make_shared<Record>();
    const auto queue = makeQueue();
    const auto ran = std::make_shared<platform::Semaphore>(0);
    queue->async([record, ran] {
        record->run(1);
        ran->release();
    });
    ran->acquire();
    queue->async(record->item(2));
    return [record] { record->expectRan({{1, 2}}); };
}

// The last owner goes inside an item; another item and a delayed one still run.
std::function<void()> ownerLeavesInsideItem() {
    const auto record = std::make_shared<Record>();
    auto queue = makeQueue();
    WorkQueue& same = *queue;
    same.async([record, owner = std::move(queue)]() mutable {
        owner->after(milliseconds(1), record->item(3));
        owner->async(record->item(2));
        owner = nullptr;
        record->run(1);
    });
    return [record] { record->expectRan({{1, 2, 3}, {1, 3, 2}}); };
}

// A delayed item outlives its queue's owner; a second one of another queue is due before it.
std::function<void()> delayedAfterOwner() {
    const auto record = std::make_shared<Record>();
    const auto other = std::make_shared<Record>();
    {
        const auto first = makeQueue();
        const auto second = makeQueue();
        first->after(milliseconds(2), record->item(1));
        second->after(milliseconds(1), other->item(2));
    }
    return [record, other] {
        record->expectRan({{1}});
        other->expectRan({{2}});
    };
}

// A hold ends inside an item while a delayed item becomes due.
std::function<void()> holdEndsInsideItem() {
    const auto record = std::make_shared<Record>();
    const auto queue = makeQueue();
    auto hold = std::make_unique<WorkQueue::Hold>(*queue);
    queue->after(milliseconds(1), record->item(2));
    queue->async([record, hold = std::move(hold)]() mutable {
        record->run(1);
        hold = nullptr;
    });
    return [record] { record->expectRan({{1, 2}, {2, 1}}); };
}

// A hold ends on another thread while an item comes that takes the queue and the last hold with it: who
// queued it may be the last to touch the queue's state.
std::function<void()> holdAndOwnerEnd() {
    const auto record = std::make_shared<Record>();
    auto queue = makeQueue();
    WorkQueue& same = *queue;
    auto hold = std::make_unique<WorkQueue::Hold>(same);
    platform::startThread(
        [other = std::make_unique<WorkQueue::Hold>(same)]() mutable { other = nullptr; });
    same.async([record, owner = std::move(queue), hold = std::move(hold)]() mutable {
        record->run(1);
        hold = nullptr;
        owner = nullptr;
    });
    return [record] { record->expectRan({{1}}); };
}

// Items come one by one while the thread watches for them.
std::function<void()> itemsComeFast() {
    const auto record = std::make_shared<Record>();
    const auto queue = makeQueue();
    const WorkQueue::Hold hold(*queue);
    for (int number = 1; number <= 3; ++number) {
        queue->async(record->item(number));
        platform::yieldProcessor();
    }
    return [record] { record->expectRan({{1, 2, 3}}); };
}

// Starts of threads fail: what was refused is dropped, what was accepted runs.
std::function<void()> startsFail() {
    const auto record = std::make_shared<Record>();
    const auto queue = makeQueue();
    std::vector<int> accepted;
    letStartsFail(2);
    const auto attempt = [&](int number, auto queueing) {
        try {
            queueing();
            accepted.push_back(number);
        } catch (const std::system_error&) {
        }
    };
    attempt(0, [&] { const WorkQueue::Hold hold(*queue); });
    accepted.clear();
    attempt(1, [&] { queue->async(record->item(1)); });
    attempt(2, [&] { queue->after(milliseconds(1), record->item(2)); });
    auto reversed = std::vector<int>(accepted.rbegin(), accepted.rend());
    return [record, accepted, reversed] { record->expectRan({accepted, reversed}); };
}

}  // namespace

std::vector<Scenario> queueScenarios() {
    return {
        {"queue.two-posters", [] { return twoPosters(false); }, 3},
        {"queue.two-posters-held", [] { return twoPosters(true); }, 3},
        {"queue.item-while-thread-ends", itemWhileThreadEnds, 3},
        {"queue.owner-leaves-inside-item", ownerLeavesInsideItem, 3},
        {"queue.delayed-after-owner", delayedAfterOwner, 3},
        {"queue.hold-ends-inside-item", holdEndsInsideItem, 3},
        {"queue.hold-and-owner-end", holdAndOwnerEnd, 3},
        {"queue.items-come-fast", itemsComeFast, 3},
        {"queue.starts-fail", startsFail, 3},
    };
}

}  // namespace interleavings
