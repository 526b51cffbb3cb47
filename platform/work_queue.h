// WorkQueue: a serial queue of work items with a label and a priority class.
//
// Runs its items one at a time, in the order in which they were queued, on a thread of its own; what
// one item did is visible to the next. A delayed item joins the end of the queue when its time comes.
//
// Owner    Whoever made it. Dropping the queue drops nothing that was queued: items already there
//          and delayed items still run. The queue may be dropped on any thread, also inside one of
//          its own items; nothing waits then.
// Threads  Every operation may be called on any thread, and never waits for a running item.
// Cost     A queue without items has no thread. The thread starts with the first item and ends when
//          the queue is empty and nobody holds it. All delayed items of the process wait on one
//          further thread, which exists while there are any.
// Failure  Queueing throws std::system_error when a thread is needed and there is none to be had; the
//          item is then dropped. For a delayed item whose time has come that ends the process.
// Exit     Neither a queued nor a delayed item keeps the process from exiting.
#ifndef ZR_PLATFORM_WORK_QUEUE_H
#define ZR_PLATFORM_WORK_QUEUE_H

#include <chrono>
#include <functional>
#include <memory>
#include <string>

namespace platform {

class WorkQueue {
  public:
    // How eagerly the operating system should run the thread: at nice -5, or at nice 10. Without the
    // right to raise a priority UserInteractive stays at that of the thread which queued the item
    // that started it.
    enum class Priority { UserInteractive, Background };

    // An item owns what it captured; that is released right after it ran, on the queue's thread. An
    // exception that leaves an item ends the process.
    using Item = std::function<void()>;

    // `label` names the thread for debuggers, cut to the 15 characters that Linux keeps.
    WorkQueue(std::string label, Priority priority);
    ~WorkQueue();
    WorkQueue(const WorkQueue&) = delete;
    WorkQueue& operator=(const WorkQueue&) = delete;

    const std::string& label() const;
    Priority priority() const;

    void async(Item item);

    // Queues `item` once `delay` has passed; at once when the delay is zero or negative, never when
    // now plus the delay lies beyond the clock's end.
    void after(std::chrono::nanoseconds delay, Item item);

  private:
    class State;
    class Timer;
    std::shared_ptr<State> _state;
};

}  // namespace platform

#endif
