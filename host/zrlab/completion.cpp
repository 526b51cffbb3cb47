#include "host/zrlab/completion.h"

#include <algorithm>
#include <cctype>
#include <exception>
#include <set>

#include <fmt/format.h>

#include "frame/host_interface.h"
#include "host/record/clean_text.h"
#include "host/record/run_text.h"
#include "host/run/module_loader.h"
#include "host/run/planner.h"
#include "host/zrlab/device_choice.h"

namespace host {

namespace {

// The words before the one at the cursor.
struct Line {
    const CLI::App* command;               // the innermost so far
    const CLI::Option* waiting = nullptr;  // an option whose value comes next
    std::vector<std::string> positionals;  // of the command
    std::string plugin;                    // the last --plugin
    std::vector<std::string> deviceModules;

    void read(const std::string& word) {
        if (waiting != nullptr) {
            _readValue(*waiting, word);
            waiting = nullptr;
        } else if (word.starts_with("-")) {
            const std::size_t equals = word.find('=');
            const CLI::Option* option = command->get_option_no_throw(word.substr(0, equals));
            if (option == nullptr || option->get_items_expected_max() == 0) {
                return;
            }
            if (equals == std::string::npos) {
                waiting = option;
            } else {
                _readValue(*option, word.substr(equals + 1));
            }
        } else if (const CLI::App* inner = subcommandOf(*command, word)) {
            command = inner;
        } else {
            positionals.push_back(word);
        }
    }

  private:
    void _readValue(const CLI::Option& option, const std::string& value) {
        if (option.get_name() == "--plugin") {
            plugin = value;
        } else if (option.get_name() == "--device-module") {
            deviceModules.push_back(value);
        }
    }
};

class Candidates {
  public:
    // `value` is what has been typed; `prefix` stands before it in the same word: "--format=".
    Candidates(const Line& line, std::string prefix, std::string value)
        : _line(line), _prefix(std::move(prefix)), _value(std::move(value)) {}

    void offerOptions() {
        for (const CLI::Option* option : _line.command->get_options()) {
            if (!option->get_positional()) {
                _offer(option->get_name(), option->get_description());
            }
        }
    }

    // Commands, or else what the next positional argument can be, or else options.
    void offerArguments() {
        offerCommands(*_line.command);
        const auto positionals = _line.command->get_options(
            [](const CLI::Option* option) { return option->get_positional(); });
        if (!positionals.empty() && (positionals.back()->get_items_expected_max() > 1 ||
                                     _line.positionals.size() < positionals.size())) {
            const std::size_t at = std::min(_line.positionals.size(), positionals.size() - 1);
            _offerSource(positionals[at]->get_name());
            offerValues(*positionals[at]);
        }
        if (text.empty()) {
            offerOptions();
        }
    }

    // An option's type holds what its values can be: words as they stand, and placeholders.
    void offerValues(const CLI::Option& option) {
        const std::string type = option.get_type_name();
        for (std::size_t at = 0; at < type.size();) {
            const std::size_t end = std::min(type.find('|', at), type.size());
            const std::string one = type.substr(at, end - at);
            if (std::islower(static_cast<unsigned char>(one.front())) != 0) {
                _offer(one);
            } else {
                _offerSource(one);
            }
            at = end + 1;
        }
    }

    void offerCommands(const CLI::App& app) {
        for (const CLI::App* command : app.get_subcommands({})) {
            _offer(command->get_name(), command->get_description());
        }
    }

    std::string text;

  private:
    void _offer(const std::string& word, const std::string& description = "") {
        text += _prefix + word;
        const std::size_t length = description.find_first_of(";\n");  // a longer one's first part
        if (!description.empty()) {
            text += '\t';
            text += plainLine(description.substr(0, length));
        }
        text += "\n";
    }

    void _offerSource(const std::string& placeholder) {
        for (const auto& [name, offer] : kSources) {
            if (name == placeholder) {
                (this->*offer)();
            }
        }
    }

    const ZRLab& _lab() const {
        loadModule(_line.plugin);
        return ZRLab::defaultLab();
    }

    void _offerNames() {
        const ZRLab& lab = _lab();
        for (const auto& diagnostic : lab.diagnostics()) {
            _offer(diagnostic.name, diagnostic.summary);
        }
        const auto offer = [&](Part kind, const std::vector<std::string>& names) {
            for (const std::string& name : names) {
                const auto description = describePart(lab, kind, name);
                _offer(name, description.has_value() ? description->summary() : "");
            }
        };
        offer(Part::Experiment, lab.experimentNames());
        if (_line.command->get_name() == "describe") {
            offer(Part::Analysis, lab.analysisNames());
        }
    }

    void _offerCommands() { offerCommands(*_line.command->get_parent()); }

    // The parameters of the names on the line; of all names when there is none yet.
    void _offerParameters() {
        const ZRLab& lab = _lab();
        std::set<std::string> offered;
        const auto offer = [&](Part kind, const std::string& part) {
            const auto description = describePart(lab, kind, part);
            if (!description.has_value()) {
                return;
            }
            for (const auto& [name, parameter] : description->parameters()) {
                for (const std::string& word :
                     {name + "=", fmt::format("{}:{}=", partText(kind), name)}) {
                    if (offered.insert(word).second) {
                        _offer(word, parameter.summary());
                    }
                }
            }
        };
        for (const std::string& name :
             _line.positionals.empty() ? runnableNames(lab) : _line.positionals) {
            for (const auto& [kind, part] : partsOf(lab, name)) {
                offer(kind, part);
            }
        }
    }

    void _offerDevices() {
        loadDeviceModules(_line.deviceModules);
        DeviceChoice choice;
        choice.device = _value;
        const std::string kindPrefix =
            _value.substr(0, _value.size() - deviceArgument(choice).size());
        for (const devices::Kind& kind : devices::kinds()) {
            const std::string withKind = kind.name + ":";
            _offer(withKind, kind.summary);
            // Devices of the first kind need no kind.
            const bool isBare =
                withKind != kindPrefix && kind.name == devices::kinds().front().name;
            for (const devices::Entry& device :
                 kind.list ? kind.list() : std::vector<devices::Entry>()) {
                _offer((isBare ? "" : withKind) + device.name, device.summary);
            }
        }
        _offerFiles(kindPrefix);
    }

    void _offerAnyFile() { _offerFiles(""); }

    // Files behind one prefix only: the first one that is offered.
    void _offerFiles(const std::string& prefix) {
        if (text.find(":files") == std::string::npos) {
            text += ":files\t" + _prefix + prefix + "\n";
        }
    }

    struct Source {
        std::string_view placeholder;
        void (Candidates::*offer)();
    };
    static const Source kSources[8];

    const Line& _line;
    const std::string _prefix;
    const std::string _value;
};

const Candidates::Source Candidates::kSources[] = {
    {"NAME", &Candidates::_offerNames},
    {"COMMAND", &Candidates::_offerCommands},
    {"DEVICE", &Candidates::_offerDevices},
    {"WHAT", &Candidates::_offerDevices},
    {"PARAM=VALUE", &Candidates::_offerParameters},
    {"FILE", &Candidates::_offerAnyFile},
    {"PATH", &Candidates::_offerAnyFile},
    {"WHERE", &Candidates::_offerAnyFile},
};

}  // namespace

std::string completions(const CommandLine& commandLine, std::vector<std::string> words) {
    std::string value;
    if (!words.empty()) {
        value = std::move(words.back());
        words.pop_back();
    }
    Line line{.command = &commandLine.app(),
              .positionals = {},
              .plugin = commandLine.plugin,
              .deviceModules = {}};
    for (const std::string& word : words) {
        line.read(word);
    }
    std::string prefix;
    if (line.waiting == nullptr && value.starts_with("--") &&
        value.find('=') != std::string::npos) {
        prefix = value.substr(0, value.find('=') + 1);
        value.erase(0, prefix.size());
        line.read(prefix.substr(0, prefix.size() - 1));
        if (line.waiting == nullptr) {
            return "";
        }
    }
    Candidates candidates(line, std::move(prefix), value);
    try {
        if (line.waiting != nullptr) {
            candidates.offerValues(*line.waiting);
        } else if (value.starts_with("-")) {
            candidates.offerOptions();
        } else {
            candidates.offerArguments();
        }
    } catch (const std::exception&) {
        // A module cannot be loaded or throws: what it would offer is not known.
    }
    return std::move(candidates.text);
}

}  // namespace host
