// A run loop against a naive model: a program of operations, which callbacks carry on, gives the same
// order of events on both. The clock stands still but where the program sets it.
//
// Input: operations, each a letter and what it needs (sources 0 to 3, observers 0 to 3, modes 0 to 3):
// s signal a source, a add and r remove one in a mode, o add and p remove an observer in a mode, t a quarter of
// a second passes, x stop, ! throw, R run a mode with one of eight limits, . the callback returns. When a loop
// is about to wait for good: z the time passes, any other digit a source is added and signalled.
#include "platform/run_loop.h"

#include <cmath>
#include <map>

#include "fuzz/clock.h"
#include "fuzz/expect.h"
#include "fuzz/input.h"

namespace {

using platform::RunLoopOutcome;

double now = 0;  // seconds

void setNow(double seconds) {
    now = seconds;
    fuzz::setClock(fuzz::atSecond(seconds));
}

// The model: copies of lists, searched from the start, and no thread.
struct NaiveLoop {
    struct Source {
        explicit Source(std::function<void()> body) : callback(std::move(body)) {}
        void signal() { isSignalled = true; }
        std::function<void()> callback;
        bool isSignalled = false;
    };
    using Observer = platform::RunLoopObserver;
    // By order, then by when it was added.
    template <class T>
    using Entries = std::map<std::pair<int, int>, std::pair<std::shared_ptr<T>, std::string>>;

    Entries<Source> sources;
    Entries<Observer> observers;
    int added = 0;
    std::vector<bool> stops;  // of the runs in progress

    static std::string member(std::string_view mode) {
        return std::string(mode == platform::kRunLoopCommonModes ? platform::kRunLoopDefaultMode
                                                                 : mode);
    }
    template <class T>
    static auto find(Entries<T>& entries, const std::shared_ptr<T>& one, std::string_view mode) {
        return std::find_if(entries.begin(), entries.end(), [&](const auto& entry) {
            return entry.second == std::pair(one, member(mode));
        });
    }
    template <class T>
    void add(Entries<T>& entries, const std::shared_ptr<T>& one, std::string_view mode, int order) {
        if (find(entries, one, mode) == entries.end()) {
            entries[{order, ++added}] = {one, member(mode)};
        }
    }
    template <class T>
    void remove(Entries<T>& entries, const std::shared_ptr<T>& one, std::string_view mode) {
        if (const auto found = find(entries, one, mode); found != entries.end()) {
            entries.erase(found);
        }
    }
    void addSource(const std::shared_ptr<Source>& one, std::string_view mode) {
        add(sources, one, mode, 0);
    }
    void removeSource(const std::shared_ptr<Source>& one, std::string_view mode) {
        remove(sources, one, mode);
    }
    void addObserver(const std::shared_ptr<Observer>& one, std::string_view mode) {
        add(observers, one, mode, one->order);
    }
    void removeObserver(const std::shared_ptr<Observer>& one, std::string_view mode) {
        remove(observers, one, mode);
    }
    void stop() {
        if (!stops.empty()) {
            stops.back() = true;
        }
    }

    // Calls `visit` with those of the mode that were there at the start and still are.
    template <class T, class Visit>
    void each(Entries<T>& entries, const std::string& mode, const Visit& visit) {
        for (const auto& [place, entry] : Entries<T>(entries)) {
            if (entry.second == mode && entries.count(place) != 0) {
                visit(*entry.first);
            }
        }
    }
    void notify(const std::string& mode, std::uint32_t activity) {
        each(observers, mode, [&](Observer& one) {
            if ((one.activities & activity) != 0) {
                one.callback(activity);
            }
        });
    }
    bool has(const std::string& mode, bool signalled) {
        bool found = false;
        each(sources, mode, [&](Source& one) { found = found || !signalled || one.isSignalled; });
        return found;
    }
    RunLoopOutcome serve(const std::string& mode, double limit) {
        while (true) {
            for (const bool before : {true, false}) {
                if (stops.back()) {
                    return RunLoopOutcome::Stopped;
                }
                if (!has(mode, false)) {
                    return RunLoopOutcome::Finished;
                }
                if (before) {
                    notify(mode, platform::RunLoopBeforeSources);
                    each(sources, mode, [&](Source& one) {
                        if (one.isSignalled && !stops.back()) {
                            one.isSignalled = false;
                            one.callback();
                        }
                    });
                }
            }
            if (now >= limit) {
                return RunLoopOutcome::TimedOut;
            }
            if (!has(mode, true)) {
                notify(mode, platform::RunLoopBeforeWaiting);
                notify(mode, platform::RunLoopAfterWaiting);
            }
        }
    }
    RunLoopOutcome run(std::string_view in, double seconds) {
        const std::string mode = member(in);
        const double limit = seconds > 0 ? now + seconds : now;
        stops.push_back(false);
        std::exception_ptr thrown;
        RunLoopOutcome outcome{};
        try {
            notify(mode, platform::RunLoopEntry);
            outcome = serve(mode, limit);
        } catch (int) {
            thrown = std::current_exception();
        }
        each(observers, mode, [&](Observer& one) {
            try {
                if ((one.activities & platform::RunLoopExit) != 0) {
                    one.callback(platform::RunLoopExit);
                }
            } catch (int) {
                thrown = thrown != nullptr ? thrown : std::current_exception();
            }
        });
        stops.pop_back();
        if (thrown != nullptr) {
            std::rethrow_exception(thrown);
        }
        return outcome;
    }
};

constexpr std::string_view kModes[] = {"a", "b", platform::kRunLoopDefaultMode,
                                       platform::kRunLoopCommonModes};
constexpr double kLimits[] = {0, -1, NAN, 0.5, 1, 10, INFINITY, 1e300};

// Plays the program on a loop and writes down what happens.
template <class Loop, class Source>
class Player {
  public:
    Player(Loop& loop, fuzz::Input input) : _loop(loop), _input(input) {
        setNow(0);
        for (std::size_t k = 0; k < 4; ++k) {
            _sources.push_back(std::make_shared<Source>([this, k] {
                _say("source", k);
                _carryOn();
            }));
            _observers.push_back(_observer(platform::RunLoopAllActivities >> (k == 3 ? 6 : 0),
                                           1 - static_cast<int>(k) % 3,
                                           [this, k](std::uint32_t activity) {
                                               _say("observer", k * 1000 + activity);
                                               _carryOn();
                                           }));
        }
        _guard =
            _observer(platform::RunLoopBeforeWaiting, 99, [this](std::uint32_t) { _endWait(); });
        for (const std::string_view mode : kModes) {
            _loop.addObserver(_guard, mode);
        }
        while (!_input.isAtEnd()) {
            try {
                _carryOn();
            } catch (int number) {
                _say("thrown", static_cast<std::size_t>(number));
            }
        }
        for (const std::string_view mode : kModes) {
            _loop.removeObserver(_guard, mode);
            for (std::size_t k = 0; k < 4; ++k) {
                _loop.removeSource(_sources[k], mode);
                _loop.removeObserver(_observers[k], mode);
            }
        }
    }

    std::string events;

  private:
    static auto _observer(std::uint32_t activities,
                          int order,
                          std::function<void(std::uint32_t)> callback) {
        return std::make_shared<platform::RunLoopObserver>(
            platform::RunLoopObserver{activities, order, std::move(callback)});
    }
    void _say(const char* what, std::size_t number) {
        events += what;
        events += ' ' + std::to_string(number) + '\n';
    }
    std::string_view _mode() { return kModes[_input.below(4)]; }

    void _carryOn() {
        while (!_input.isAtEnd()) {
            switch (_input.letter("saroptx!R.")) {
                case 's':
                    _sources[_input.below(4)]->signal();
                    break;
                case 'a': {
                    const auto k = _input.below(4);
                    _loop.addSource(_sources[k], _mode());
                    break;
                }
                case 'r': {
                    const auto k = _input.below(4);
                    _loop.removeSource(_sources[k], _mode());
                    break;
                }
                case 'o': {
                    const auto k = _input.below(4);
                    _loop.addObserver(_observers[k], _mode());
                    break;
                }
                case 'p': {
                    const auto k = _input.below(4);
                    _loop.removeObserver(_observers[k], _mode());
                    break;
                }
                case 't':
                    setNow(now + 0.25);
                    break;
                case 'x':
                    _loop.stop();
                    break;
                case '!':
                    throw static_cast<int>(_input.rest().size());
                case 'R':
                    _run();
                    break;
                case '.':
                    return;
            }
        }
    }
    void _run() {
        const std::string_view mode = _mode();
        const double limit = kLimits[_input.below(8)];
        if (_runs.size() == 4) {
            return;
        }
        _runs.emplace_back(mode, limit);
        try {
            _say("ended", static_cast<std::size_t>(_loop.run(mode, limit)));
        } catch (...) {
            _runs.pop_back();
            throw;
        }
        _runs.pop_back();
    }
    // The last observer before each wait, so that none lasts.
    void _endWait() {
        const auto& [mode, limit] = _runs.back();
        const char byte = _input.letter("z0123");
        if (_input.isAtEnd() && limit > 10) {
            _loop.stop();
        } else if (_input.isAtEnd() || (byte == 'z' && !(limit > 10))) {
            setNow(now + 100);
        } else {
            const auto& source = _sources[static_cast<std::size_t>(byte) % 4];
            _loop.addSource(source, mode);
            source->signal();
        }
    }

    Loop& _loop;
    fuzz::Input _input;
    std::vector<std::shared_ptr<Source>> _sources;
    std::vector<std::shared_ptr<platform::RunLoopObserver>> _observers;
    std::shared_ptr<platform::RunLoopObserver> _guard;
    std::vector<std::pair<std::string_view, double>> _runs;
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const fuzz::Input input(data, size);
    NaiveLoop model;
    const Player<NaiveLoop, NaiveLoop::Source> expected(model, input);
    const Player<platform::RunLoop, platform::RunLoopSource> real(
        *platform::RunLoop::forThisThread(), input);
    if (real.events != expected.events) {
        std::fprintf(stderr, "the model:\n%sthe run loop:\n%s", expected.events.c_str(),
                     real.events.c_str());
    }
    fuzz::expect(real.events == expected.events, "the order of events");
    return 0;
}
