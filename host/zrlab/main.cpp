// zrlab: loads a plug-in module, runs its diagnostics on a device, judges and reports.
#include <algorithm>
#include <exception>
#include <string>
#include <string_view>

#include <malloc.h>

#include <fmt/format.h>

#include "frame/host_interface.h"
#include "host/record/problem.h"
#include "host/run/module_loader.h"
#include "host/run/planner.h"
#include "host/zrlab/campaign_command.h"
#include "host/zrlab/command_line.h"
#include "host/zrlab/completion.h"
#include "host/zrlab/conformance_command.h"
#include "host/zrlab/describe.h"
#include "host/zrlab/device_choice.h"
#include "host/zrlab/device_command.h"
#include "host/zrlab/interrupt.h"
#include "host/zrlab/recording_command.h"
#include "host/zrlab/results_command.h"
#include "host/zrlab/session.h"
#include "host/zrlab/store_command.h"
#include "host/zrlab/terminal.h"
#include "input/nearest.h"

namespace host {

namespace {

// The command of the completion scripts. It is not a part of the command line: the words behind it can
// be anything.
constexpr std::string_view kComplete = "complete";

// A thread that finds the C library's allocator busy gets an arena of its own, up to eight per core, which is
// never given back. Every run has new threads, so without a bound the memory of a long series grows with
// their luck.
constexpr int kMostArenas = 2;

int print(std::string_view text) {
    if (!Terminal::shared().output(text)) {
        throw Problem(kExitError, "cannot write standard output");
    }
    return kExitPassed;
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
    return print(listText(lab));
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
    const CLI::App* command = subcommandOf(commandLine.app(), topic);
    if (command == nullptr) {
        const std::string meant = input::didYouMean(topic, commandNames(commandLine.app()));
        throw Problem(kExitUsage, "help: unknown command \"" + topic + "\"" +
                                      (meant.empty() ? "; zrlab --help lists them" : meant));
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
        return print(describeText(ZRLab::defaultLab(), commandLine.subjects, commandLine.limits));
    }
    loadDeviceModules(commandLine.session.device.modules);
    return command == "campaign" ? campaignCommand(commandLine.campaign, commandLine.session)
                                 : runSession(commandLine.session);
}

int run(int count, const char* const* arguments) {
    interrupt::watch();
    CommandLine commandLine;
    registerBuiltInKinds();
    if (count > 1 && arguments[1] == kComplete) {
        return print(completions(commandLine, {arguments + 2, arguments + count}));
    }
    if (const auto answer = commandLine.read(count, arguments)) {
        return print(*answer);
    }
    const std::string command = commandLine.command();
    if (command == "devices") {
        loadDeviceModules(commandLine.session.device.modules);
        return commandLine.kindsOnly ? deviceKinds() : listedDevices(commandLine.namesOnly);
    }
    if (command == "conformance") {
        loadDeviceModules(commandLine.session.device.modules);
        return conformanceCommand(commandLine.session);
    }
    if (command == "device") {
        loadDeviceModules(commandLine.session.device.modules);
        const DeviceAnswer answer = deviceCommand(commandLine.action, commandLine.subjects);
        print(answer.text);
        return answer.status;
    }
    if (command == "recording") {
        return print(recordingCommand(commandLine.action, commandLine.recordingFile));
    }
    if (command == "store") {
        const StoreAnswer answer = storeCommand(commandLine.action, commandLine.session.store);
        print(answer.text);
        for (const std::string& problem : answer.problems) {
            Terminal::shared().complain(problem);
        }
        return answer.status;
    }
    if (command == "settings") {
        return print(commandLine.settingsText());
    }
    if (command == "results") {
        return print(resultsCommand(commandLine.results));
    }
    if (command == "help") {
        return help(commandLine.helpTopic);
    }
    if (command == "completion") {
        return print(completionScript(commandLine.shell));
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
    mallopt(M_ARENA_MAX, host::kMostArenas);
    try {
        return host::run(count, arguments);
    } catch (const host::Problem& problem) {
        return complain(problem.status(), problem.what());
    } catch (const std::exception& exception) {
        return complain(host::kExitError, exception.what());
    }
}
