// Reading of the small files that users write: profiles, limits.
#ifndef ZR_INPUT_TEXT_FILE_H
#define ZR_INPUT_TEXT_FILE_H

#include <filesystem>
#include <string>
#include <string_view>

namespace input {

// The content of the file, of at most 1 MiB; a pipe is read to its end. Throws a DocumentProblem that names the
// file when it cannot be read, is longer, or is a folder; `what` says what was expected: "a profile".
std::string readTextFile(const std::filesystem::path& path, std::string_view what);

// The text in one line that cannot control a terminal: every control character becomes a question mark.
std::string oneLine(std::string text);

}  // namespace input

#endif
