// zrlab: loads a plug-in module, runs its diagnostics on a device, judges and reports.
#include <algorithm>
#include <exception>
#include <string>

#include <fmt/format.h>

#include "frame/host_interface.h"
#include "host/record/problem.h"
#include "host/record/run_text.h"
#include "host/run/module_loader.h"
#include "host/run/planner.h"
#include "host/zrlab/command_line.h"
#include "host/zrlab/device_choice.h"
#include "host/zrlab/interrupt.h"
#include "host/zrlab/session.h"
#include "host/zrlab/terminal.h"
#include "input/nearest.h"

namespace host {

namespace {

int print(const std::string& text) {
    if (!Terminal::shared().output(text)) {
        throw Problem(kExitError, "cannot write standard output");
    }
    return kExitPassed;
}

std::string parameterLines(const ZRDescription& description) {
    std::string out;
    for (const auto& [name, parameter] : description.parameters()) {
        out += fmt::format("    {:<12}  {}  {}\n", name,
                           parameter.required() ? "required" : "optional", parameter.summary());
    }
    return out.empty() ? "    no parameters\n" : out;
}

// A part as a paragraph; nothing when no such part is registered.
std::string partParagraph(Part part, const std::string& name) {
    const auto description = describePart(ZRLab::defaultLab(), part, name);
    if (!description.has_value()) {
        return "";
    }
    return fmt::format("{} {}\n  {}\n{}", partText(part), name, description->summary(),
                       parameterLines(*description));
}

int list(bool namesOnly) {
    const ZRLab& lab = ZRLab::defaultLab();
    if (namesOnly) {
        std::string out;
        for (const std::string& name : runnableNames(lab)) {
            out += name + "\n";
        }
        return print(out);
    }
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
    return print(out);
}

int describe(const std::vector<std::string>& names) {
    const ZRLab& lab = ZRLab::defaultLab();
    std::string out;
    for (const std::string& name : names) {
        std::string text;
        if (const auto diagnostic = lab.diagnosticNamed(name)) {
            text = fmt::format("diagnostic {}\n  {}\n\n{}\n{}", name, diagnostic->summary,
                               partParagraph(Part::Experiment, diagnostic->experimentName),
                               partParagraph(Part::Analysis, diagnostic->analysisName));
        } else {
            text = partParagraph(Part::Experiment, name) + partParagraph(Part::Analysis, name);
        }
        if (text.empty()) {
            std::vector<std::string> known = runnableNames(lab);
            const auto analyses = lab.analysisNames();
            known.insert(known.end(), analyses.begin(), analyses.end());
            throw Problem(kExitUsage, "unknown experiment, analysis or diagnostic \"" + name +
                                          "\"" + input::didYouMean(name, known));
        }
        out += (out.empty() ? "" : "\n") + text;
    }
    return print(out);
}

int deviceKinds() {
    std::string out;
    for (const devices::Kind& kind : devices::kinds()) {
        out += fmt::format("{:<12}  {}; {}{}\n", kind.name, kind.summary,
                           kind.takesSpeed ? "takes --speed" : "runs in real time",
                           kind.hasFaults ? ", can be made to fail" : "");
    }
    return print(out);
}

int listedDevices(bool namesOnly) {
    const auto listed = listDevices();
    std::size_t width = 0;
    for (const devices::Entry& device : listed) {
        width = std::max(width, device.name.size());
    }
    std::string out;
    for (const devices::Entry& device : listed) {
        out += namesOnly ? device.name + "\n"
                         : fmt::format("{:<{}}  {}\n", device.name, width, device.summary);
    }
    return print(out);
}

int help(const std::string& topic) {
    // A command line of its own: one that has read a command explains only that.
    const CommandLine commandLine;
    if (topic.empty()) {
        return print(commandLine.app().help());
    }
    const CLI::App* command = commandLine.find(topic);
    if (command == nullptr) {
        throw Problem(kExitUsage, "help: unknown command \"" + topic + "\"" +
                                      input::didYouMean(topic, commandLine.commandNames()));
    }
    return print(command->help(commandLine.app().get_name()));
}

int withPlugin(const CommandLine& commandLine) {
    loadModule(commandLine.plugin);
    for (const auto& refusal : ZRLab::defaultLab().refusals()) {
        Terminal::shared().complain(
            fmt::format("the {} name \"{}\" is taken; the module's second "
                        "registration of it is ignored",
                        refusal.kind, refusal.name));
    }
    const std::string command = commandLine.command();
    if (command == "list") {
        return list(commandLine.namesOnly);
    }
    if (command == "describe") {
        return describe(commandLine.subjects);
    }
    loadDeviceModules(commandLine.session.device.modules);
    return runSession(commandLine.session);
}

int run(int count, const char* const* arguments) {
    interrupt::watch();
    CommandLine commandLine;
    if (const auto answer = commandLine.read(count, arguments)) {
        return print(*answer);
    }
    registerBuiltInKinds();
    const std::string command = commandLine.command();
    if (command == "devices") {
        loadDeviceModules(commandLine.session.device.modules);
        return commandLine.kindsOnly ? deviceKinds() : listedDevices(commandLine.namesOnly);
    }
    if (command == "help") {
        return help(commandLine.helpTopic);
    }
    if (command == "completion") {
        return print(completionScript(commandLine.app(), commandLine.shell));
    }
    if (command == "manual") {
        return print(manualPage(commandLine.app(), commandLine.session.version));
    }
    return withPlugin(commandLine);
}

}  // namespace

}  // namespace host

int main(int count, char** arguments) {
    const auto complain = [](int status, const char* problem) {
        host::Terminal::shared().complain(problem);
        return status;
    };
    try {
        return host::run(count, arguments);
    } catch (const host::Problem& problem) {
        return complain(problem.status(), problem.what());
    } catch (const std::exception& exception) {
        return complain(host::kExitError, exception.what());
    }
}
