#include "host/run/planner.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <cstdint>
#include <system_error>
#include <utility>

#include <fmt/format.h>

#include "host/record/plugin_data.h"
#include "host/record/problem.h"
#include "host/record/run_text.h"
#include "input/nearest.h"

namespace host {

namespace {

template <class T>
std::optional<platform::Number> readAs(std::string_view text) {
    T value{};
    const auto [end, problem] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (problem != std::errc() || end != text.data() + text.size()) {
        return std::nullopt;
    }
    return platform::Number(value);
}

std::optional<platform::Number> readNumber(std::string_view text) {
    if (text == "true" || text == "false") {
        return platform::Number(text == "true");
    }
    if (auto number = readAs<std::int64_t>(text)) {
        return number;
    }
    if (auto number = readAs<std::uint64_t>(text)) {
        return number;
    }
    // Digits alone are an integer; one that fits neither kind is refused rather than rounded.
    const bool isInteger = text.find_first_not_of("+-0123456789") == std::string_view::npos;
    return isInteger ? std::nullopt : readAs<double>(text);
}

// Why there is nothing to run under the name.
std::string unknownText(const ZRLab& lab, const std::string& name) {
    const auto analyses = lab.analysisNames();
    if (std::find(analyses.begin(), analyses.end(), name) != analyses.end()) {
        std::string text = name + " is an analysis: it is run as a part of a diagnostic";
        for (const auto& diagnostic : lab.diagnostics()) {
            text += diagnostic.analysisName == name ? ", " + diagnostic.name : "";
        }
        return text;
    }
    std::string meant = input::didYouMean(name, runnableNames(lab));
    if (meant.empty() && name.find('=') != std::string::npos) {
        meant = "; did you mean --set " + name + "?";
    }
    return "unknown diagnostic or experiment \"" + name + "\"" +
           (meant.empty() ? "; zrlab list shows them" : meant);
}

RunPlan planOf(const ZRLab& lab, const std::string& name) {
    RunPlan plan;
    plan.name = name;
    if (const auto diagnostic = lab.diagnosticNamed(name)) {
        plan.summary = diagnostic->summary;
        plan.experiment.name = diagnostic->experimentName;
        plan.analysis.emplace().name = diagnostic->analysisName;
        return plan;
    }
    const auto experiments = lab.experimentNames();
    if (std::find(experiments.begin(), experiments.end(), name) == experiments.end()) {
        throw Problem(kExitUsage, unknownText(lab, name));
    }
    plan.experiment.name = name;
    return plan;
}

// What the settings give to a part's parameter: the last one for that part, else the last one for
// every part. Those that were looked at are marked as used.
std::optional<platform::Number> valueFor(const std::string& parameter,
                                         Part kind,
                                         const std::vector<ParameterSetting>& settings,
                                         std::vector<bool>& used) {
    std::optional<platform::Number> value;
    for (const std::optional<Part> part : {std::optional<Part>(), std::optional(kind)}) {
        for (std::size_t i = 0; i < settings.size(); ++i) {
            if (settings[i].name == parameter && settings[i].part == part) {
                value = settings[i].value;
                used[i] = true;
            }
        }
    }
    return value;
}

// What a parameter of this name holds, and whether the value fits. Parts read counts as integers of 64 bits
// or as floating-point numbers: up to 2^53 they all read the same.
struct Meaning {
    bool (*isFitting)(double value);
    std::string_view text;
};
constexpr Meaning kCount = {
    [](double value) { return value >= 0 && value <= 0x1p53 && value == std::trunc(value); },
    "a whole number from 0 to 9007199254740992"};
constexpr Meaning kSeconds = {[](double value) { return value >= 0; },
                              "a number of seconds from 0"};

const Meaning* meaningOf(std::string_view parameter) {
    for (const CountParameter& count : kCountParameters) {
        if (count.parameter == parameter) {
            return &kCount;
        }
    }
    return parameter == kTimeoutParameter ? &kSeconds : nullptr;
}

}  // namespace

std::vector<std::string> valueWarnings(const std::vector<RunPlan>& plans) {
    std::vector<std::string> warnings;
    const auto look = [&warnings](const PartPlan& part) {
        for (const auto& [parameter, value] : part.parameters) {
            const Meaning* meaning = meaningOf(parameter);
            if (meaning == nullptr || meaning->isFitting(value.asDouble())) {
                continue;
            }
            std::string warning =
                fmt::format("warning: {} {} is not {}; the run may use another value", parameter,
                            value.text(), meaning->text);
            if (std::find(warnings.begin(), warnings.end(), warning) == warnings.end()) {
                warnings.push_back(std::move(warning));
            }
        }
    };
    for (const RunPlan& plan : plans) {
        look(plan.experiment);
        if (plan.analysis.has_value()) {
            look(*plan.analysis);
        }
    }
    return warnings;
}

std::optional<ZRDescription> describePart(const ZRLab& lab, Part part, std::string_view name) {
    if (part == Part::Experiment) {
        const auto experiment = lab.makeExperiment(name);
        return experiment != nullptr ? std::optional(experiment->experimentDescription())
                                     : std::nullopt;
    }
    const auto analysis = lab.makeAnalysis(name);
    return analysis != nullptr ? std::optional(analysis->analysisDescription()) : std::nullopt;
}

ParameterSetting readSetting(std::string_view text) {
    const auto fail = [text](const std::string& reason) {
        throw Problem(kExitUsage, "--set " + std::string(text) + ": " + reason);
    };
    const std::size_t equals = text.find('=');
    if (equals == std::string_view::npos || equals == 0) {
        fail("not of the form PARAM=VALUE");
    }
    ParameterSetting setting;
    std::string_view name = text.substr(0, equals);
    for (const Part part : {Part::Experiment, Part::Analysis}) {
        const std::string prefix = std::string(partText(part)) + ":";
        if (name.starts_with(prefix)) {
            setting.part = part;
            name.remove_prefix(prefix.size());
            break;
        }
    }
    if (name.empty()) {
        fail("not of the form PARAM=VALUE");
    }
    setting.name = name;
    const std::string_view value = text.substr(equals + 1);
    const auto number = readNumber(value);
    if (!number.has_value()) {
        fail("\"" + std::string(value) + "\" is not a valid number");
    }
    setting.value = *number;
    return setting;
}

std::vector<ParameterSetting> readSettings(const std::vector<std::string>& texts) {
    std::vector<ParameterSetting> settings;
    settings.reserve(texts.size());
    for (const std::string& text : texts) {
        settings.push_back(readSetting(text));
    }
    return settings;
}

std::vector<RunPlan> planRuns(const ZRLab& lab,
                              const std::vector<std::string>& names,
                              const std::vector<ParameterSetting>& settings) {
    std::vector<RunPlan> plans;
    std::vector<bool> used(settings.size(), false);
    std::vector<std::string> declared;
    std::vector<std::string> missing;  // "NAME of its experiment"

    for (const std::string& name : names) {
        RunPlan& plan = plans.emplace_back(planOf(lab, name));
        const auto fill = [&](Part kind, PartPlan& part) {
            const auto description = describePart(lab, kind, part.name);
            if (!description.has_value()) {
                throw Problem(kExitUsage, name + ": its " + std::string(partText(kind)) + " " +
                                              part.name + " is not registered");
            }
            part.summary = description->summary();
            for (const auto& [parameter, declaration] : description->parameters()) {
                declared.push_back(parameter);
                const auto value = valueFor(parameter, kind, settings, used);
                if (value.has_value()) {
                    part.parameters.emplace_back(parameter, *value);
                } else if (declaration.required()) {
                    missing.push_back(
                        fmt::format("\"{}\" of the {} {}", parameter, partText(kind), part.name));
                }
            }
        };
        fill(Part::Experiment, plan.experiment);
        if (plan.analysis.has_value()) {
            fill(Part::Analysis, *plan.analysis);
        } else {
            plan.summary = plan.experiment.summary;
        }
    }
    // An unknown parameter first: if it is a misspelled one, the right one is without a value.
    for (std::size_t i = 0; i < settings.size(); ++i) {
        if (!used[i]) {
            const std::string whose = settings[i].part.has_value()
                                          ? "no " + std::string(partText(*settings[i].part))
                                          : "none of the parts";
            std::erase(declared, settings[i].name);  // of another part
            const std::string meant = input::didYouMean(settings[i].name, declared);
            throw Problem(kExitUsage,
                          whose + " to be run declares a parameter \"" + settings[i].name + "\"" +
                              (meant.empty() ? "; zrlab describe NAME shows them" : meant));
        }
    }
    if (!missing.empty()) {
        throw Problem(kExitUsage, fmt::format("no value for {}; give one with --set PARAM=NUMBER",
                                              fmt::join(missing, ", ")));
    }
    return plans;
}

std::vector<std::pair<Part, std::string>> partsOf(const ZRLab& lab, const std::string& name) {
    if (const auto diagnostic = lab.diagnosticNamed(name)) {
        return {{Part::Experiment, diagnostic->experimentName},
                {Part::Analysis, diagnostic->analysisName}};
    }
    return {{Part::Experiment, name}};
}

std::vector<std::string> runnableNames(const ZRLab& lab) {
    std::vector<std::string> names;
    for (const auto& diagnostic : lab.diagnostics()) {
        names.push_back(diagnostic.name);
    }
    const auto experiments = lab.experimentNames();
    names.insert(names.end(), experiments.begin(), experiments.end());
    return names;
}

}  // namespace host
