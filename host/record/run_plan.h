// RunPlan: what is run, with which parameters. A plan is complete before anything runs; the record of a
// run holds the plan that it followed.
#ifndef ZR_HOST_RECORD_RUN_PLAN_H
#define ZR_HOST_RECORD_RUN_PLAN_H

#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/number.h"
#include "platform/value.h"

namespace host {

// The two parts of a diagnostic; an experiment that runs on its own has the first only.
enum class Part { Experiment, Analysis };

struct PartPlan {
    std::string name;     // as registered
    std::string summary;  // of its description
    // The parameters that the part declares and is given, in the order of declaration.
    std::vector<std::pair<std::string, platform::Number>> parameters;

    // The parameters as setup receives them.
    platform::Dictionary asDictionary() const {
        platform::MutableDictionary entries;
        for (const auto& [parameter, value] : parameters) {
            entries.set(parameter, value);
        }
        return entries;
    }

    // The number given for a parameter; absent when there is none of that name.
    platform::Number parameter(std::string_view name) const {
        for (const auto& [given, value] : parameters) {
            if (given == name) {
                return value;
            }
        }
        return {};
    }
};

struct RunPlan {
    std::string name;     // as it was asked for
    std::string summary;  // the diagnostic's, or the experiment's
    PartPlan experiment;
    std::optional<PartPlan> analysis;  // nothing for an experiment on its own

    bool isDiagnostic() const { return analysis.has_value(); }
};

}  // namespace host

#endif
