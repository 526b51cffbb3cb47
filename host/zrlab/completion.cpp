#include <string>

#include "host/zrlab/command_line.h"

namespace host {

namespace {

std::string optionNames(const CLI::App& command) {
    std::string names;
    for (const CLI::Option* option : command.get_options()) {
        if (!option->get_positional()) {
            names += (names.empty() ? "" : " ") + option->get_name();
        }
    }
    return names;
}

// An option whose values are known is written with all of them as its type: auto|always|never.
std::string optionValues(const CLI::App& command) {
    std::string cases;
    for (const CLI::Option* option : command.get_options()) {
        std::string values = option->get_type_name();
        const bool named = values.find_first_of("ABCDEFGHIJKLMNOPQRSTUVWXYZ") == std::string::npos;
        if (option->get_positional() || !named || values.find('|') == std::string::npos) {
            continue;
        }
        for (char& c : values) {
            c = c == '|' ? ' ' : c;
        }
        cases += "        " + option->get_name() + ") words=\"" + values + "\";;\n";
    }
    return cases;
}

// One function serves both shells: it works out the words that can stand at the cursor.
std::string wordsFunction(const CLI::App& app) {
    std::string commands;
    std::string perCommand;
    std::string values;
    for (const CLI::App* command : app.get_subcommands({})) {
        commands += (commands.empty() ? "" : " ") + command->get_name();
        perCommand +=
            "        " + command->get_name() + ") words=\"" + optionNames(*command) + "\";;\n";
        values += optionValues(*command);
    }
    return "# Words that can follow: $1 the command so far, $2 the word before the cursor, $3 the "
           "word at\n"
           "# it, $4 the program.\n"
           "_zrlab_words() {\n"
           "    local words=\"\"\n"
           "    case \"$2\" in\n" +
           values +
           "        --device) words=\"$(\"$4\" devices --names 2>/dev/null) $(compgen -f -- \"$3\" "
           "2>/dev/null)\";;\n"
           "        --set|--speed|--repeat) ;;\n"
           "        --output|--report|--plugin|--device-module) words=\"$(compgen -f -- \"$3\" "
           "2>/dev/null)\";;\n"
           "        completion) words=\"bash zsh\";;\n"
           "        help|zrlab) words=\"" +
           commands +
           "\";;\n"
           "        *) case \"$1\" in\n" +
           perCommand +
           "        esac\n"
           "        case \"$1\" in\n"
           "        run|describe) words=\"$words $(\"$4\" list --names 2>/dev/null)\";;\n"
           "        esac;;\n"
           "    esac\n"
           "    printf '%s\\n' $words\n"
           "}\n";
}

}  // namespace

std::string completionScript(const CLI::App& app, const std::string& shell) {
    if (shell == "bash") {
        return "# Completion of zrlab for bash.\n" + wordsFunction(app) +
               "_zrlab() {\n"
               "    local word=\"${COMP_WORDS[COMP_CWORD]}\" last=\"${COMP_WORDS[COMP_CWORD-1]}\"\n"
               "    if [ \"$COMP_CWORD\" -eq 1 ]; then last=zrlab; fi\n"
               "    COMPREPLY=($(compgen -W \"$(_zrlab_words \"${COMP_WORDS[1]}\" \"$last\" "
               "\"$word\" \"$1\")\" -- \"$word\"))\n"
               "}\n"
               "complete -F _zrlab zrlab ./zrlab\n";
    }
    if (shell == "zsh") {
        return "#compdef zrlab\n# Completion of zrlab for zsh.\n" + wordsFunction(app) +
               "_zrlab() {\n"
               "    local last=\"${words[CURRENT-1]}\"\n"
               "    case \"$last\" in\n"
               "        --output|--report|--plugin|--device-module) _files; return;;\n"
               "    esac\n"
               "    [ \"$CURRENT\" -eq 2 ] && last=zrlab\n"
               "    compadd -- ${(f)\"$(_zrlab_words \"${words[2]}\" \"$last\" \"\" "
               "\"${words[1]}\" | tr ' ' "
               "'\\n')\"}\n"
               "}\n"
               "_zrlab \"$@\"\n";
    }
    return "";
}

}  // namespace host
