// Writing a report to a file, whole or not at all.
#ifndef ZR_HOST_ZRLAB_OUTPUT_FILE_H
#define ZR_HOST_ZRLAB_OUTPUT_FILE_H

#include <cstdio>
#include <string>
#include <string_view>

namespace host {

// Throws a Problem (kExitUsage) when no file can be written at `path`. Leaves nothing behind: used before
// a long run, so that its report is not lost at the end.
void requireWritable(const std::string& path);

// Replaces the file at `path` by one with this content: a temporary file beside it, then a rename. The
// new file gets the old one's mode; its owner and hard links are not kept. A link is followed; what is not a file (a device, a pipe) is written to.
// An interrupt waits until it is done. Throws a Problem (kExitError) when it fails; the file is then as
// it was before.
void writeFile(const std::string& path, std::string_view content);

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
    void writeTo(const std::string& path);

  private:
    std::FILE* _file;  // owned
    bool _lost = false;
};

}  // namespace host

#endif
