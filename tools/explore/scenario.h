// A scenario: what is run in every order, and what must hold after each.
#ifndef ZR_TOOLS_EXPLORE_SCENARIO_H
#define ZR_TOOLS_EXPLORE_SCENARIO_H

#include <functional>
#include <string_view>
#include <vector>

namespace interleavings {

// One execution's body: runs as thread 0. It returns what is checked when every thread has ended.
using Body = std::function<std::function<void()>()>;

struct Scenario {
    std::string_view name;
    Body body;
    unsigned preemptions;                        // of the orders that the short form explores
    std::vector<std::string_view> reaches = {};  // what some of its orders must reach()
};

// The scenarios of each file.
std::vector<Scenario> queueScenarios();
std::vector<Scenario> runLoopScenarios();
std::vector<Scenario> logScenarios();
std::vector<Scenario> faultStopScenarios();

}  // namespace interleavings

#endif
