// RunLoop: one thread's loop over event sources.
//
// A thread that wants one asks for it with forThisThread(). Any thread may signal a source; only the
// loop's own thread runs it. Sources and observers belong to modes, and a run serves one mode. Any
// string is a mode. The common modes have one member, kRunLoopDefaultMode: either name stands for the
// other.
//
// Owner    The thread's storage holds the loop until the thread ends; others may hold references
//          longer. Sources and observers are shared: the loop holds them while they are added.
// Threads  forThisThread(), current(), run(): the loop's own thread. Everything else: any thread.
//          Callbacks and observers run on the loop's thread, with no lock held; they may add and
//          remove sources and observers, signal, stop, and run the loop again (a nested run).
// Failure  An exception that leaves a callback or an observer ends the run. Every exit observer is
//          notified all the same, also when one of them throws; then the run's first exception leaves
//          run().
#ifndef ZR_PLATFORM_RUN_LOOP_H
#define ZR_PLATFORM_RUN_LOOP_H

#include <cstdint>
#include <functional>
#include <memory>
#include <string_view>
#include <vector>

#include "platform/sync.h"

namespace platform {

inline constexpr std::string_view kRunLoopDefaultMode = "platform.run-loop.default";
inline constexpr std::string_view kRunLoopCommonModes = "platform.run-loop.common";

// What a run loop is about to do, as flag bits; observers choose by a mask of them.
enum RunLoopActivity : std::uint32_t {
    RunLoopEntry = 1U << 0,
    RunLoopBeforeSources = 1U << 2,
    RunLoopBeforeWaiting = 1U << 5,
    RunLoopAfterWaiting = 1U << 6,
    RunLoopExit = 1U << 7,
    RunLoopAllActivities = 0x0FFFFFFFU,
};

// How a run ended.
enum class RunLoopOutcome {
    Finished,  // the mode had no source (left)
    Stopped,   // stop() was called
    TimedOut,  // the time limit passed
};

class RunLoop;

// A source: a callback that the loop runs once per signal. Signals given before it runs are merged
// into one.
class RunLoopSource {
  public:
    explicit RunLoopSource(std::function<void()> callback);  // must not be empty
    ~RunLoopSource();
    RunLoopSource(const RunLoopSource&) = delete;
    RunLoopSource& operator=(const RunLoopSource&) = delete;

    // Wakes every loop the source was added to; the first to get there runs it. The signal is kept
    // until a run serves it, also when the source was not added yet. What the caller did before is
    // visible to the callback.
    void signal();

  private:
    friend class RunLoop;
    class Wakers;
    std::function<void()> _callback;
    // Set by any thread, taken by the loop's.
    Atomic<bool> _signalled{false};
    std::unique_ptr<Wakers> _wakers;
};

// An observer: called at every activity of its mask. Observers of one activity are called in rising
// `order`, those of equal order as they were added. Do not change it while it is added.
struct RunLoopObserver {
    std::uint32_t activities;
    int order;
    std::function<void(std::uint32_t activity)> callback;  // must not be empty
};

class RunLoop {
  public:
    // The calling thread's loop; made by the first call on a thread. Once the ending thread has begun
    // to destroy its loop, a call (from a destructor, say) makes a new loop that only its caller holds
    // and that cannot be run.
    static std::shared_ptr<RunLoop> forThisThread();
    // The calling thread's loop; null when the thread never asked for one, and once the ending thread
    // has begun to destroy it.
    static std::shared_ptr<RunLoop> current();

    ~RunLoop();
    RunLoop(const RunLoop&) = delete;
    RunLoop& operator=(const RunLoop&) = delete;

    // Adding twice in one mode, or removing what is not there, does nothing. A removed source is no
    // longer run; a callback in progress finishes.
    void addSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode);
    void removeSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode);
    // Whether the mode has a source, so that a run of it would have something to wait for.
    bool hasSources(std::string_view mode) const;
    void addObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode);
    void removeObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode);

    // Serves the mode for at most `seconds`. A turn runs each signalled source once, in the order
    // added; what it adds waits for the next. When no source is ready after a turn, the loop waits for
    // the next signal, and a turn follows. Ends before and after a turn when there was a stop, else
    // when the mode has no source; after a turn also when the time has passed. So sources that are
    // ready when the run begins get one turn even with a limit of zero.
    // A negative limit or NaN counts as zero; one beyond the clock's end means no limit.
    // Observers are notified at the entry and the exit of every run, however it ends; between them
    // before each turn, and before and after each wait.
    // Throws std::logic_error on any thread but the loop's own; nothing is run or notified then.
    RunLoopOutcome run(std::string_view mode, double seconds);

    // Ends the innermost run in progress as soon as the callback in progress returns; no further
    // source is run. Without a run in progress it does nothing.
    void stop();

  private:
    friend class RunLoopSource;
    RunLoop();
    class State;
    std::shared_ptr<State> _state;
};

}  // namespace platform

#endif
