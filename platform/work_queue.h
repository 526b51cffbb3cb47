// WorkQueue: a serial queue of work items with a label and a priority class.
//
// Runs its items one at a time, in the order in which they were queued, on a thread of its own; what
// one item did is visible to the next. A delayed item joins the end of the queue when its time comes.
//
// Owner    Its maker. Dropping the queue drops nothing that was queued: items already there and
//          delayed items still run. The queue may be dropped on any thread, also inside one of its
//          own items; nothing waits then.
// Threads  Every operation may be called on any thread, and never waits for a running item.
// Cost     Queueing takes a lock that the queue's thread holds only for a moment, and wakes the thread
//          when it sleeps. While items come less than 40 µs apart, the thread watches for the next one
//          instead of sleeping, and lets other threads use its core meanwhile. An item that captured up to
//          64 bytes allocates nothing, once as many items have waited before; where more than 1,024 wait,
//          every 32nd allocates. The queue's thread exists while there are items or the queue is held (see
//          Hold). An item for a queue that is not held and has no items costs the start of a thread. The
//          delayed items of all queues wait on one further thread, which exists while there are any or a
//          queue is held.
// Failure  Queueing and holding throw std::system_error when they need a thread and none can be
//          started; the item is then dropped. A held queue needs no new thread, so neither throws. A
//          delayed item whose time has come and for which no thread can be started stays queued, and
//          the start is tried again until it succeeds.
// Exit     Neither a queued nor a delayed item keeps the process from exiting.
#ifndef ZR_PLATFORM_WORK_QUEUE_H
#define ZR_PLATFORM_WORK_QUEUE_H

#include <chrono>
#include <memory>
#include <string>

#include "platform/work_item.h"

namespace platform {

class WorkQueue {
  private:
    class State;
    class Timer;

  public:
    // How eagerly the operating system should run the thread: at nice -5, or at nice 10. Without the
    // privilege to raise priorities, a UserInteractive queue keeps the niceness of the thread that
    // started its thread by holding it or by queueing an item.
    enum class Priority { UserInteractive, Background };

    // Must not be empty. An item owns what it captured; that is released right after it ran, on the
    // queue's thread. An exception that leaves an item ends the process. The item has the run tag of
    // the thread that queued it (platform/run_tag.h).
    using Item = WorkItem;

    // Holds a queue as long as it lives: the queue's thread and that of the delayed items exist, so
    // that queueing needs no thread. Any number may hold one queue. A Hold may end on any thread, also
    // inside an item of the queue, and after the queue.
    class Hold {
      public:
        explicit Hold(const WorkQueue& queue);
        ~Hold();
        Hold(const Hold&) = delete;
        Hold& operator=(const Hold&) = delete;

      private:
        std::shared_ptr<State> _state;
    };

    // The last 15 characters of `label`, as many as Linux keeps, name the thread for debuggers.
    WorkQueue(std::string label, Priority priority);
    ~WorkQueue();
    WorkQueue(const WorkQueue&) = delete;
    WorkQueue& operator=(const WorkQueue&) = delete;

    const std::string& label() const;
    Priority priority() const;

    void async(Item&& item);

    // Queues `item` once `delay` has passed; at once when the delay is zero, negative or NaN. When now
    // plus the delay lies beyond the clock's end, the item never runs: it is kept, with all that it
    // owns, until the process ends.
    void after(std::chrono::duration<double> delay, Item&& item);

  private:
    std::shared_ptr<State> _state;
};

}  // namespace platform

#endif
