// Completion of command lines in a shell. A shell's script only asks the program what can follow, with
// `zrlab complete WORD...`, so that names, parameters and devices are always those of the modules on the
// line.
#ifndef ZR_HOST_ZRLAB_COMPLETION_H
#define ZR_HOST_ZRLAB_COMPLETION_H

#include <string>
#include <string_view>
#include <vector>

#include "host/zrlab/command_line.h"

namespace host {

// The script for "bash" or "zsh"; empty for any other shell.
std::string_view completionScript(std::string_view shell);

// What can stand in place of the last of `words`, which are the arguments up to the cursor. Each line is a
// word, a tab and what the word is for; one that ends in '=' or ':' is meant to be continued. The line
// ":files", a tab and a text stands for the text followed by the name of any file. What has been typed of
// the word does not restrict the lines: the shell does.
// Loads the modules that the line names; one that cannot be loaded adds nothing. Main thread.
std::string completions(const CommandLine& commandLine, std::vector<std::string> words);

}  // namespace host

#endif
