// Planning: what is to be run, checked before anything runs.
#ifndef ZR_HOST_RUN_PLANNER_H
#define ZR_HOST_RUN_PLANNER_H

#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "frame/host_interface.h"
#include "host/record/run_plan.h"
#include "platform/number.h"

namespace host {

// A value for a parameter, as given by PARAM=VALUE, experiment:PARAM=VALUE or analysis:PARAM=VALUE.
struct ParameterSetting {
    std::optional<Part> part;  // only that part; nothing: every part that declares the parameter
    std::string name;
    platform::Number value;
};

// Reads a setting. An integer becomes a signed 64-bit number (an unsigned one beyond its range), a
// decimal or an exponent a double, true and false a boolean. Throws a Problem (kExitUsage) when it is
// not one.
ParameterSetting readSetting(std::string_view text);
std::vector<ParameterSetting> readSettings(const std::vector<std::string>& texts);

// Plans a run for each name: a diagnostic, or an experiment on its own. Every part gets the settings that
// it declares: one for that part over one for every part, then a later one over an earlier. Throws a
// Problem (kExitUsage) about an unknown name, a setting that no part declares, a required parameter
// without a value, or a diagnostic whose part is not registered.
std::vector<RunPlan> planRuns(const ZRLab& lab,
                              const std::vector<std::string>& names,
                              const std::vector<ParameterSetting>& settings);

// The values that a part cannot take as they are given, one line for each: a count that is not a whole
// number from 0 to 2^53, a time-out that is not a number of seconds from 0 (infinity means never). Which
// parameters these are is known by their names (host/record/plugin_data.h).
std::vector<std::string> valueWarnings(const std::vector<RunPlan>& plans);

// The description that a new instance of the part gives; nothing when the name is not registered.
std::optional<ZRDescription> describePart(const ZRLab& lab, Part part, std::string_view name);

// The parts that run under a name: those of the diagnostic, else the experiment of that name, which need
// not be registered.
std::vector<std::pair<Part, std::string>> partsOf(const ZRLab& lab, const std::string& name);

// The names that can be run: diagnostics, then experiments.
std::vector<std::string> runnableNames(const ZRLab& lab);

}  // namespace host

#endif
