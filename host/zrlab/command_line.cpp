#include "host/zrlab/command_line.h"

#include <algorithm>
#include <cctype>
#include <charconv>
#include <cstdint>
#include <sstream>
#include <string_view>
#include <system_error>
#include <utility>

#include <fmt/format.h>

#include "host/campaign/campaign_forms.h"
#include "host/record/mask_passwords.h"
#include "host/record/problem.h"
#include "host/report/report_forms.h"
#include "host/results/questions.h"
#include "host/zrlab/default_plugin.h"
#include "host/zrlab/file_template.h"
#include "host/zrlab/identity_options.h"
#include "input/nearest.h"

namespace host {

namespace {

std::string joined(const std::vector<std::string>& words, std::string_view between) {
    return fmt::format("{}", fmt::join(words, between));
}

// One of these words.
CLI::Validator oneOf(std::vector<std::string> words) {
    return {[words = std::move(words)](const std::string& given) {
                const bool isOne = std::find(words.begin(), words.end(), given) != words.end();
                return isOne ? ""
                             : fmt::format("\"{}\" is not one of {}", given, joined(words, ", "));
            },
            ""};
}

// Such as a variable of a script that was not set.
CLI::Validator notEmpty() {
    return {[](const std::string& given) {
                return given.empty() ? std::string("the value is empty") : std::string();
            },
            ""};
}

CLI::Validator wholeNumber(std::uint64_t least, std::uint64_t most) {
    return {[least, most](const std::string& given) {
                std::uint64_t value = 0;
                const char* end = given.data() + given.size();
                const auto [stop, problem] = std::from_chars(given.data(), end, value);
                const bool fits =
                    problem == std::errc() && stop == end && value >= least && value <= most;
                return fits ? ""
                            : fmt::format("\"{}\" is not a whole number from {} to {}", given,
                                          least, most);
            },
            ""};
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
  zrlab run VantorFaultDiagnostic --set frameCount=90 --set timeout=10 --limits desk.json --frames frames.csv
      Also judge by limits of your own; write every frame to a table.
  zrlab run VantorMeterixDiagnostic --unit SN-7 --report '{unit}-{started}.html'
      Say which unit it is, and name the report after it.
  zrlab run VantorMeterixDiagnostic --unit SN-7 --store runs.db
      Also keep the run in a database.
  zrlab run VantorFaultDiagnostic --set frameCount=90 --set timeout=10 --record failure.zrr
      Also record what the device gives.
  zrlab run VantorFaultDiagnostic --device replay:failure.zrr
      Run it again on the recording, with the same parameters.
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

// What may stand in a file's name, and where else options can come from.
std::string settingsLines() {
    std::vector<std::string> placeholders;
    for (const std::string& name : placeholderNames()) {
        placeholders.push_back("{" + name + "}");
    }
    return "In the name of a report's file:\n  " + joined(placeholders, " ") +
           "\n  {{ and }} stand for braces\n\n"
           "Options can also come from variables such as ZRLAB_UNIT and ZRLAB_UNTIL_FAIL, and\n"
           "from the settings files that \"zrlab settings\" lists.\n";
}

// The form of a command's answer, and the file that gets it.
void addAnswerForm(CLI::App& command,
                   const std::vector<std::string>& forms,
                   std::string& format,
                   std::string& output) {
    command
        .add_option("--format", format,
                    "Form of the answer; without it the form of the --output, or text")
        ->type_name(joined(forms, "|"))
        ->check(oneOf(forms));
    command
        .add_option("--output", output,
                    "Write the answer to this file, whole or not at all;\n- is standard output")
        ->type_name("FILE")
        ->check(notEmpty());
}

// Which of `names` was meant by a word, or where the commands or options behind `path` are listed.
std::string meantBy(const std::string& word,
                    const std::vector<std::string>& names,
                    const std::string& path) {
    const std::string meant = input::didYouMean(word, names);
    return !meant.empty()
               ? meant
               : fmt::format("; zrlab {}{}--help lists them", path, path.empty() ? "" : " ");
}

std::vector<std::string> optionNames(const CLI::App& command) {
    std::vector<std::string> names;
    for (const CLI::Option* option : command.get_options()) {
        names.push_back(option->get_name());
    }
    return names;
}

// What is wrong with an option that the command has.
std::string wrongUse(const CLI::App& command, const CLI::ParseError& error) {
    std::string text = error.what();
    if (error.get_exit_code() != static_cast<int>(CLI::ExitCodes::ArgumentMismatch)) {
        return text;
    }
    const std::string name = text.substr(0, text.find_first_of(": "));
    const CLI::Option* option = command.get_option_no_throw(name);
    return option == nullptr
               ? "--" + name + " does not take a value"  // CLI11 leaves the hyphens out
           : text.find("received") != std::string::npos
               ? name + " is given more than once"
               : name + " needs a value: " + option->get_type_name();
}

}  // namespace

std::vector<std::string> commandNames(const CLI::App& app) {
    std::vector<std::string> names;
    for (const CLI::App* command : app.get_subcommands({})) {
        names.push_back(command->get_name());
    }
    return names;
}

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
    list->add_flag("--names", namesOnly, "Only the names that can be run, one per line")
        ->disable_flag_override();
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
    _addCampaign();
    _addConformance();
    _addResults();

    CLI::App* devices = _app.add_subcommand("devices", "List the devices that a run can use");
    CLI::Option* names = devices->add_flag("--names", namesOnly, "Only the names, one per line");
    devices->add_flag("--kinds", kindsOnly, "List the kinds of devices and what they can do")
        ->excludes(names);
    _addDeviceModule(*devices);

    CLI::App* device = _app.add_subcommand(
        "device", "Show what a device is made of, or check the description of one");
    device->add_option("ACTION", action, "Show a device, or check descriptions")
        ->required()
        ->type_name("show|check")
        ->check(oneOf({"show", "check"}));
    device->add_option("WHAT", subjects, "A device that \"zrlab devices\" lists, a file, KIND:WHAT")
        ->required();
    _addDeviceModule(*device);
    device->footer(
        "Examples:\n  zrlab device show counter-stuck > mine.json\n"
        "  zrlab device check ./mine.json");

    CLI::App* recording = _app.add_subcommand(
        "recording", "Show what a recording holds, or make a device profile of it");
    recording->add_option("ACTION", action, "Show the recording, or print a device profile")
        ->required()
        ->type_name("show|profile")
        ->check(oneOf({"show", "profile"}));
    recording->add_option("FILE", recordingFile, "What --record wrote")
        ->required()
        ->type_name("")
        ->check(notEmpty());
    recording->footer(
        "Examples:\n  zrlab recording show failure.zrr\n"
        "  zrlab recording profile failure.zrr > failure.json");

    _addStoreCommand();

    CLI::App* settings = _app.add_subcommand(
        "settings", "Show the options of run that the environment and files give, and where");
    settings->footer(
        "A line of a file is OPTION = VALUE, or a comment that begins with #. The command line\n"
        "comes first, then the environment, the station's file, the user's and the system's.\n\n"
        "Examples:\n  ZRLAB_STATION=bench-3 zrlab settings\n"
        "  ZRLAB_STATION_FILE=./station.conf zrlab settings");

    CLI::App* help = _app.add_subcommand("help", "Show the help of a command");
    help->add_option("COMMAND", helpTopic, "The command to explain")->type_name("");

    CLI::App* completion =
        _app.add_subcommand("completion", "Print a completion script for a shell");
    completion->add_option("SHELL", shell, "The shell")
        ->required()
        ->type_name("bash|zsh")
        ->check(oneOf({"bash", "zsh"}));
    completion->footer(
        "Examples:\n  source <(zrlab completion bash)\n  source <(zrlab completion zsh)\n"
        "  zrlab completion zsh > \"${fpath[1]}/_zrlab\"");

    CLI::App* manual = _app.add_subcommand("manual", "Print the manual page");
    manual->footer("Example:\n  zrlab manual | man -l -");

    _app.footer(kExamples);  // last: a command added later would inherit it
}

void CommandLine::_addPlugin(CLI::App& command) {
    command
        .add_option("--plugin", plugin, "Load this module instead of the one beside the program")
        ->type_name("PATH")
        ->check(notEmpty());
}

void CommandLine::_addDeviceModule(CLI::App& command) {
    command
        .add_option("--device-module", session.device.modules,
                    "Load kinds of devices from this module")
        ->type_name("FILE")
        ->check(notEmpty())
        ->take_all()
        ->allow_extra_args(false);
}

void CommandLine::_addLimits(CLI::App& command) {
    command
        .add_option(
            "--limits", session.limits,
            "Also judge by the limits of this file;\nbounds on what the module records and does "
            "not judge,\npart of the verdict where the file says so")
        ->type_name("FILE")
        ->check(notEmpty());
}

void CommandLine::_addTables(CLI::App& run) {
    run.add_option("--frames", session.frames,
                   "Write every frame and event to this file as they come: .csv or .jsonl")
        ->type_name("FILE")
        ->check(notEmpty());
    run.add_option("--images", session.images,
                   "Write the samples of every image to this file: .csv")
        ->type_name("FILE")
        ->check(notEmpty());
}

void CommandLine::_addStore(CLI::App& command) {
    command
        .add_option("--store", session.store,
                    "The store of runs: the file of a database,\nmade when there is none, or "
                    "postgresql://...")
        ->type_name("WHERE")
        ->check(notEmpty());
}

void CommandLine::_addStoreCommand() {
    CLI::App* store = _app.add_subcommand(
        "store", "Show the store of runs, or deliver the runs that wait for it");
    store
        ->add_option("ACTION", action,
                     "Show the store and how many runs wait for it, or deliver them")
        ->required()
        ->type_name("show|sync")
        ->check(oneOf({"show", "sync"}));
    _addStore(*store);
    store->footer("Examples:\n  zrlab store show --store runs.db\n  zrlab store sync");
}

void CommandLine::_addSettings(CLI::App& command) {
    command
        .add_option(
            "--set", session.settings,
            "Give a parameter to every part that declares it;\nexperiment:PARAM=VALUE or "
            "analysis:PARAM=VALUE\ngives it to one part only. VALUE is a number, true or false;\n"
            "a count that is not whole or a negative time-out gets a warning")
        ->type_name("PARAM=VALUE")
        ->check(notEmpty())
        ->take_all()
        ->allow_extra_args(false);
}

// `speed` is the usual one.
void CommandLine::_addDevice(CLI::App& command, std::string_view speed) {
    command
        .add_option("--device", session.device.device,
                    "The device: one that \"zrlab devices\" lists, a file of a simulated one, or\n"
                    "KIND:WHAT for another kind")
        ->type_name("DEVICE|FILE|KIND:WHAT")
        ->check(notEmpty())
        ->capture_default_str();
    _addDeviceModule(command);
    command
        .add_option(
            "--speed", session.device.speed,
            "Simulated seconds per real second: 0.001 to 100, or max;\ntime-outs stay those "
            "of real time")
        ->type_name("FACTOR|max")
        ->check(notEmpty())
        ->default_str(std::string(speed));
}

void CommandLine::_addReports(CLI::App& command) {
    const std::vector<std::string> formats = reportFormNames();
    command.add_option("--format", session.format, "Form of the report")
        ->check(oneOf(formats))
        ->type_name(joined(formats, "|"))
        ->capture_default_str();
    command
        .add_option("--output", session.output,
                    "Write the report to this file, whole or not at all;\n- is standard output")
        ->type_name("FILE")
        ->check(notEmpty());
    command
        .add_option(
            "--report", session.reports,
            "Write a further report; its ending gives the form:\n" + joined(reportEndings(), ", "))
        ->type_name("FILE")
        ->check(notEmpty())
        ->take_all()
        ->allow_extra_args(false);
}

void CommandLine::_addTextStyle(CLI::App& command) {
    command.add_flag("-v,--verbose", session.verbose, "Show what the text report folds")
        ->disable_flag_override();
    command.add_option("--color", "Colour in the text report")
        ->type_name("auto|always|never")
        ->default_str("auto")
        ->each([this](const std::string& value) {
            session.colour = value == "always"  ? Colour::Always
                             : value == "never" ? Colour::Never
                                                : Colour::Automatic;
        })
        ->check(oneOf({"auto", "always", "never"}));
}

void CommandLine::_addRun() {
    CLI::App& run = *_app.add_subcommand("run", "Run diagnostics or experiments and report");
    _run = &run;
    run.add_option("NAME", session.names, "What to run: diagnostics or experiments, in this order")
        ->required()
        ->type_name("");
    _addSettings(run);
    _addDevice(run, "1");
    addIdentityOptions(run, session.identity, _metadata);
    _addReports(run);
    _addLimits(run);
    _addTables(run);
    run.add_option("--record", session.record,
                   "Record the device to this file; --device replay:FILE\nplays it back")
        ->type_name("FILE")
        ->check(notEmpty());
    _addStore(run);
    run.add_flag("--store-frames", session.storeFrames, "Store the frames of each run too")
        ->disable_flag_override();
    run.add_flag("--store-images", session.storeImages, "Store the images of each run too")
        ->disable_flag_override();
    run.add_option("--repeat", session.repeat, "Run each name this many times and show the spread")
        ->type_name("N")
        ->check(wholeNumber(1, 1'000'000'000));
    run.add_flag("--until-fail", session.untilFail,
                 "Repeat until a run does not pass; with --repeat at most N times")
        ->disable_flag_override();
    _addTextStyle(run);
    run.add_option("--log", session.logLevel, "Lowest level of log lines on standard error")
        ->check(oneOf({"debug", "default", "error", "off"}))
        ->type_name("debug|default|error|off")
        ->capture_default_str();
    _addPlugin(run);
    run.footer(formLines() + "\n" + settingsLines() + "\n" + std::string(kRunExamples));
}

void CommandLine::_addConformance() {
    CLI::App& command = *_app.add_subcommand(
        "conformance", "Check that a device keeps the promises of its interfaces");
    command
        .add_option("SERVICE", session.names,
                    "What to check: meterix, display, hid or capture; without it each service\n"
                    "that the device has")
        ->type_name("");
    _addDevice(command, "1");
    addIdentityOptions(command, session.identity, _metadata);
    _addReports(command);
    _addTextStyle(command);
    command.footer(
        formLines() +
        "\nExamples:\n  zrlab conformance --device-module ./board.so --device board:rev-b\n"
        "  zrlab conformance hid --device replay:failure.zrr --report conformance.html");
}

void CommandLine::_addCampaign() {
    CLI::App& command = *_app.add_subcommand(
        "campaign", "Give a device one fault at a time and show which ones are caught");
    command
        .add_option("NAME", session.names,
                    "What to run on each fault; without it every diagnostic, and every\n"
                    "experiment that is no part of one")
        ->type_name("");
    _addSettings(command);
    _addDevice(command, "max");
    _addLimits(command);
    command
        .add_option("--jobs", campaign.jobs, "Runs at a time; without it two for each processor")
        ->type_name("N")
        ->check(wholeNumber(1, 1000));
    std::vector<std::string> forms;
    for (const CampaignForm& form : campaignForms()) {
        forms.emplace_back(form.name);
    }
    addAnswerForm(command, forms, campaign.format, campaign.output);
    _addPlugin(command);
    command.footer(
        "Counts and time-outs have small values unless they are set.\n\n"
        "Examples:\n  zrlab campaign --output faults.html\n"
        "  zrlab campaign VantorFaultDiagnostic --limits limits/coverage.json");
}

// A command for each question, and one that shows a run.
void CommandLine::_addResults() {
    CLI::App& all =
        *_app.add_subcommand("results", "Ask a store of runs: yields, failures, spreads, trends");
    all.require_subcommand(1);
    const auto add = [&](const std::string& name, const std::string& summary,
                         const std::vector<std::string>& forms) {
        CLI::App& command = *all.add_subcommand(name, summary);
        command.callback([this, name] { results.question = name; });
        command
            .add_option("--store", results.store,
                        "The store to ask: the file of a database,\nor postgresql://...")
            ->type_name("WHERE")
            ->check(notEmpty());
        addAnswerForm(command, forms, results.format, results.output);
        return &command;
    };
    const auto addText = [](CLI::App& command, const char* option, std::string& text,
                            const char* summary, const char* type) {
        command.add_option(option, text, summary)->type_name(type)->check(notEmpty());
    };
    for (const Question& question : questions()) {
        CLI::App& command = *add(std::string(question.name), std::string(question.summary),
                                 answerFormNames(question));
        Asked& asked = results.asked;
        if (!question.subject.empty()) {
            command
                .add_option(std::string(question.subject), asked.subject,
                            std::string(question.subjectSummary))
                ->required()
                ->type_name("")
                ->check(notEmpty());
        }
        addText(command, "--since", results.since,
                "Only runs that started at this time (UTC) or later:\n2026-11-25, \"2026-11-25 "
                "14:30\", or a time ago: 90m, 12h, 7d, 2w",
                "TIME");
        addText(command, "--until", results.until,
                "Only runs that started before this time; of a date,\nbefore its end", "TIME");
        addText(command, "--station", asked.filter.station, "Only runs of this station", "STATION");
        addText(command, "--part", asked.filter.part, "Only runs of units of this part number",
                "PART");
        addText(command, "--lot", asked.filter.lot, "Only runs of units of this lot", "LOT");
        addText(command, "--diagnostic", asked.filter.diagnostic,
                "Only runs of this diagnostic or experiment", "DIAGNOSTIC");
        addText(command, "--program-version", asked.filter.version,
                "Only runs of this version of zrlab", "VERSION");
        if (question.takesBy) {
            const std::vector<std::string> groups(yieldGroups().begin(), yieldGroups().end());
            command.add_option("--by", asked.by, "A row for each of these, beside the diagnostic")
                ->type_name(joined(groups, "|"))
                ->check(oneOf(groups))
                ->capture_default_str();
        }
        if (question.takesMeasurements) {
            command
                .add_flag("--measurements", asked.measurements,
                          "Compare the means of measurements instead of the yields")
                ->disable_flag_override();
        }
        if (question.limit >= 0) {
            command.add_option("--limit", results.limit, "Rows at most")
                ->type_name("N")
                ->check(wholeNumber(1, 1'000'000'000))
                ->default_str(question.limit > 0 ? fmt::to_string(question.limit) : "");
        }
    }
    CLI::App& show = *add("show", "Show a stored run in any form of report", reportFormNames());
    addText(show, "UUID", results.asked.subject,
            "The run's UUID, or a beginning that no other run has", "");
    show.get_option("UUID")->required();
    all.footer(
        "Examples:\n  zrlab results yield --store runs.db --since 7d --by station\n"
        "  zrlab results pareto --store runs.db --output pareto.html\n"
        "  zrlab results show 019abcde --store runs.db --format junit");
}

std::string CommandLine::_explain(const CLI::ParseError& error,
                                  int count,
                                  const char* const* arguments) {
    const CLI::App* given = &_app;
    std::string path;  // the commands so far
    const auto in = [&path](const std::string& problem) {
        return path.empty() ? problem : path + ": " + problem;
    };
    for (int at = 1; at < count && arguments[at] != std::string_view("--"); ++at) {
        const std::string argument = arguments[at];
        if (argument.size() > 1 && argument[0] == '-' &&
            std::isdigit(static_cast<unsigned char>(argument[1])) == 0) {
            const std::string option = argument.substr(0, argument.find('='));
            if (given->get_option_no_throw(option) == nullptr) {
                return in("unknown option " + option + meantBy(option, optionNames(*given), path));
            }
        } else if (const CLI::App* inner = subcommandOf(*given, argument)) {
            given = inner;
            path += (path.empty() ? "" : " ") + argument;
        } else if (!given->get_subcommands({}).empty()) {
            return in("unknown command \"" + argument + "\"" +
                      meantBy(argument, commandNames(*given), path));
        }
    }
    if (!given->get_subcommands({}).empty()) {
        return in(fmt::format("no command given; zrlab {}{}--help lists them", path,
                              path.empty() ? "" : " "));
    }
    if (error.get_exit_code() == static_cast<int>(CLI::ExitCodes::ExtrasError)) {
        return in(
            fmt::format("unexpected argument \"{}\"", fmt::join(_app.remaining(true), "\" \"")));
    }
    return in(wrongUse(*given, error));
}

std::optional<std::string> CommandLine::read(int count, const char* const* arguments) {
    for (int at = 0; at < count; ++at) {
        // One by one: where a password ends cannot be found in the line.
        session.commandLine += at > 0 ? " " + maskPasswords(arguments[at]) : "zrlab";
    }
    session.version = ZR_VERSION;
    results.asked.commandLine = session.commandLine;
    try {
        _app.parse(count, arguments);
    } catch (const CLI::Success& success) {
        std::ostringstream answer;
        _app.exit(success, answer, answer);
        return answer.str();
    } catch (const CLI::ParseError& error) {
        throw Problem(kExitUsage, maskPasswords(_explain(error, count, arguments)));
    }
    _takeSettings();
    return std::nullopt;
}

// Every command that has options of `run`: those that load a module take the modules from the settings too.
void CommandLine::_takeSettings() {
    CLI::App& given = *_app.get_subcommands().front();
    if (given.get_name() == "results") {
        // Other options of run have the names of filters here.
        Settings(*_run, processEnvironment())
            .fill(*given.get_subcommands().front()->get_option("--store"));
        return;
    }
    if (given.get_name() == "campaign") {
        // What is run, and on what; the form of its answer is none of run's.
        Settings settings(*_run, processEnvironment());
        for (const char* option :
             {"--set", "--device", "--device-module", "--speed", "--limits", "--plugin"}) {
            settings.fill(*given.get_option(option));
        }
        return;
    }
    CLI::App& command = given.get_name() == "settings" ? *_run : given;
    const auto options = std::as_const(command).get_options();
    if (std::any_of(options.begin(), options.end(), [this](const CLI::Option* option) {
            return isSettable(*option) && _run->get_option_no_throw(option->get_name()) != nullptr;
        })) {
        _settings = std::make_unique<Settings>(*_run, processEnvironment());
        _settings->fill(command);
        completeIdentity(session.identity, _metadata);
    }
}

std::string CommandLine::settingsText() const {
    return _settings->text(*_run);
}

std::string CommandLine::command() const {
    return _app.get_subcommands().front()->get_name();
}

}  // namespace host
