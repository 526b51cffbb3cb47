// NaiveLoop: what a run loop does, as plainly as it can be written: copies of lists, searched from the start,
// no thread and no lock. run_loop_fuzz compares the real one with it.
#ifndef ZR_FUZZ_NAIVE_RUN_LOOP_H
#define ZR_FUZZ_NAIVE_RUN_LOOP_H

#include <algorithm>
#include <exception>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "fuzz/clock.h"
#include "platform/run_loop.h"

namespace fuzz {

using platform::RunLoopOutcome;

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
            if (now() >= limit) {
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
        const double limit = seconds > 0 ? now() + seconds : now();
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

}  // namespace fuzz

#endif
