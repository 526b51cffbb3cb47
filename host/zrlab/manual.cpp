#include <string>
#include <string_view>

#include "host/zrlab/command_line.h"

namespace host {

namespace {

// Text for man(1), without an accidental escape or control line.
std::string escaped(std::string_view text) {
    std::string out;
    for (const char c : text) {
        if (c == '\\') {
            out += "\\e";
        } else if (c == '-') {
            out += "\\-";
        } else {
            if ((c == '.' || c == '\'') && (out.empty() || out.back() == '\n')) {
                out += "\\&";
            }
            out += c;
        }
    }
    return out;
}

std::string described(const CLI::Option& option) {
    std::string text = option.get_description();
    if (!option.get_default_str().empty()) {
        text += " (default: " + option.get_default_str() + ")";
    }
    return text + ".";
}

std::string optionsOf(const CLI::App& app) {
    std::string out;
    for (const CLI::Option* option : app.get_options()) {
        const bool positional = option->get_positional();
        out += ".TP\n.B " +
               escaped(positional ? option->get_name() : option->get_name(false, true)) + "\n";
        if (!positional && option->get_items_expected() > 0) {
            out.insert(out.size() - 1, " " + escaped(option->get_type_name()));
        }
        out += escaped(described(*option)) + "\n";
    }
    return out;
}

// A footer is set without filling: it holds examples and tables.
std::string footerOf(const CLI::App& app) {
    return app.get_footer().empty() ? "" : ".PP\n.nf\n" + escaped(app.get_footer()) + "\n.fi\n";
}

// A command and those below it.
std::string commandOf(const CLI::App& app, const std::string& path) {
    std::string out = ".SS " + path + "\n" + escaped(app.get_description()) + ".\n" +
                      optionsOf(app) + footerOf(app);
    for (const CLI::App* inner : app.get_subcommands({})) {
        out += commandOf(*inner, path + " " + inner->get_name());
    }
    return out;
}

}  // namespace

std::string manualPage(const CLI::App& app, const std::string& version) {
    std::string page = R"(.TH ZRLAB 1 "" "zrlab )" + version + R"(" "User Commands")" + "\n";
    page += ".SH NAME\nzrlab \\- run, judge and report hardware diagnostics\n";
    page += ".SH SYNOPSIS\n.B zrlab\n.I COMMAND\n.RI [ OPTION \" ...] [\" ARGUMENT \" ...]\"\n";
    page += ".SH DESCRIPTION\n" + escaped(app.get_description()) + "\n";
    page += ".SH OPTIONS\n" + optionsOf(app);
    page += ".SH COMMANDS\n";
    for (const CLI::App* command : app.get_subcommands({})) {
        page += commandOf(*command, "zrlab " + command->get_name());
    }
    page += ".SH EXAMPLES\n" + footerOf(app);
    return page;
}

}  // namespace host
