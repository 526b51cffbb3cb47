// Writing a report to a file, whole or not at all.
#ifndef ZR_HOST_ZRLAB_OUTPUT_FILE_H
#define ZR_HOST_ZRLAB_OUTPUT_FILE_H

#include <cstdio>
#include <optional>
#include <string>
#include <string_view>

namespace host {

// Nothing when a file can be written at `path`, else one line that says why not. Leaves nothing
// behind: used before a long run, so that its report is not lost at the end.
std::optional<std::string> cannotWrite(const std::string& path);

// Replaces the file at `path` by one with this content: a temporary file beside it, then a rename, so
// that the file keeps its mode. A link is followed; what is no file (a device, a pipe) is written to.
// An interrupt waits until it is done. Returns nothing on success, else one line that says what went
// wrong; the file is then as it was before.
std::optional<std::string> writeFile(const std::string& path, std::string_view content);

// What a long run has written so far, kept in a nameless file instead of in memory. It vanishes with
// the object, also when the program is interrupted. One thread at a time.
class Spool {
  public:
    Spool();
    ~Spool();
    Spool(const Spool&) = delete;
    Spool& operator=(const Spool&) = delete;

    void append(std::string_view text);

    // As writeFile(), with all that was appended.
    std::optional<std::string> writeTo(const std::string& path);

  private:
    std::FILE* _file;  // owned
    bool _lost = false;
};

}  // namespace host

#endif
