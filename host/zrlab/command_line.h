// The program's command line: its commands, their options, and the texts that explain them. Help,
// the manual page and completions are all made from this one description.
#ifndef ZR_HOST_ZRLAB_COMMAND_LINE_H
#define ZR_HOST_ZRLAB_COMMAND_LINE_H

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include <CLI/CLI.hpp>

#include "host/zrlab/campaign_command.h"
#include "host/zrlab/results_command.h"
#include "host/zrlab/session_options.h"
#include "host/zrlab/settings.h"

namespace host {

class CommandLine {
  public:
    CommandLine();
    CommandLine(const CommandLine&) = delete;
    CommandLine& operator=(const CommandLine&) = delete;

    // Reads the arguments, then the settings that the command takes. Returns nothing when a command is to be carried out, else the text that was
    // asked for: help, the version. Throws a Problem (kExitUsage) when the line or a
    // setting is wrong.
    std::optional<std::string> read(int count, const char* const* arguments);

    // The command that was given.
    std::string command() const;

    const CLI::App& app() const { return _app; }

    // What "settings" prints.
    std::string settingsText() const;

    std::string plugin;                 // the module to load
    std::vector<std::string> subjects;  // of describe and device
    std::string action;                 // of device, recording and store
    bool limits = false;                // of describe
    bool namesOnly = false;             // of list and devices
    bool kindsOnly = false;             // of devices
    std::string recordingFile;          // of recording
    std::string helpTopic;              // of help
    std::string shell;                  // of completion
    SessionOptions session;             // of run, campaign and conformance
    CampaignOptions campaign;           // of campaign
    ResultsOptions results;             // of results

  private:
    void _addRun();
    void _addCampaign();
    void _addConformance();
    void _addReports(CLI::App& command);
    void _addTextStyle(CLI::App& command);
    void _addDevice(CLI::App& command, std::string_view speed);
    void _addSettings(CLI::App& command);
    void _addLimits(CLI::App& command);
    void _addTables(CLI::App& run);
    void _addStore(CLI::App& command);
    void _addStoreCommand();
    void _addResults();
    void _addPlugin(CLI::App& command);
    void _addDeviceModule(CLI::App& command);
    void _takeSettings();
    std::string _explain(const CLI::ParseError& error, int count, const char* const* arguments);

    CLI::App _app;
    CLI::App* _run = nullptr;             // of _app
    std::vector<std::string> _metadata;   // as the options gave it
    std::unique_ptr<Settings> _settings;  // of a command that takes some
};

// The commands directly below `app`.
std::vector<std::string> commandNames(const CLI::App& app);

// The command of that name directly below `app`, or null.
const CLI::App* subcommandOf(const CLI::App& app, const std::string& name);

// A page for man(1) in its own markup.
std::string manualPage(const CLI::App& app, const std::string& version);

}  // namespace host

#endif
