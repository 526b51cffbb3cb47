// Writing a report to a file, whole or not at all.
#ifndef ZR_HOST_OUTPUT_FILE_H
#define ZR_HOST_OUTPUT_FILE_H

#include <optional>
#include <string>
#include <string_view>

namespace host {

// Nothing when a file can be written at `path`, else one line that says why not. Leaves nothing
// behind: used before a long run, so that its report is not lost at the end.
std::optional<std::string> cannotWrite(const std::string& path);

// Replaces the file at `path` by one with this content: a temporary file beside it, then a rename. An
// interrupt waits until it is done. Returns nothing on success, else one line that says what went
// wrong; the file is then as it was before.
std::optional<std::string> writeFile(const std::string& path, std::string_view content);

}  // namespace host

#endif
