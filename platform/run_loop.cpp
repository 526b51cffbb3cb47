#include "platform/run_loop.h"

#include <algorithm>
#include <exception>
#include <limits>
#include <optional>
#include <stdexcept>
#include <string>
#include <utility>

#include "platform/deadline.h"
#include "platform/sync.h"

namespace platform {

namespace {

using TimePoint = std::chrono::steady_clock::time_point;

// The default mode is the one member of the common modes, so both names mean the same.
std::string_view memberOf(std::string_view mode) {
    return mode == kRunLoopCommonModes ? kRunLoopDefaultMode : mode;
}

// Order, then when it was added: rising in each list, and never the same twice in a loop.
using Place = std::pair<int, std::uint64_t>;

// A source or an observer in a mode.
template <class T>
struct Entry {
    Place place;
    std::string mode;
    std::shared_ptr<T> object;
};
template <class T>
using Entries = std::vector<Entry<T>>;

// How far a walk over a list has come. Each step looks at the list anew: what a callback removes is
// skipped, and what it adds waits for the next walk.
struct Walk {
    std::uint64_t end;  // what was added from here on waits
    Place last{std::numeric_limits<int>::min(), 0};
};

}  // namespace

// The part of a loop that other threads reach: by way of the loop itself, or of a source to signal.
//
// Lock order: a source's wakers, then a loop's state.
class RunLoop::State {
  public:
    // A run in progress. It lives on its loop's stack.
    class Run {
      public:
        Run(State& state, std::string_view mode) : mode(memberOf(mode)), _state(state) {
            const MutexLock lock(_state.mutex);
            _outer = std::exchange(_state.innermost, this);
        }
        ~Run() {
            const MutexLock lock(_state.mutex);
            _state.innermost = _outer;
        }
        Run(const Run&) = delete;
        Run& operator=(const Run&) = delete;

        const std::string_view mode;
        bool stopped = false;  // guarded by the loop's mutex

      private:
        State& _state;
        Run* _outer;
    };

    Mutex mutex;
    Condition changed;
    Entries<RunLoopSource> sources ZR_GUARDED_BY(mutex);
    Entries<RunLoopObserver> observers ZR_GUARDED_BY(mutex);
    Run* innermost ZR_GUARDED_BY(mutex) = nullptr;

    // Whether it was added; false when it was there already.
    template <class T>
    bool add(Entries<T>& entries,
             const std::shared_ptr<T>& object,
             std::string_view mode,
             int order) ZR_REQUIRES(mutex) {
        if (_find(entries, object, mode) != entries.end()) {
            return false;
        }
        const Place place(order, _nextInTime++);
        const auto after = std::find_if(entries.begin(), entries.end(),
                                        [&](const Entry<T>& entry) { return entry.place > place; });
        entries.insert(after, {place, std::string(memberOf(mode)), object});
        return true;
    }

    // Whether it was removed; false when it was not there.
    template <class T>
    bool remove(Entries<T>& entries, const std::shared_ptr<T>& object, std::string_view mode)
        ZR_REQUIRES(mutex) {
        const auto found = _find(entries, object, mode);
        if (found == entries.end()) {
            return false;
        }
        entries.erase(found);
        return true;
    }

    void notify(const Run& run, RunLoopActivity activity) {
        Walk walk = _startWalk();
        while (const auto observer = _nextObserver(walk, run, activity)) {
            observer->callback(activity);
        }
    }

    // Notifies every exit observer, whatever they throw. Returns the first exception of the run:
    // `thrown` if there was one before, else that of an observer; null when there is none.
    std::exception_ptr notifyExit(const Run& run, std::exception_ptr thrown) {
        Walk walk = _startWalk();
        while (const auto observer = _nextObserver(walk, run, RunLoopExit)) {
            try {
                observer->callback(RunLoopExit);
            } catch (...) {
                if (thrown == nullptr) {
                    thrown = std::current_exception();
                }
            }
        }
        return thrown;
    }

    RunLoopOutcome serve(const Run& run, TimePoint limit) {
        while (true) {
            if (const auto outcome = _outcome(run)) {
                return *outcome;
            }
            notify(run, RunLoopBeforeSources);
            Walk turn = _startWalk();
            while (const auto source = _takeReady(turn, run)) {
                source->_callback();
            }
            if (const auto outcome = _outcome(run)) {
                return *outcome;
            }
            if (std::chrono::steady_clock::now() >= limit) {
                return RunLoopOutcome::TimedOut;
            }
            if (_mustWait(run)) {
                notify(run, RunLoopBeforeWaiting);
                _wait(run, limit);
                notify(run, RunLoopAfterWaiting);
            }
        }
    }

  private:
    template <class T>
    static auto _find(Entries<T>& entries,
                      const std::shared_ptr<T>& object,
                      std::string_view mode) {
        return std::find_if(entries.begin(), entries.end(), [&](const Entry<T>& entry) {
            return entry.object == object && entry.mode == memberOf(mode);
        });
    }

    Walk _startWalk() {
        const MutexLock lock(mutex);
        return {_nextInTime};
    }

    // The next object of the run's mode that is wanted; null when the walk is over.
    template <class T, class Wanted>
    static std::shared_ptr<T> _step(Walk& walk,
                                    const Entries<T>& entries,
                                    const Run& run,
                                    Wanted wanted) {
        for (const Entry<T>& entry : entries) {
            if (entry.place > walk.last && entry.place.second < walk.end &&
                entry.mode == run.mode && wanted(*entry.object)) {
                walk.last = entry.place;
                return entry.object;
            }
        }
        return nullptr;
    }

    std::shared_ptr<RunLoopObserver> _nextObserver(Walk& walk,
                                                   const Run& run,
                                                   RunLoopActivity activity) {
        const MutexLock lock(mutex);
        return _step(walk, observers, run, [activity](const RunLoopObserver& observer) {
            return (observer.activities & activity) != 0;
        });
    }

    // The next signalled source, its signal taken; null also once the run is stopped.
    std::shared_ptr<RunLoopSource> _takeReady(Walk& walk, const Run& run) {
        const MutexLock lock(mutex);
        return run.stopped ? nullptr : _step(walk, sources, run, [](RunLoopSource& source) {
            return source._signalled.exchange(false);
        });
    }

    // How the run ends whatever the time; nothing when it goes on.
    std::optional<RunLoopOutcome> _outcome(const Run& run) {
        const MutexLock lock(mutex);
        if (run.stopped) {
            return RunLoopOutcome::Stopped;
        }
        return _hasSource(run, [](const RunLoopSource&) { return true; })
                   ? std::nullopt
                   : std::optional(RunLoopOutcome::Finished);
    }

    template <class Such>
    bool _hasSource(const Run& run, Such such) const ZR_REQUIRES(mutex) {
        return std::any_of(sources.begin(), sources.end(), [&](const auto& entry) {
            return entry.mode == run.mode && such(*entry.object);
        });
    }

    // Whether the run neither ends nor has a source to run.
    bool _isIdle(const Run& run) const ZR_REQUIRES(mutex) {
        return !run.stopped && _hasSource(run, [](const RunLoopSource&) { return true; }) &&
               !_hasSource(run,
                           [](const RunLoopSource& source) { return source._signalled.load(); });
    }

    bool _mustWait(const Run& run) {
        const MutexLock lock(mutex);
        return _isIdle(run);
    }

    void _wait(const Run& run, TimePoint limit) {
        const MutexLock lock(mutex);
        while (_isIdle(run) && std::chrono::steady_clock::now() < limit) {
            changed.waitUntil(mutex, limit);
        }
    }

    std::uint64_t _nextInTime ZR_GUARDED_BY(mutex) = 1;
};

// Which loops a signal wakes: a source's loop once for each mode that the source was added to.
class RunLoopSource::Wakers {
  public:
    Mutex mutex;
    // Loop and source hold each other until the source is removed or the loop's owners have gone.
    std::vector<std::shared_ptr<RunLoop::State>> loops ZR_GUARDED_BY(mutex);

    void removeOne(const std::shared_ptr<RunLoop::State>& loop) ZR_REQUIRES(mutex) {
        loops.erase(std::find(loops.begin(), loops.end(), loop));
    }
};

RunLoopSource::RunLoopSource(std::function<void()> callback)
    : _callback(std::move(callback)), _wakers(std::make_unique<Wakers>()) {}
RunLoopSource::~RunLoopSource() = default;

void RunLoopSource::signal() {
    // An exchange, so that the callback sees what each signaller did before its signal.
    if (_signalled.exchange(true)) {
        return;  // the call that set it wakes the loops
    }
    const MutexLock lock(_wakers->mutex);
    for (const auto& loop : _wakers->loops) {
        {  // The loop holds the mutex between checking the flag and waiting; passing through it here
            // prevents a lost wake-up.
            const MutexLock passThrough(loop->mutex);
        }
        loop->changed.notifyAll();
    }
}

namespace {

// Whether the thread's end has begun to destroy its loop. It has no destructor, so it can be read
// after that, too.
thread_local bool threadIsEnding = false;

struct ThreadsLoop {
    ~ThreadsLoop() { threadIsEnding = true; }  // before the loop goes, and what it owns
    std::shared_ptr<RunLoop> loop;
};

// Must not be used once the thread is ending.
std::shared_ptr<RunLoop>& loopOfThisThread() {
    static thread_local ThreadsLoop storage;
    return storage.loop;
}

}  // namespace

RunLoop::RunLoop() : _state(std::make_shared<State>()) {}

RunLoop::~RunLoop() {
    Entries<RunLoopSource> sources;  // released at the end, without a lock
    {
        const MutexLock lock(_state->mutex);
        sources.swap(_state->sources);
    }
    for (const auto& entry : sources) {
        const MutexLock lock(entry.object->_wakers->mutex);
        entry.object->_wakers->removeOne(_state);
    }
}

std::shared_ptr<RunLoop> RunLoop::forThisThread() {
    if (auto loop = current()) {
        return loop;
    }
    std::shared_ptr<RunLoop> made(new RunLoop);
    if (!threadIsEnding) {
        loopOfThisThread() = made;
    }
    return made;
}

std::shared_ptr<RunLoop> RunLoop::current() {
    return threadIsEnding ? nullptr : loopOfThisThread();
}

void RunLoop::addSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode) {
    RunLoopSource::Wakers& wakers = *source->_wakers;
    const MutexLock lockWakers(wakers.mutex);
    const MutexLock lock(_state->mutex);
    wakers.loops.reserve(wakers.loops.size() + 1);  // what comes after add() must not throw
    if (_state->add(_state->sources, source, mode, 0)) {
        wakers.loops.push_back(_state);
        _state->changed.notifyAll();
    }
}

void RunLoop::removeSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode) {
    RunLoopSource::Wakers& wakers = *source->_wakers;
    const MutexLock lockWakers(wakers.mutex);
    const MutexLock lock(_state->mutex);
    if (_state->remove(_state->sources, source, mode)) {
        wakers.removeOne(_state);
        _state->changed.notifyAll();
    }
}

bool RunLoop::hasSources(std::string_view mode) const {
    const MutexLock lock(_state->mutex);
    return std::any_of(_state->sources.begin(), _state->sources.end(),
                       [&](const auto& entry) { return entry.mode == memberOf(mode); });
}

void RunLoop::addObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode) {
    const MutexLock lock(_state->mutex);
    _state->add(_state->observers, observer, mode, observer->order);
}

void RunLoop::removeObserver(const std::shared_ptr<RunLoopObserver>& observer,
                             std::string_view mode) {
    const MutexLock lock(_state->mutex);
    _state->remove(_state->observers, observer, mode);
}

RunLoopOutcome RunLoop::run(std::string_view mode, double seconds) {
    if (current().get() != this) {
        throw std::logic_error("a run loop can only be run on its own thread");
    }
    const TimePoint limit = deadlineAfter(std::chrono::duration<double>(seconds));
    const State::Run run(*_state, mode);
    RunLoopOutcome outcome = RunLoopOutcome::Finished;
    std::exception_ptr thrown;
    try {
        _state->notify(run, RunLoopEntry);
        outcome = _state->serve(run, limit);
    } catch (...) {
        thrown = std::current_exception();
    }
    thrown = _state->notifyExit(run, std::move(thrown));
    if (thrown != nullptr) {
        std::rethrow_exception(thrown);
    }
    return outcome;
}

void RunLoop::stop() {
    const MutexLock lock(_state->mutex);
    if (_state->innermost != nullptr) {
        _state->innermost->stopped = true;
        _state->changed.notifyAll();
    }
}

}  // namespace platform
