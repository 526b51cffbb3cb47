// Settings: options of `zrlab run` that are given once, by the environment or a file, instead of on every
// command line.
//
// The command line comes first, then the environment, the station's file, the user's and the system's; the
// first that has an option gives its value. So does a list: one place gives all of it. Only options of the
// form NAME=VALUE are settled name by name. The command-line library can read files and the environment
// too, but there a file's value comes before the environment's.
#ifndef ZR_HOST_ZRLAB_SETTINGS_H
#define ZR_HOST_ZRLAB_SETTINGS_H

#include <map>
#include <string>
#include <string_view>
#include <vector>

#include <CLI/CLI.hpp>

namespace host {

// Variables and their values.
using Environment = std::map<std::string, std::string>;

// That of the process.
Environment processEnvironment();

// A value that an option was given.
struct Setting {
    std::string option;  // its name without hyphens
    std::string value;
    std::string from;  // "FILE:LINE", the name of a variable, "command line"
};

// Reads lines of the form "option = value", where "#" begins a comment line. Throws a Problem (kExitUsage)
// with the file's name and the line's number: an unknown option, one that is given twice and takes one
// value, a line of another form; or with the file's name when it cannot be read.
std::vector<Setting> readSettingsFile(const std::string& path, const CLI::App& run);

class Settings {
  public:
    // Reads the environment and the files. `run` is the command whose options can be set. Throws a Problem
    // (kExitUsage) about a file.
    Settings(const CLI::App& run, const Environment& environment);

    // Gives the options of a command that has read its arguments what they have in the settings. Options
    // that `run` does not have stay as they are. Throws a Problem (kExitUsage) about a value that an option
    // refuses, with where it came from.
    void fill(CLI::App& command);

    // The same of one option.
    void fill(CLI::Option& option);

    // The files, and each option of the command that was filled with its value and where that came from;
    // passwords masked.
    std::string text(const CLI::App& command) const;

  private:
    struct File {
        std::string_view name;  // station, user, system
        std::string path;       // empty: none
        bool isRead = false;
    };

    bool _isSetting(const CLI::Option& option) const;
    std::vector<Setting> _settingsOf(const CLI::Option& option) const;

    const CLI::App& _run;
    std::vector<File> _files;
    std::vector<std::vector<Setting>> _places;            // the environment, then the files
    std::vector<std::string> _unknown;                    // variables that look like settings
    std::map<std::string, std::vector<Setting>> _filled;  // by option
};

// The variable that gives an option: ZRLAB_UNTIL_FAIL for "until-fail".
std::string variableOf(std::string_view option);

// Whether the option's value can come from the settings: it has a name, and is not the help.
bool isSettable(const CLI::Option& option);

}  // namespace host

#endif
