#include "host/zrlab/settings.h"

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cstddef>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <optional>
#include <sstream>

#include <unistd.h>

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/record/mask_passwords.h"
#include "host/record/problem.h"
#include "input/nearest.h"

namespace host {

namespace {

constexpr std::string_view kPrefix = "ZRLAB_";
constexpr std::string_view kByteOrderMark = "\xEF\xBB\xBF";  // some editors begin files with it
constexpr const char* kCommandLine = "command line";

std::string nameOf(const CLI::Option& option) {
    return option.get_lnames().empty() ? std::string() : option.get_lnames().front();
}

bool isFlag(const CLI::Option& option) {
    return option.get_items_expected_max() == 0;
}

bool isList(const CLI::Option& option) {
    return option.get_multi_option_policy() == CLI::MultiOptionPolicy::TakeAll;
}

// A list of names with values, settled name by name.
bool isByName(const CLI::Option& option) {
    return isList(option) && option.get_type_name().ends_with("=VALUE");
}

std::vector<std::string> optionNamesOf(const CLI::App& run) {
    std::vector<std::string> names;
    for (const CLI::Option* option : run.get_options()) {
        if (isSettable(*option)) {
            names.push_back(nameOf(*option));
        }
    }
    return names;
}

std::string_view trimmed(std::string_view text) {
    const std::size_t first = text.find_first_not_of(" \t\r");
    return first == std::string_view::npos
               ? std::string_view()
               : text.substr(first, text.find_last_not_of(" \t\r") - first + 1);
}

// The name in NAME=VALUE.
std::string_view keyOf(std::string_view value) {
    return value.substr(0, value.find('='));
}

// Whether a higher place's NAME=VALUE replaces the lower one: of the same name, or the lower is that of one
// part and the higher that of every part.
bool replaces(const Setting& higher, const Setting& lower) {
    const std::string_view key = keyOf(higher.value);
    std::string_view other = keyOf(lower.value);
    if (other == key) {
        return true;
    }
    const std::size_t colon = other.find(':');
    return lower.option == "set" && colon != std::string_view::npos &&
           other.substr(colon + 1) == key;
}

// A flag's value as the library reads it.
std::optional<std::string> flagText(std::string text) {
    std::transform(text.begin(), text.end(), text.begin(),
                   [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    for (const char* word : {"true", "yes", "on", "1"}) {
        if (text == word) {
            return "true";
        }
    }
    for (const char* word : {"false", "no", "off", "0"}) {
        if (text == word) {
            return "false";
        }
    }
    return std::nullopt;
}

[[noreturn]] void refuse(const Setting& setting, const std::string& problem) {
    throw Problem(kExitUsage, plainLine(maskPasswords(setting.from + ": " + problem)));
}

void give(CLI::Option& option, const std::vector<Setting>& settings) {
    option.clear();
    for (const Setting& setting : settings) {
        option.add_result(setting.value);
    }
    option.run_callback();
}

// One by one first, so that a refusal names where its value came from.
void giveChecked(CLI::Option& option, std::vector<Setting> settings) {
    for (Setting& setting : settings) {
        if (isFlag(option)) {
            const auto value = flagText(setting.value);
            if (!value.has_value()) {
                refuse(setting, fmt::format("{}: \"{}\" is neither true nor false", setting.option,
                                            setting.value));
            }
            setting.value = *value;
        }
        try {
            give(option, {setting});
        } catch (const CLI::ParseError& error) {
            refuse(setting, error.what());
        }
    }
    give(option, settings);
}

std::vector<Setting> fromEnvironment(const CLI::App& run, const Environment& environment) {
    std::vector<Setting> settings;
    for (const CLI::Option* option : run.get_options()) {
        const std::string variable = isSettable(*option) ? variableOf(nameOf(*option)) : "";
        const auto found = environment.find(variable);
        if (found == environment.end() || found->second.empty()) {
            continue;
        }
        std::istringstream lines(found->second);
        for (std::string line; std::getline(lines, line, isList(*option) ? '\n' : '\0');) {
            if (!line.empty()) {
                settings.push_back({nameOf(*option), line, variable});
            }
        }
    }
    return settings;
}

struct Place {
    std::string_view name;
    const char* variable;  // names the file; empty for none
    std::string (*path)(const Environment& environment);
};

std::string valueIn(const Environment& environment, const char* variable) {
    const auto found = environment.find(variable);
    return found != environment.end() ? found->second : "";
}

std::string userPath(const Environment& environment) {
    // A relative path is not valid in this variable, by the XDG rules for base directories.
    const std::string config = valueIn(environment, "XDG_CONFIG_HOME");
    const std::string home = valueIn(environment, "HOME");
    return config.starts_with("/") ? config + "/zrlab/zrlab.conf"
           : home.empty()          ? std::string()
                                   : home + "/.config/zrlab/zrlab.conf";
}

constexpr Place kPlaces[] = {
    {"station", "ZRLAB_STATION_FILE",
     [](const Environment&) { return std::string("/etc/zrlab/station.conf"); }},
    {"user", "ZRLAB_USER_FILE", userPath},
    {"system", "ZRLAB_SYSTEM_FILE",
     [](const Environment&) { return std::string("/etc/zrlab/zrlab.conf"); }},
};

}  // namespace

Environment processEnvironment() {
    Environment environment;
    for (char** at = environ; at != nullptr && *at != nullptr; ++at) {
        const std::string_view entry = *at;
        const std::size_t equals = entry.find('=');
        if (equals != std::string_view::npos) {
            environment.emplace(entry.substr(0, equals), entry.substr(equals + 1));
        }
    }
    return environment;
}

bool isSettable(const CLI::Option& option) {
    return !option.get_positional() && !nameOf(option).empty() && nameOf(option) != "help";
}

std::string variableOf(std::string_view option) {
    std::string variable(kPrefix);
    for (const char c : option) {
        variable += c == '-' ? '_' : static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
    }
    return variable;
}

std::vector<Setting> readSettingsFile(const std::string& path, const CLI::App& run) {
    std::ifstream file(path);
    std::vector<Setting> settings;
    std::string line;
    for (std::size_t number = 1; std::getline(file, line); ++number) {
        std::string_view text = line;
        if (number == 1 && text.starts_with(kByteOrderMark)) {
            text.remove_prefix(kByteOrderMark.size());
        }
        text = trimmed(text);
        if (text.empty() || text.front() == '#') {
            continue;
        }
        const std::size_t equals = std::min(text.find('='), text.size());
        const Setting setting{std::string(trimmed(text.substr(0, equals))),
                              std::string(trimmed(text.substr(std::min(equals + 1, text.size())))),
                              fmt::format("{}:{}", path, number)};
        const CLI::Option* option =
            setting.option.empty() ? nullptr : run.get_option_no_throw("--" + setting.option);
        if (equals == text.size() || setting.option.empty()) {
            refuse(setting, "not of the form OPTION = VALUE");
        }
        if (option == nullptr || !isSettable(*option)) {
            const std::string meant = input::didYouMean(setting.option, optionNamesOf(run));
            refuse(setting, fmt::format("unknown option \"{}\"{}", setting.option,
                                        meant.empty() ? "; zrlab settings lists them" : meant));
        }
        if (setting.value.empty()) {
            refuse(setting, setting.option + " has no value");
        }
        const auto earlier =
            std::find_if(settings.begin(), settings.end(),
                         [&](const Setting& one) { return one.option == setting.option; });
        if (earlier != settings.end() && !isList(*option)) {
            refuse(setting,
                   fmt::format("{} is given already, at {}", setting.option, earlier->from));
        }
        settings.push_back(setting);
    }
    if (!file.eof()) {
        throw Problem(kExitUsage, fmt::format("cannot read {}: {}", path, std::strerror(errno)));
    }
    return settings;
}

Settings::Settings(const CLI::App& run, const Environment& environment) : _run(run) {
    _places.push_back(fromEnvironment(run, environment));
    std::vector<std::string> known;
    for (const std::string& name : optionNamesOf(run)) {
        known.push_back(variableOf(name));
    }
    for (const Place& place : kPlaces) {
        known.emplace_back(place.variable);
        const auto named = environment.find(place.variable);
        File file{place.name, named != environment.end() ? named->second : place.path(environment)};
        // A file that was named must be there.
        std::error_code none;
        file.isRead = !file.path.empty() &&
                      (named != environment.end() || std::filesystem::exists(file.path, none));
        _places.push_back(file.isRead ? readSettingsFile(file.path, run) : std::vector<Setting>());
        _files.push_back(std::move(file));
    }
    for (const auto& [variable, value] : environment) {
        if (variable.starts_with(kPrefix) &&
            std::find(known.begin(), known.end(), variable) == known.end()) {
            _unknown.push_back(variable + input::didYouMean(variable, known));
        }
    }
}

bool Settings::_isSetting(const CLI::Option& option) const {
    return isSettable(option) && _run.get_option_no_throw("--" + nameOf(option)) != nullptr;
}

// What the option is given in all: by one place, or name by name.
std::vector<Setting> Settings::_settingsOf(const CLI::Option& option) const {
    std::vector<Setting> given;
    for (const std::string& value : option.results()) {
        given.push_back({nameOf(option), value, kCommandLine});
    }
    for (const std::vector<Setting>& place : _places) {
        if (!given.empty() && !isByName(option)) {
            break;
        }
        std::vector<Setting> lower;
        for (const Setting& setting : place) {
            if (setting.option == nameOf(option) &&
                std::none_of(given.begin(), given.end(), [&setting](const Setting& higher) {
                    return replaces(higher, setting);
                })) {
                lower.push_back(setting);
            }
        }
        given.insert(given.begin(), lower.begin(), lower.end());
    }
    return given;
}

void Settings::fill(CLI::App& command) {
    for (CLI::Option* option : command.get_options([](const CLI::Option*) { return true; })) {
        fill(*option);
    }
}

void Settings::fill(CLI::Option& option) {
    if (!_isSetting(option)) {
        return;
    }
    std::vector<Setting> settings = _settingsOf(option);
    if (settings.empty()) {
        return;
    }
    if (settings.front().from != kCommandLine) {
        giveChecked(option, settings);
    }
    _filled[nameOf(option)] = std::move(settings);
}

std::string Settings::text(const CLI::App& command) const {
    std::string out;
    for (const File& file : _files) {
        out += fmt::format("{:<8}  {}{}\n", file.name, file.path.empty() ? "no file" : file.path,
                           file.isRead || file.path.empty() ? "" : "  (not there)");
    }
    for (const std::string& variable : _unknown) {
        out += fmt::format("unknown variable {}\n", variable);
    }
    out += "\n";
    for (const CLI::Option* option : command.get_options()) {
        if (!_isSetting(*option)) {
            continue;
        }
        const auto filled = _filled.find(nameOf(*option));
        const std::vector<Setting> settings =
            filled != _filled.end()
                ? filled->second
                : std::vector<Setting>{{nameOf(*option), option->get_default_str(), "default"}};
        for (const Setting& setting : settings) {
            out +=
                fmt::format("{:<14}  {:<28}  {}\n", setting.option,
                            setting.value.empty() ? "-" : plainLine(maskPasswords(setting.value)),
                            setting.from);
        }
    }
    return out;
}

}  // namespace host
