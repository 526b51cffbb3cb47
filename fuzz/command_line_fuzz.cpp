// Whatever stands on the command line: an answer, a plan in which the last setting for each parameter holds, or
// a problem of the command line in one line. Completion takes any words. No device is opened and nothing runs.
//
// Input: the arguments, one a line; \n in one stands for a line end.
#include "host/zrlab/command_line.h"

#include <algorithm>
#include <string>

#include "frame/host_interface.h"
#include "fuzz/expect.h"
#include "fuzz/input.h"
#include "host/record/problem.h"
#include "host/record/run_text.h"
#include "host/run/planner.h"
#include "host/zrlab/completion.h"

namespace {

using fuzz::expect;

// The value for the parameter, by the last text that names it; a text for this part wins.
std::optional<platform::Number> lastSetting(const std::vector<std::string>& settings,
                                            const std::string& parameter,
                                            const std::string& part) {
    for (const std::string& prefix : {part + ":" + parameter + "=", parameter + "="}) {
        for (auto text = settings.rbegin(); text != settings.rend(); ++text) {
            if (text->starts_with(prefix)) {
                return host::readSetting("x=" + text->substr(prefix.size())).value;
            }
        }
    }
    return std::nullopt;
}

void expectPlan(const std::vector<host::RunPlan>& plans, const host::SessionOptions& session) {
    expect(plans.size() == session.names.size(), "a plan for each name");
    for (std::size_t at = 0; at < plans.size(); ++at) {
        expect(plans[at].name == session.names[at], "in this order");
        const auto expectPart = [&](host::Part kind, const host::PartPlan& part) {
            const auto description = host::describePart(ZRLab::defaultLab(), kind, part.name);
            for (const auto& [parameter, declaration] : description->parameters()) {
                const auto value =
                    lastSetting(session.settings, parameter, std::string(host::partText(kind)));
                const platform::Number planned = part.parameter(parameter);
                expect(value.has_value() == planned.isPresent() &&
                           (value.has_value() || !declaration.required()),
                       "every required parameter");
                expect(!value.has_value() ||
                           (planned.kind() == value->kind() && planned.text() == value->text()),
                       "the last setting");
            }
        };
        expectPart(host::Part::Experiment, plans[at].experiment);
        if (plans[at].analysis.has_value()) {
            expectPart(host::Part::Analysis, *plans[at].analysis);
        }
    }
    for (const std::string& warning : host::valueWarnings(plans)) {
        expect(warning.starts_with("warning: ") && warning.find('\n') == std::string::npos,
               "a warning");
    }
}

// Carries out what does not need a device.
void carryOut(host::CommandLine& line,
              const std::vector<std::string>& words,
              const std::vector<const char*>& arguments) {
    const auto answer = line.read(static_cast<int>(arguments.size()), arguments.data());
    if (answer.has_value()) {
        expect(!answer->empty(), "an answer");
        return;
    }
    const auto names = host::commandNames(line.app());
    expect(std::count(names.begin(), names.end(), line.command()) == 1, "a command");
    expect(line.command() != "run" || !line.session.names.empty(), "a name to run");
    expect(std::count(words.begin(), words.end(), line.command()) > 0, "a command that was given");
    if (line.command() == "run") {
        std::vector<host::ParameterSetting> settings;
        for (const std::string& text : line.session.settings) {
            settings.push_back(host::readSetting(text));
        }
        expectPlan(host::planRuns(ZRLab::defaultLab(), line.session.names, settings), line.session);
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    std::vector<std::string> words;
    for (fuzz::Input input(data, size); !input.isAtEnd();) {
        std::string word = input.text('\n');
        for (std::size_t at = 0; (at = word.find("\\n", at)) != std::string::npos;) {
            word.replace(at, 2, "\n");
        }
        words.push_back(word.substr(0, word.find('\0')));
    }
    std::vector<const char*> arguments = {"zrlab"};
    for (const std::string& word : words) {
        arguments.push_back(word.c_str());
    }
    host::CommandLine line;
    try {
        carryOut(line, words, arguments);
    } catch (const host::Problem& problem) {
        const std::string text = problem.what();
        expect(problem.status() == host::kExitUsage && !text.empty(),
               "a problem of the command line");
        const bool isGiven = std::any_of(words.begin(), words.end(), [](const std::string& word) {
            return word.find('\n') != std::string::npos;
        });
        if (text.find('\n') != std::string::npos && !isGiven) {
            std::fprintf(stderr, "%s\n", text.c_str());
        }
        expect(isGiven || text.find('\n') == std::string::npos, "one line");
    }
    // Completion loads the modules that a line names: not here.
    if (std::none_of(words.begin(), words.end(), [](const std::string& word) {
            return word.find("--plugin") == 0 || word.find("--device-module") == 0;
        })) {
        const std::string lines = host::completions(host::CommandLine(), words);
        expect(lines.empty() || lines.ends_with('\n'), "whole lines");
    }
    return 0;
}
