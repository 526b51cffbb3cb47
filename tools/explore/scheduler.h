// The scheduler that runs the product's threads one at a time and decides at every step which goes on.
//
// model/platform/sync.h stands in place of platform/sync.h and is made of the objects below. Every operation
// of a mutex, condition, atomic, semaphore or sleep word is a step: other threads may go first. What a
// thread does between two steps is not interrupted. Memory is sequentially consistent. Time is virtual: it
// passes when every thread waits, when a thread yields, or when the order has a wait end early.
//
// An order is the list of choices that were not the first one. The first choice lets the running thread go
// on; another one then is a preemption.
#ifndef ZR_TOOLS_EXPLORE_SCHEDULER_H
#define ZR_TOOLS_EXPLORE_SCHEDULER_H

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <fmt/core.h>

namespace interleavings {

using TimePoint = std::chrono::steady_clock::time_point;

// Something that threads meet at. A use after its end, an end while a thread waits at it, and one that is
// left over when an execution ends are failures.
class Object {
  public:
    explicit Object(const char* kind);
    ~Object();
    Object(const Object&) = delete;
    Object& operator=(const Object&) = delete;

    // The operation comes next; other threads may go first.
    void step(const char* operation) const;
    // Waits at this object until woken, or until `deadline`. May wake for no reason if `loosely`.
    void wait(const char* operation, TimePoint deadline = TimePoint::max(), bool loosely = false);
    void wakeOne();  // any one of those that wait
    void wakeAll();

    bool isLeftOut() const;  // see leaveOutApart()

  private:
    void _expectAlive(const char* operation) const;

    std::uint64_t _mark;
    const char* _kind;
    unsigned _number;
    bool _apart;
};

// In an execution: starts a thread. Throws std::system_error when the order has the start fail.
void start(std::function<void()> body);
// Another thread goes first, if any can; a little time passes.
void yield();
// How many starts of threads may fail from here on, in this execution; none at first.
void letStartsFail(unsigned number);
// The running thread's number; the scenario's own is 0.
unsigned thisThread();
// Whether time has passed in this execution because every thread waited.
bool stoodStill();
// The execution shows `what`, which must outlive it.
void reach(std::string_view what);

// A step at no object, with its text for the trace.
template <class... Args>
void step(fmt::format_string<Args...> text, Args&&... args);
// Ends the execution as a failure, with the text, when `condition` is false.
template <class... Args>
void expect(bool condition, fmt::format_string<Args...> otherwise, Args&&... args);

// What chooses. Options below `free` cost nothing, from there on a preemption; those from `rare` on (a wake-up
// for no reason) are only for random orders.
struct Choice {
    unsigned chosen = 0;
    unsigned free = 1;
    unsigned rare = 1;
    unsigned all = 1;
    unsigned spentBefore = 0;  // preemptions
};
using Order = std::vector<Choice>;

struct Execution {
    Order order;          // as chosen
    std::string failure;  // empty: none
    std::string trace;    // one line per step, when asked for
    std::vector<std::string_view> reached;
};

// Runs `body` as thread 0 and everything that it starts, to the end; then `after`, when nothing runs any more.
// `choose` gets the place of the choice and what there is to choose from. A failed execution leaves its
// threads as they are: nothing can be executed after it.
Execution execute(const std::function<void()>& body,
                  const std::function<void()>& after,
                  const std::function<unsigned(std::size_t place, const Choice& from)>& choose,
                  bool trace);

// A line of the trace; not a step.
void note(std::string_view text);

// Objects made between true and false are apart: leaveOutApart() makes the rest of an execution pass over
// their steps. Sound where other threads cannot tell, as with a log whose sink stays the same.
void makeApart(bool apart);
void leaveOutApart();

// How step() and expect() are done.
bool isTraced();
void stepAs(const std::string& operation);
void fail(std::string text);

template <class... Args>
void step(fmt::format_string<Args...> text, Args&&... args) {
    stepAs(isTraced() ? fmt::format(text, std::forward<Args>(args)...) : std::string());
}
template <class... Args>
void expect(bool condition, fmt::format_string<Args...> otherwise, Args&&... args) {
    if (!condition) {
        fail(fmt::format(otherwise, std::forward<Args>(args)...));
    }
}

}  // namespace interleavings

#endif
