// RunPlan: what is to be run, with which parameters; made and checked before anything runs.
#ifndef ZR_HOST_RUN_RUN_PLAN_H
#define ZR_HOST_RUN_RUN_PLAN_H

#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "frame/host_interface.h"
#include "host/record/run_record.h"
#include "platform/value.h"

namespace host {

// A value for a parameter, as given by PARAM=VALUE, experiment:PARAM=VALUE or analysis:PARAM=VALUE.
struct ParameterSetting {
    std::optional<Part> part;  // only that part; nothing: every part that declares the parameter
    std::string name;
    platform::Number value;
};

// Reads a setting. An integer becomes a signed 64-bit number (an unsigned one beyond its range), a
// decimal or an exponent a double, true and false a boolean. On failure returns nothing and stores
// one line in `problem`.
std::optional<ParameterSetting> readSetting(std::string_view text, std::string& problem);

struct PartPlan {
    std::string name;  // as registered
    std::string summary;
    // What the part declares and is given, in the order of declaration.
    std::vector<std::pair<std::string, platform::Number>> parameters;

    platform::Dictionary asDictionary() const;
};

struct RunPlan {
    std::string name;
    std::string summary;
    bool isDiagnostic = false;
    PartPlan experiment;
    std::optional<PartPlan> analysis;

    // The number given for an experiment's parameter; absent when it has none of that name.
    platform::Number experimentParameter(std::string_view parameter) const;
};

// Plans a run for each name: a diagnostic, or an experiment on its own. Every part gets the settings
// that it declares: one for that part over one for every part, then a later one over an earlier. On failure (an unknown name, a setting that no part
// declares, a required parameter without a value, a diagnostic whose part is not registered) returns
// nothing and stores one line in `problem`.
std::optional<std::vector<RunPlan>> planRuns(const ZRLab& lab,
                                             const std::vector<std::string>& names,
                                             const std::vector<ParameterSetting>& settings,
                                             std::string& problem);

// What a new instance of the part says of itself; nothing when the name is not registered.
std::optional<ZRDescription> describePart(const ZRLab& lab, Part part, std::string_view name);

// The names that can be run: diagnostics, then experiments.
std::vector<std::string> runnableNames(const ZRLab& lab);

}  // namespace host

#endif
