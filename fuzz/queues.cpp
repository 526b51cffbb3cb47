// The program's own definitions go before those of the platform's library.
#include "fuzz/queues.h"

#include <deque>
#include <utility>

#include "platform/work_queue.h"

namespace {

std::deque<platform::WorkItem> queued;
std::vector<double> delays;

}  // namespace

void fuzz::runQueued() {
    while (!queued.empty()) {
        platform::WorkItem item = std::move(queued.front());
        queued.pop_front();
        item();
    }
}

std::vector<double> fuzz::takeDelays() {
    return std::exchange(delays, {});
}

namespace platform {

class WorkQueue::State {
  public:
    std::string label;
    Priority priority;
};

WorkQueue::WorkQueue(std::string label, Priority priority)
    : _state(std::make_shared<State>(State{std::move(label), priority})) {}
WorkQueue::~WorkQueue() = default;

const std::string& WorkQueue::label() const {
    return _state->label;
}
WorkQueue::Priority WorkQueue::priority() const {
    return _state->priority;
}

void WorkQueue::async(Item&& item) {
    queued.push_back(std::move(item));
}

void WorkQueue::after(std::chrono::duration<double> delay, Item&& item) {
    delays.push_back(delay.count());
    queued.push_back(std::move(item));
    fuzz::runQueued();
}

WorkQueue::Hold::Hold(const WorkQueue& queue) : _state(queue._state) {}
WorkQueue::Hold::~Hold() = default;

}  // namespace platform
