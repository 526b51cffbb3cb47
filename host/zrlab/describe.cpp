#include "host/zrlab/describe.h"

#include <algorithm>
#include <cstdint>
#include <memory>
#include <string_view>
#include <utility>

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/record/problem.h"
#include "host/record/run_text.h"
#include "host/run/lone_run.h"
#include "host/run/planner.h"
#include "host/zrlab/device_choice.h"
#include "input/nearest.h"

namespace host {

namespace {

constexpr std::int64_t kTimeoutSeconds = 30;

std::string parameterLines(const ZRDescription& description) {
    std::string out;
    for (const auto& [name, parameter] : description.parameters()) {
        out += fmt::format("    {:<12}  {}  {}\n", name,
                           parameter.required() ? "required" : "optional", parameter.summary());
    }
    return out.empty() ? "    no parameters\n" : out;
}

// A part as a paragraph; nothing when no such part is registered.
std::string partParagraph(const ZRLab& lab, Part part, const std::string& name) {
    const auto description = describePart(lab, part, name);
    if (!description.has_value()) {
        return "";
    }
    return fmt::format("{} {}\n  {}\n{}", partText(part), name, description->summary(),
                       parameterLines(*description));
}

// What runs to show the limits of the name: an analysis runs as a part of a diagnostic. Empty if nothing.
std::string runnableWith(const ZRLab& lab, const std::string& name) {
    const auto names = runnableNames(lab);
    if (std::find(names.begin(), names.end(), name) != names.end()) {
        return name;
    }
    for (const auto& diagnostic : lab.diagnostics()) {
        if (diagnostic.analysisName == name) {
            return diagnostic.name;
        }
    }
    return "";
}

RunPlan leastPlan(const ZRLab& lab, const std::string& name) {
    std::vector<ParameterSetting> settings;
    for (const auto& [kind, part] : partsOf(lab, name)) {
        const auto description = describePart(lab, kind, part);
        if (!description.has_value()) {
            continue;
        }
        for (const auto& [parameter, declaration] : description->parameters()) {
            if (declaration.required()) {
                const std::int64_t least = parameter == kTimeoutParameter ? kTimeoutSeconds : 1;
                settings.push_back({kind, parameter, least});
            }
        }
    }
    return planRuns(lab, {name}, settings).front();
}

std::string limitLines(const ZRLab& lab, const std::string& name) {
    const std::string runnable = runnableWith(lab, name);
    if (runnable.empty()) {
        return "results are not known: no diagnostic has this part\n";
    }
    const RunPlan plan = leastPlan(lab, runnable);
    const RunRecord run =
        runAlone(openDevice({.device = "healthy", .speed = "max", .modules = {}}).services, plan);
    std::string parameters;
    for (const auto& [parameter, value] : plan.experiment.parameters) {
        parameters +=
            fmt::format("{}{} {}", parameters.empty() ? " with " : ", ", parameter, value.text());
    }
    const std::string how =
        fmt::format("of {}{} on the simulated device healthy", runnable, parameters);
    if (!run.failures.empty()) {
        return fmt::format("results are not known: a run {} did not complete: {}\n", how,
                           whyText(run));
    }
    // Each with its limit, or of an experiment on its own with its unit.
    std::vector<std::pair<std::string, std::string>> rows;
    for (const ResultRecord& result : run.results) {
        rows.emplace_back(result.name, limitLine(result.limit, result.unit));
    }
    if (!plan.isDiagnostic()) {
        for (const MeasurementRecord& measurement : run.measurements) {
            rows.emplace_back(measurement.name, measurement.unit);
        }
        for (const auto& [key, value] : run.auxiliaryData) {
            rows.emplace_back(key, "data");
        }
    }
    std::size_t width = 0;
    for (const auto& [result, text] : rows) {
        width = std::max(width, result.size());
    }
    std::string out = fmt::format("results of a run {}\n", how);
    for (const auto& [result, text] : rows) {
        out += fmt::format("    {:<{}}  {}\n", plainLine(result), width, plainLine(text));
    }
    return rows.empty() ? out + "    no results\n" : out;
}

}  // namespace

std::string listText(const ZRLab& lab) {
    const auto section = [&lab](Part part, const std::vector<std::string>& names) {
        std::string out;
        for (const std::string& name : names) {
            const auto description = describePart(lab, part, name);
            out += fmt::format("  {:<26}  {}\n", name,
                               description.has_value() ? description->summary() : "");
        }
        return out;
    };
    std::string out = "Experiments\n" + section(Part::Experiment, lab.experimentNames());
    out += "\nAnalyses\n" + section(Part::Analysis, lab.analysisNames());
    out += "\nDiagnostics\n";
    for (const auto& diagnostic : lab.diagnostics()) {
        out += fmt::format("  {:<26}  {}\n", diagnostic.name, diagnostic.summary);
    }
    return out;
}

std::string describeText(const ZRLab& lab, const std::vector<std::string>& names, bool limits) {
    std::string out;
    for (const std::string& name : names) {
        std::string text;
        if (const auto diagnostic = lab.diagnosticNamed(name)) {
            text = fmt::format("diagnostic {}\n  {}\n\n{}\n{}", name, diagnostic->summary,
                               partParagraph(lab, Part::Experiment, diagnostic->experimentName),
                               partParagraph(lab, Part::Analysis, diagnostic->analysisName));
        } else {
            text = partParagraph(lab, Part::Experiment, name) +
                   partParagraph(lab, Part::Analysis, name);
        }
        if (text.empty()) {
            std::vector<std::string> known = runnableNames(lab);
            const auto analyses = lab.analysisNames();
            known.insert(known.end(), analyses.begin(), analyses.end());
            const std::string meant = input::didYouMean(name, known);
            throw Problem(kExitUsage, "unknown experiment, analysis or diagnostic \"" + name +
                                          "\"" +
                                          (meant.empty() ? "; zrlab list shows them" : meant));
        }
        out += fmt::format("{}{}", out.empty() ? "" : "\n", text);
        if (limits) {
            out += fmt::format("\n{}", limitLines(lab, name));
        }
    }
    return out;
}

}  // namespace host
