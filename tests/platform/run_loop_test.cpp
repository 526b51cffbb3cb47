#include "platform/run_loop.h"

#include <atomic>
#include <bit>
#include <chrono>
#include <functional>
#include <limits>
#include <map>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include <unistd.h>

#include <gmock/gmock.h>

#include "tests/platform/threads.h"

namespace {

using platform::kRunLoopCommonModes;
using platform::kRunLoopDefaultMode;
using platform::RunLoop;
using platform::RunLoopObserver;
using platform::RunLoopOutcome;
using platform::RunLoopSource;

using enum RunLoopOutcome;

constexpr double kForever = std::numeric_limits<double>::infinity();

// A thread's loop on which everything that happens is written down: a letter for a source that runs,
// '<' entry, '.' before a turn, 'w' before a wait, 'W' after it, '>' exit.
struct Script {
    const std::shared_ptr<RunLoop> loop = RunLoop::forThisThread();
    std::map<char, std::shared_ptr<RunLoopSource>> sources;
    std::string events;

    // Adds a source of this name.
    void source(char name,
                const std::function<void()>& callback = nullptr,
                std::string_view mode = kRunLoopDefaultMode) {
        sources[name] = std::make_shared<RunLoopSource>([this, name, callback] {
            events += name;
            if (callback) {
                callback();
            }
        });
        loop->addSource(sources[name], mode);
    }
    // The same, ready when the run begins.
    void ready(char name,
               const std::function<void()>& callback = nullptr,
               std::string_view mode = kRunLoopDefaultMode) {
        source(name, callback, mode);
        sources[name]->signal();
    }
    void remove(char name) { loop->removeSource(sources[name], kRunLoopDefaultMode); }
    auto stopping() {
        return [this] { loop->stop(); };
    }
    // Adds an observer that on `activities` does `act`.
    void on(std::uint32_t activities, const std::function<void()>& act, int order = 0) {
        observe(
            activities, [act](std::uint32_t) { act(); }, order);
    }
    std::shared_ptr<RunLoopObserver> observe(std::uint32_t activities,
                                             std::function<void(std::uint32_t)> callback,
                                             int order = 0,
                                             std::string_view mode = kRunLoopDefaultMode) {
        auto made = std::make_shared<RunLoopObserver>(
            RunLoopObserver{activities, order, std::move(callback)});
        loop->addObserver(made, mode);
        return made;
    }
    void writeDownActivities(std::string_view mode) {
        observe(
            platform::RunLoopAllActivities,
            [this](std::uint32_t activity) {
                constexpr char kLetters[] = "<-.--wW>";
                events += kLetters[std::countr_zero(activity)];
            },
            -10, mode);
    }
};

// Runs `body` on a thread of its own, and so on a loop of its own.
void onNewThread(const std::function<void()>& body) {
    std::jthread thread(body);
}

struct Row {
    const char* name;
    std::function<void(Script&)> prepare;
    double seconds;
    RunLoopOutcome outcome;
    const char* events;
};

const Row kRows[] = {
    {"NoSource", [](Script&) {}, kForever, Finished, "<>"},
    {"SourceOfAnotherMode", [](Script& s) { s.ready('a', {}, "other"); }, kForever, Finished, "<>"},
    {"NothingReadyAndNoTime", [](Script& s) { s.source('a'); }, 0, TimedOut, "<.>"},
    {"ReadyAndNoTime", [](Script& s) { s.ready('a'); }, 0, TimedOut, "<.a>"},
    {"ReadyAndNanTime", [](Script& s) { s.ready('a'); }, std::numeric_limits<double>::quiet_NaN(),
     TimedOut, "<.a>"},
    {"InTheOrderAdded", [](Script& s) { s.ready('b'), s.source('x'), s.ready('a'); }, 0, TimedOut,
     "<.ba>"},
    {"SignalledTwice", [](Script& s) { s.ready('a'), s.sources['a']->signal(); }, 0, TimedOut,
     "<.a>"},
    {"AddedTwiceAndRemovedOnce",
     [](Script& s) {
         s.ready('a');
         s.loop->addSource(s.sources['a'], kRunLoopCommonModes);
         s.remove('a');
     },
     0, Finished, "<>"},
    {"SignalledBeforeItIsAdded",
     [](Script& s) {
         s.source('a');
         s.remove('a'), s.remove('a');
         s.sources['a']->signal();
         s.loop->addSource(s.sources['a'], kRunLoopCommonModes);
     },
     0, TimedOut, "<.a>"},
    {"KeptByARunThatEndsBefore",
     [](Script& s) {
         s.ready('a', s.stopping()), s.ready('b');
         s.loop->run(kRunLoopDefaultMode, kForever);
     },
     0, TimedOut, "<.a><.b>"},
    {"SignalsItself", [](Script& s) { s.ready('a', [&s] { s.sources['a']->signal(); }); }, 0,
     TimedOut, "<.a>"},
    {"SignalsAnotherOfTheTurnAndANewOne",
     [](Script& s) {
         s.ready('a', [&s] { s.sources['b']->signal(), s.ready('c', s.stopping()); });
         s.source('b');
     },
     kForever, Stopped, "<.ab.c>"},
    {"RemovesAnother", [](Script& s) { s.ready('a', [&s] { s.remove('b'); }), s.ready('b'); }, 0,
     TimedOut, "<.a>"},
    {"RemovesTheLastOne", [](Script& s) { s.ready('a', [&s] { s.remove('a'); }); }, 0, Finished,
     "<.a>"},
    {"StopsAndRemovesTheLastOne",
     [](Script& s) { s.ready('a', [&s] { s.loop->stop(), s.remove('a'); }); }, 0, Stopped, "<.a>"},
    {"StoppedBeforeTheRun", [](Script& s) { s.loop->stop(), s.ready('a'); }, 0, TimedOut, "<.a>"},
    {"StoppedAtItsEntry", [](Script& s) { s.on(platform::RunLoopEntry, s.stopping()); }, kForever,
     Stopped, "<>"},
    {"SignalledBeforeTheWait",
     [](Script& s) {
         s.source('a', s.stopping());
         s.on(platform::RunLoopBeforeWaiting, [&s] { s.sources['a']->signal(); });
     },
     1e300, Stopped, "<.wW.a>"},
    {"StoppedFromAnotherThread",
     [](Script& s) {
         s.source('a');
         s.on(platform::RunLoopBeforeWaiting,
              [&s] { std::thread([loop = s.loop] { loop->stop(); }).detach(); });
     },
     kForever, Stopped, "<.wW>"},
    {"AddedFromAnotherThread",
     [](Script& s) {
         s.source('a');
         s.ready('b', s.stopping()), s.remove('b');
         s.on(platform::RunLoopBeforeWaiting, [&s] {
             std::thread([loop = s.loop, b = s.sources['b']] {
                 loop->addSource(b, kRunLoopDefaultMode);
             }).detach();
         });
     },
     kForever, Stopped, "<.wW.b>"},
    {"RemovedFromAnotherThread",
     [](Script& s) {
         s.source('a');
         s.on(platform::RunLoopBeforeWaiting, [&s] {
             std::thread([loop = s.loop, a = s.sources['a']] {
                 loop->removeSource(a, kRunLoopDefaultMode);
             }).detach();
         });
     },
     kForever, Finished, "<.wW>"},
    {"ANestedRunTakesTheStop",
     [](Script& s) {
         s.writeDownActivities("inner");
         s.ready('c', s.stopping(), "inner");
         s.ready('a', [&s] { EXPECT_EQ(s.loop->run("inner", kForever), Stopped); });
         s.ready('b', s.stopping());
     },
     kForever, Stopped, "<.a<.c>b>"},
    {"ANestedRunOfTheSameMode",
     [](Script& s) {
         s.ready('a', [&s] { EXPECT_EQ(s.loop->run(kRunLoopDefaultMode, 0), TimedOut); });
         s.ready('b');
     },
     0, TimedOut, "<.a<.b>>"},
    {"ObserversByOrder",
     [](Script& s) {
         const auto write = [&s](char letter) { return [&s, letter] { s.events += letter; }; };
         s.on(platform::RunLoopEntry, write('3'), 2);
         s.on(platform::RunLoopEntry | platform::RunLoopExit, write('1'), 1);
         s.on(platform::RunLoopEntry, write('2'), 1);
     },
     0, Finished, "<123>1"},
};

TEST(RunLoop, DoesWhatTheScriptSays) {
    for (const Row& row : kRows) {
        onNewThread([&row] {
            SCOPED_TRACE(row.name);
            Script script;
            script.writeDownActivities(kRunLoopCommonModes);
            row.prepare(script);
            EXPECT_EQ(script.loop->run(kRunLoopDefaultMode, row.seconds), row.outcome);
            EXPECT_EQ(script.events, row.events);
        });
    }
}

// 'e' and 'l' are exit observers, before and after the one that writes '>'.
TEST(RunLoop, NotifiesEveryExitObserverAndThrowsTheFirstException) {
    const auto throwIf = [](bool throws, const char* what) {
        if (throws) {
            throw std::runtime_error(what);
        }
    };
    const struct {
        bool entryThrows, callbackThrows, exitThrows;
        const char* thrown;
        const char* events;
    } kCases[] = {
        {false, true, false, "callback", "<.ae>l"}, {true, true, false, "entry", "<e>l"},
        {false, false, true, "early", "<.ae>l"},    {false, true, true, "callback", "<.ae>l"},
        {true, false, true, "entry", "<e>l"},
    };
    for (const auto& row : kCases) {
        onNewThread([&] {
            Script script;
            const auto exitObserver = [&](char letter, const char* what, int order) {
                return script.observe(
                    platform::RunLoopExit,
                    [&, letter, what](std::uint32_t) {
                        script.events += letter;
                        throwIf(row.exitThrows, what);
                    },
                    order);
            };
            const auto early = exitObserver('e', "early", -11);
            const auto late = exitObserver('l', "late", 11);
            script.writeDownActivities(kRunLoopDefaultMode);
            const auto entry = script.observe(
                platform::RunLoopEntry, [&](std::uint32_t) { throwIf(row.entryThrows, "entry"); });
            script.ready('a', [&] { throwIf(row.callbackThrows, "callback"); });
            try {
                script.loop->run(kRunLoopDefaultMode, 0);
                ADD_FAILURE() << "nothing was thrown";
            } catch (const std::runtime_error& caught) {
                EXPECT_STREQ(caught.what(), row.thrown);
            }
            EXPECT_EQ(script.events, row.events);
            for (const auto& observer : {early, late, entry}) {
                script.loop->removeObserver(observer, kRunLoopDefaultMode);
            }
            script.remove('a'), script.source('b');
            script.events.clear();
            script.loop->stop();  // no run is left in progress that it could reach
            EXPECT_EQ(script.loop->run(kRunLoopDefaultMode, 0), TimedOut);
            EXPECT_EQ(script.events, "<.>");
        });
    }
}

TEST(RunLoop, RunsOnItsOwnThreadOnly) {
    std::shared_ptr<RunLoop> kept;
    const auto runElsewhere = [&kept] {
        onNewThread([&] {
            EXPECT_THAT([&] { kept->run(kRunLoopDefaultMode, 0); },
                        testing::ThrowsMessage<std::logic_error>(
                            "a run loop can only be run on its own thread"));
        });
    };
    onNewThread([&] {
        Script script;
        script.writeDownActivities(kRunLoopCommonModes);
        script.ready('a');
        kept = script.loop;
        runElsewhere();
        EXPECT_EQ(script.events, "");
        EXPECT_EQ(script.loop->run(kRunLoopDefaultMode, 0), TimedOut);
        EXPECT_EQ(script.events, "<.a>");
    });
    runElsewhere();  // its thread is gone
}

// Asks for the thread's loop when it is destroyed, and says whether it found what it must.
struct AsksAtItsEnd {
    std::function<void(bool)> answer;
    ~AsksAtItsEnd() {
        const bool none = RunLoop::current() == nullptr;
        const auto made = RunLoop::forThisThread();
        bool refused = false;
        try {
            made->run(kRunLoopDefaultMode, 0);
        } catch (const std::logic_error&) {
            refused = true;
        }
        answer(none && made != RunLoop::forThisThread() && refused);
    }
};

TEST(RunLoop, IsGoneForWhatTheEndOfItsThreadDestroys) {
    int answers = 0;
    const auto count = [&answers](bool right) { answers += right ? 1 : 100; };
    onNewThread([&] {
        static thread_local AsksAtItsEnd before;  // and so destroyed after the loop
        before.answer = count;
        const auto owned = std::make_shared<AsksAtItsEnd>();
        owned->answer = count;
        const auto loop = RunLoop::forThisThread();
        loop->addSource(std::make_shared<RunLoopSource>([owned] {}), kRunLoopDefaultMode);
    });
    EXPECT_EQ(answers, 2);
}

TEST(RunLoopDeathTest, IsGoneForAStaticObject) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(
        {
            RunLoop::forThisThread();
            static const AsksAtItsEnd asks{[](bool right) { _exit(right ? 42 : 1); }};
            std::exit(2);
        },
        ::testing::ExitedWithCode(42), "");
}

TEST(RunLoop, WaitsForItsTimeLimitWithoutWork) {
    onNewThread([] {
        constexpr double kLimit = 0.2;
        Script script;
        script.source('a');
        int waits = 0;
        script.on(platform::RunLoopBeforeWaiting, [&waits] { ++waits; });
        const auto start = std::chrono::steady_clock::now();
        EXPECT_EQ(script.loop->run(kRunLoopDefaultMode, kLimit), TimedOut);
        EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::duration<double>(kLimit));
        EXPECT_LE(waits, 1);
        EXPECT_LT(test::threadSeconds(), kLimit / 4);
    });
}

TEST(RunLoop, BelongsToTheThreadThatAskedForIt) {
    std::shared_ptr<RunLoop> kept;
    const auto source = std::make_shared<RunLoopSource>([] {});
    onNewThread([&] {
        EXPECT_EQ(RunLoop::current(), nullptr);
        kept = RunLoop::forThisThread();
        EXPECT_EQ(RunLoop::current(), kept);
        EXPECT_EQ(RunLoop::forThisThread(), kept);
        onNewThread([] { EXPECT_EQ(RunLoop::current(), nullptr); });
        kept->addSource(source, kRunLoopDefaultMode);
        kept->addSource(source, "other");
    });
    source->signal();
    EXPECT_EQ(source.use_count(), 3);
    kept.reset();
    EXPECT_EQ(source.use_count(), 1);
    source->signal();
}

TEST(RunLoop, SaysWhetherAModeHasASource) {
    const auto loop = RunLoop::forThisThread();
    const auto source = std::make_shared<platform::RunLoopSource>([] {});
    EXPECT_FALSE(loop->hasSources(kRunLoopDefaultMode));
    loop->addSource(source, kRunLoopDefaultMode);
    EXPECT_TRUE(loop->hasSources(kRunLoopDefaultMode));
    EXPECT_TRUE(loop->hasSources(platform::kRunLoopCommonModes));
    EXPECT_FALSE(loop->hasSources("other"));
    loop->removeSource(source, kRunLoopDefaultMode);
    EXPECT_FALSE(loop->hasSources(kRunLoopDefaultMode));
}

TEST(RunLoop, TakesItsObserversAlongThoughItsSourcesStay) {
    const std::function<void(RunLoop&, const std::shared_ptr<RunLoopSource>&)> kUses[] = {
        [](RunLoop& loop, const auto& source) { loop.addSource(source, "other"); },
        [](RunLoop& loop, const auto& source) {
            loop.addSource(source, "other");
            loop.removeSource(source, "other");
        },
        [](RunLoop& loop, const auto& source) {
            loop.addSource(source, "other");
            loop.addSource(source, "other");
        },
    };
    for (const auto& use : kUses) {
        const auto source = std::make_shared<RunLoopSource>([] {});
        int entries = 0;
        const auto observer = std::make_shared<RunLoopObserver>(
            RunLoopObserver{platform::RunLoopEntry, std::numeric_limits<int>::min(),
                            [&entries](std::uint32_t) { ++entries; }});
        onNewThread([&] {
            const auto loop = RunLoop::forThisThread();
            loop->addObserver(observer, kRunLoopDefaultMode);
            use(*loop, source);
            EXPECT_EQ(loop->run(kRunLoopDefaultMode, kForever), Finished);
        });
        EXPECT_EQ(entries, 1);
        EXPECT_EQ(observer.use_count(), 1);
    }
}

// Each signaller waits until its signal was served before it gives the next: one that is lost, or
// that does not show what was done before it, hangs.
TEST(RunLoop, LosesNoSignalOfManyThreads) {
    constexpr int kSignallers = 3;
    constexpr int kSignals = 2000;
    const auto loop = RunLoop::forThisThread();
    std::atomic<int> finished = 0;
    const auto end = std::make_shared<RunLoopSource>([&] {
        if (finished == kSignallers) {
            loop->stop();
        }
    });
    loop->addSource(end, kRunLoopDefaultMode);
    struct Signaller {
        int given = 0;  // no atomic: the signal and its answer are what orders the accesses
        std::atomic<int> served = 0;
    };
    Signaller signallers[kSignallers];
    std::vector<std::jthread> threads;
    for (Signaller& self : signallers) {
        threads.emplace_back([&] {
            const auto source = std::make_shared<RunLoopSource>([&self] {
                self.served = self.given;
                self.served.notify_one();
            });
            for (int signal = 1; signal <= kSignals; ++signal) {
                if (signal % 100 == 1) {
                    loop->removeSource(source, kRunLoopDefaultMode);
                    loop->addSource(source, kRunLoopDefaultMode);
                }
                self.given = signal;
                source->signal();
                self.served.wait(signal - 1);
            }
            loop->removeSource(source, kRunLoopDefaultMode);
            ++finished;
            end->signal();
        });
    }
    EXPECT_EQ(loop->run(kRunLoopDefaultMode, kForever), Stopped);
    threads.clear();
    loop->removeSource(end, kRunLoopDefaultMode);
    EXPECT_EQ(loop->run(kRunLoopDefaultMode, kForever), Finished);
}

TEST(RunLoop, MayEndWhileItsSourcesAreSignalled) {
    std::atomic<int> served = 0;
    const auto source = std::make_shared<RunLoopSource>([&] { ++served; });
    const std::jthread signaller([&](const std::stop_token& over) {
        while (!over.stop_requested()) {
            source->signal();
        }
    });
    for (int i = 0; i < 100 || served == 0; ++i) {
        onNewThread([&] {
            const auto loop = RunLoop::forThisThread();
            loop->addSource(source, kRunLoopDefaultMode);
            loop->run(kRunLoopDefaultMode, 0);
        });
    }
}

}  // namespace
