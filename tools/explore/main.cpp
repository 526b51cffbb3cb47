// Runs scenarios in many orders, and one order again.
//
//   interleavings BEGINNING [--more N] [--most N] [--orders N] [--seeds N] [--first-seed S]
//   interleavings SCENARIO --replay ORDER        prints every step of that order
//   interleavings --list
//
// For the scenario of that name, else each whose name has that beginning: every order with at most the scenario's
// number of preemptions and N more (0), though with at most N preemptions, or the first N of these orders; then one
// random order for each of N seeds (2000). Ends with status 1 at the first order that fails, and prints the command
// that replays it; also when no order reaches what the scenario's must.
#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <limits>
#include <map>
#include <random>
#include <string>

#include <fmt/format.h>

#include "platform/log.h"
#include "platform/services.h"
#include "platform/work_queue.h"
#include "tools/explore/scenario.h"
#include "tools/explore/scheduler.h"

using namespace interleavings;

namespace {

// "PLACE:CHOICE,..." of the choices that were not the first option; "-" when all were.
std::string text(const Order& order) {
    std::string text;
    for (std::size_t place = 0; place < order.size(); ++place) {
        if (order[place].chosen != 0) {
            text += fmt::format("{}{}:{}", text.empty() ? "" : ",", place, order[place].chosen);
        }
    }
    return text.empty() ? "-" : text;
}

std::vector<unsigned> readOrder(const char* text) {
    std::vector<unsigned> chosen;
    unsigned place = 0;
    unsigned choice = 0;
    int length = 0;
    while (std::sscanf(text, "%u:%u%n", &place, &choice, &length) == 2) {
        chosen.resize(place + 1, 0);
        chosen[place] = choice;
        text += length;
        text += *text == ',' ? 1 : 0;
    }
    return chosen;
}

Execution once(const Scenario& scenario,
               const std::function<unsigned(std::size_t, const Choice&)>& choose,
               bool trace = false) {
    std::function<void()> check;
    return execute([&] { check = scenario.body(); },
                   [&] {
                       check();
                       check = nullptr;
                   },
                   choose, trace);
}

Execution replay(const Scenario& scenario, const std::vector<unsigned>& chosen) {
    return once(
        scenario,
        [&](std::size_t place, const Choice& from) {
            return place < chosen.size() && chosen[place] < from.all ? chosen[place] : 0;
        },
        true);
}

[[noreturn]] void report(const Scenario& scenario, const Execution& failed, std::string_view how) {
    fmt::print("{}: FAILED{}: {}\nreplay: interleavings {} --replay {}\n", scenario.name, how,
               failed.failure, scenario.name, text(failed.order));
    std::fflush(stdout);
    std::_Exit(1);
}

// How many orders of a scenario reached what.
using Reached = std::map<std::string_view, std::size_t>;

void judge(const Scenario& scenario,
           const Execution& execution,
           std::string_view how,
           Reached& reached) {
    if (!execution.failure.empty()) {
        report(scenario, execution, how);
    }
    for (const std::string_view what : execution.reached) {
        ++reached[what];
    }
}

// Moves on to the next order with at most `most` preemptions; false when there is none.
bool advance(Order& order, unsigned most) {
    for (; !order.empty(); order.pop_back()) {
        Choice& last = order.back();
        while (++last.chosen < last.rare) {
            if (last.spentBefore + (last.chosen >= last.free ? 1 : 0) <= most) {
                return true;
            }
        }
    }
    return false;
}

struct Explored {
    std::size_t orders = 0;
    bool isAll = false;
};

// At most `most` orders: a scenario of many steps has more than a night's worth.
Explored exploreAll(const Scenario& scenario,
                    unsigned preemptions,
                    std::size_t most,
                    Reached& reached) {
    Order order;
    std::size_t orders = 0;
    do {
        if (orders == most) {
            return {orders, false};
        }
        Execution execution = once(scenario, [&](std::size_t place, const Choice&) {
            return place < order.size() ? order[place].chosen : 0;
        });
        ++orders;
        judge(scenario, execution, "", reached);
        order = std::move(execution.order);
    } while (advance(order, preemptions));
    return {orders, true};
}

void exploreSeed(const Scenario& scenario, unsigned seed, Reached& reached) {
    std::mt19937 random(seed);
    // Some orders switch at every other step, some nearly never.
    const unsigned oneIn = 2U << (random() % 5);
    const Execution execution = once(scenario, [&](std::size_t, const Choice& from) {
        const bool goesOn = from.free == 1 && random() % oneIn != 0;
        const unsigned most = random() % 8 == 0 ? from.all : from.rare;
        return goesOn ? 0U : static_cast<unsigned>(random() % most);
    });
    judge(scenario, execution, fmt::format(" with seed {}", seed), reached);
}

std::vector<Scenario> scenarios() {
    std::vector<Scenario> all;
    for (const auto& some :
         {queueScenarios(), runLoopScenarios(), logScenarios(), faultStopScenarios()}) {
        all.insert(all.end(), some.begin(), some.end());
    }
    return all;
}

// What is made at its first use and never destroyed is made before objects are counted.
void warmUp() {
    const Scenario scenario{"warm-up",
                            [] {
                                makeApart(true);
                                platform::Log::isEnabled(platform::LogLevel::Debug);
                                platform::installServices({});
                                makeApart(false);
                                platform::WorkQueue queue(
                                    "warm-up", platform::WorkQueue::Priority::Background);
                                const platform::WorkQueue::Hold hold(queue);
                                return [] {};
                            },
                            0};
    once(scenario, [](std::size_t, const Choice&) { return 0U; });
}

}  // namespace

int main(int argc, char** argv) {
    const std::vector<Scenario> all = scenarios();
    std::string name;
    const char* order = nullptr;
    unsigned more = 0;
    unsigned most = 99;
    unsigned orders = std::numeric_limits<unsigned>::max();
    unsigned seeds = 2000;
    unsigned firstSeed = 1;
    for (int at = 1; at < argc; ++at) {
        const std::string word = argv[at];
        const char* const value = at + 1 < argc ? argv[at + 1] : "";
        const auto number = [&] {
            ++at;
            return static_cast<unsigned>(std::strtoul(value, nullptr, 10));
        };
        if (word == "--list") {
            for (const Scenario& scenario : all) {
                std::puts(scenario.name.data());
            }
            return 0;
        }
        if (word == "--more") {
            more = number();
        } else if (word == "--most") {
            most = number();
        } else if (word == "--orders") {
            orders = number();
        } else if (word == "--seeds") {
            seeds = number();
        } else if (word == "--first-seed") {
            firstSeed = number();
        } else if (word == "--replay") {
            order = value;
            ++at;
        } else {
            name = word;
        }
    }

    warmUp();
    bool found = false;
    const bool isWhole = std::any_of(all.begin(), all.end(),
                                     [&](const Scenario& each) { return each.name == name; });
    for (const Scenario& scenario : all) {
        if (isWhole ? scenario.name != name : !scenario.name.starts_with(name)) {
            continue;
        }
        found = true;
        if (order != nullptr) {
            const Execution execution = replay(scenario, readOrder(order));
            fmt::print("{}{}\n", execution.trace,
                       execution.failure.empty() ? "passed" : execution.failure);
            std::fflush(stdout);
            std::_Exit(execution.failure.empty() ? 0 : 1);
        }
        const unsigned preemptions = std::min(scenario.preemptions + more, most);
        Reached reached;
        const Explored explored = exploreAll(scenario, preemptions, orders, reached);
        for (unsigned seed = firstSeed; seed - firstSeed < seeds; ++seed) {
            exploreSeed(scenario, seed, reached);
        }
        std::string counts;
        for (const std::string_view what : scenario.reaches) {
            if (reached[what] == 0) {
                fmt::print("{}: FAILED: no order reached: {}\n", scenario.name, what);
                return 1;
            }
            counts += fmt::format("; {}: {}", what, reached[what]);
        }
        fmt::print(
            "{}: {} with at most {} preemptions, {} random orders{}: passed\n", scenario.name,
            explored.isAll ? fmt::format("all {} orders", explored.orders)
                           : fmt::format("CUT: the first {} orders, not all,", explored.orders),
            preemptions, seeds, counts);
        std::fflush(stdout);
    }
    if (!found) {
        fmt::print(stderr, "interleavings: no scenario \"{}\"; see --list\n", name);
        return 64;
    }
    return 0;
}
