#include "host/zrlab/command_line.h"

#include <cctype>
#include <cstdint>
#include <sstream>
#include <string_view>

#include <fmt/format.h>

#include "host/record/problem.h"
#include "host/report/report_forms.h"
#include "host/zrlab/default_plugin.h"
#include "input/nearest.h"

namespace host {

namespace {

// One of these words. Its own description stays out of the help: the type's name lists the words.
CLI::Validator oneOf(std::vector<std::string> words) {
    CLI::Validator validator = CLI::IsMember(std::move(words));
    return validator.description("");
}

constexpr std::string_view kRunExamples = R"(Examples:
  zrlab run VantorMeterixDiagnostic
      Read the sixty event counters once and demand zeros.
  zrlab run VantorFaultDiagnostic --set frameCount=90 --set timeout=10
      Stream 90 frames and judge counters, frame count and errors.
  zrlab run VantorFaultDiagnostic --set frameCount=90 --set analysis:frameCount=80 --set timeout=10
      Stream 90 frames, require 80.
  zrlab run KirraImageExperiment --set images=25 --set timeout=5 --report images.html
      Collect 25 images and draw them.
  zrlab run VantorMeterixDiagnostic --device counter-stuck --format jsonl
      Run on a faulty device of the gallery; report in a standard form.
  zrlab run VantorFaultDiagnostic --set frameCount=30 --set timeout=5 --speed max --until-fail
      Repeat, faster than real time, until a run does not pass.
  zrlab run VantorMeterixDiagnostic --device-module ./board.so --device board:rev-b
      Run on a device of a kind that a device module registers.

Exit status:
  0    every verdict passed, or an experiment ran
  1    a verdict failed
  2    something did not complete
  64   the command line is wrong
  130  interrupted)";

constexpr const char* kExamples = R"(Examples:
  zrlab list
  zrlab describe VantorFaultDiagnostic
  zrlab run VantorMeterixDiagnostic
  zrlab devices
  zrlab help run)";

std::string joined(const std::vector<std::string>& words, std::string_view between) {
    return fmt::format("{}", fmt::join(words, between));
}

// The forms of a report as the help shows them.
std::string formLines() {
    std::string lines = "Forms of a report:\n";
    for (const ReportForm& form : reportForms()) {
        lines +=
            fmt::format("  {:<6}  {:<6}  {}\n", form.name, form.ending,
                        form.streams ? "written as the session goes on" : "written at its end");
    }
    return lines;
}

}  // namespace

const CLI::App* subcommandOf(const CLI::App& app, const std::string& name) {
    for (const CLI::App* command : app.get_subcommands({})) {
        if (command->get_name() == name) {
            return command;
        }
    }
    return nullptr;
}

CommandLine::CommandLine()
    : plugin(defaultPlugin())
    , _app(
          "Runs hardware diagnostics of a plug-in module on a simulated or a real device, judges "
          "their limits and reports.",
          "zrlab") {
    _app.require_subcommand(1);
    _app.set_version_flag("--version", "zrlab " ZR_VERSION, "Print the version and exit");
    _app.set_help_flag("-h,--help", "Print this help and exit");
    CLI::App* list = _app.add_subcommand("list", "List experiments, analyses and diagnostics");
    list->add_flag("--names", namesOnly, "Only the names that can be run, one per line");
    _addPlugin(*list);

    CLI::App* describe =
        _app.add_subcommand("describe", "Show what a name is for and which parameters it takes");
    describe->add_option("NAME", subjects, "An experiment, an analysis or a diagnostic")
        ->required()
        ->type_name("");
    describe->add_flag("--limits", limits,
                       "Also show results and limits: runs the name once, on a simulated device\n"
                       "without faults, every required parameter 1 and the time-out 30 s");
    _addPlugin(*describe);

    _addRun();

    CLI::App* devices = _app.add_subcommand("devices", "List the devices that a run can use");
    CLI::Option* names = devices->add_flag("--names", namesOnly, "Only the names, one per line");
    devices->add_flag("--kinds", kindsOnly, "List the kinds of devices and what they can do")
        ->excludes(names);
    _addDeviceModule(*devices);

    CLI::App* help = _app.add_subcommand("help", "Show the help of a command");
    help->add_option("COMMAND", helpTopic, "The command to explain")->type_name("");

    CLI::App* completion =
        _app.add_subcommand("completion", "Print a completion script for a shell");
    completion->add_option("SHELL", shell, "The shell")
        ->required()
        ->type_name("bash|zsh")
        ->check(oneOf({"bash", "zsh"}));
    completion->footer(
        "Examples:\n  source <(zrlab completion bash)\n"
        "  zrlab completion zsh > \"${fpath[1]}/_zrlab\"");

    CLI::App* manual = _app.add_subcommand("manual", "Print the manual page");
    manual->footer("Example:\n  zrlab manual | man -l -");

    _app.footer(kExamples);  // last: a command added later would inherit it
}

void CommandLine::_addPlugin(CLI::App& command) {
    command
        .add_option("--plugin", plugin, "Load this module instead of the one beside the program")
        ->type_name("PATH");
}

void CommandLine::_addDeviceModule(CLI::App& command) {
    command
        .add_option("--device-module", session.device.modules,
                    "Load kinds of devices from this module")
        ->type_name("FILE")
        ->take_all()
        ->allow_extra_args(false);
}

void CommandLine::_addRun() {
    CLI::App& run = *_app.add_subcommand("run", "Run diagnostics or experiments and report");
    run.add_option("NAME", session.names, "What to run: diagnostics or experiments, in this order")
        ->required()
        ->type_name("");
    run.add_option(
           "--set", session.settings,
           "Give a parameter to every part that declares it;\nexperiment:PARAM=VALUE or "
           "analysis:PARAM=VALUE\ngives it to one part only. VALUE is a number, true or false;\n"
           "a count that is not whole or a negative time-out gets a warning")
        ->type_name("PARAM=VALUE")
        ->take_all()
        ->allow_extra_args(false);
    run.add_option("--device", session.device.device,
                   "The device: one that \"zrlab devices\" lists, a file of a simulated one, or\n"
                   "KIND:WHAT for another kind")
        ->type_name("DEVICE|FILE|KIND:WHAT")
        ->capture_default_str();
    _addDeviceModule(run);
    run.add_option("--speed", session.device.speed,
                   "Simulated seconds per real second: 0.001 to 100, or max;\ntime-outs stay those "
                   "of real time")
        ->type_name("FACTOR|max")
        ->default_str("1");
    const std::vector<std::string> formats = reportFormNames();
    run.add_option("--format", session.format, "Form of the report")
        ->check(oneOf(formats))
        ->type_name(joined(formats, "|"))
        ->capture_default_str();
    run.add_option("--output", session.output,
                   "Write the report to this file, whole or not at all;\n- is standard output")
        ->type_name("FILE")
        ->check(CLI::Validator(
            [](const std::string& file) {
                return file.empty() ? std::string("the name of the file is empty") : std::string();
            },
            ""));
    run.add_option(
           "--report", session.reports,
           "Write a further report; its ending gives the form:\n" + joined(reportEndings(), ", "))
        ->type_name("FILE")
        ->take_all()
        ->allow_extra_args(false);
    run.add_option("--repeat", session.repeat, "Run each name this many times and show the spread")
        ->type_name("N")
        ->check(CLI::Validator(CLI::Range(std::uint64_t{1}, std::uint64_t{1'000'000'000}))
                    .description(""));
    run.add_flag("--until-fail", session.untilFail,
                 "Repeat until a run does not pass; with --repeat at most N times")
        ->disable_flag_override();
    run.add_flag("-v,--verbose", session.verbose, "Show what the text report folds");
    run.add_option("--color", "Colour in the text report")
        ->type_name("auto|always|never")
        ->default_str("auto")
        ->each([this](const std::string& value) {
            session.colour = value == "always"  ? Colour::Always
                             : value == "never" ? Colour::Never
                                                : Colour::Automatic;
        })
        ->check(oneOf({"auto", "always", "never"}));
    run.add_option("--log", session.logLevel, "Lowest level of log lines on standard error")
        ->check(oneOf({"debug", "default", "error", "off"}))
        ->type_name("debug|default|error|off")
        ->capture_default_str();
    _addPlugin(run);
    run.footer(formLines() + "\n" + std::string(kRunExamples));
}

std::string CommandLine::_explain(const CLI::ParseError& error,
                                  int count,
                                  const char* const* arguments) {
    const CLI::App* given = nullptr;
    for (int at = 1; at < count; ++at) {
        const std::string argument = arguments[at];
        if (given == nullptr && argument.starts_with("-")) {
            if (_app.get_option_no_throw(argument) == nullptr) {
                return "unknown option " + argument +
                       input::didYouMean(argument, {"--help", "--version"});
            }
        } else if (given == nullptr) {
            given = subcommandOf(_app, argument);
            if (given == nullptr) {
                return "unknown command \"" + argument + "\"" +
                       input::didYouMean(argument, commandNames());
            }
        } else if (argument.size() > 1 && argument[0] == '-' &&
                   std::isdigit(static_cast<unsigned char>(argument[1])) == 0) {
            const std::string option = argument.substr(0, argument.find('='));
            if (given->get_option_no_throw(option) == nullptr) {
                std::vector<std::string> options;
                for (const CLI::Option* one : given->get_options()) {
                    options.push_back(one->get_name());
                }
                return given->get_name() + ": unknown option " + option +
                       input::didYouMean(option, options);
            }
        }
    }
    if (given == nullptr) {
        return "no command given; zrlab --help lists them";
    }
    std::string text = error.what();
    for (char& c : text) {
        c = c == '\n' ? ' ' : c;
    }
    return given->get_name() + ": " + text;
}

std::optional<std::string> CommandLine::read(int count, const char* const* arguments) {
    for (int at = 0; at < count; ++at) {
        session.commandLine += (at > 0 ? " " : "") + std::string(at > 0 ? arguments[at] : "zrlab");
    }
    session.version = ZR_VERSION;
    try {
        _app.parse(count, arguments);
    } catch (const CLI::Success& success) {
        std::ostringstream answer;
        _app.exit(success, answer, answer);
        return answer.str();
    } catch (const CLI::ParseError& error) {
        throw Problem(kExitUsage, _explain(error, count, arguments));
    }
    return std::nullopt;
}

std::vector<std::string> CommandLine::commandNames() const {
    std::vector<std::string> names;
    for (const CLI::App* command : _app.get_subcommands({})) {
        names.push_back(command->get_name());
    }
    return names;
}

std::string CommandLine::command() const {
    return _app.get_subcommands().front()->get_name();
}

}  // namespace host
