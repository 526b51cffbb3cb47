// Writing a report to a file, whole or not at all.
#ifndef ZR_HOST_ZRLAB_OUTPUT_FILE_H
#define ZR_HOST_ZRLAB_OUTPUT_FILE_H

#include <memory>
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

// A report's file while the report is written. One thread at a time.
class OutputFile {
  public:
    virtual ~OutputFile() = default;

    // Adds text to the end. A failure is kept for finish().
    virtual void append(std::string_view text) = 0;

    // Puts the file in its place, as writeFile() does. Throws a Problem (kExitError) when that or an
    // append() failed. Without it the target stays as it was.
    virtual void finish() = 0;
};

// Opens the file at `path` for a report. With `asItComes` each append() is written at once to the file
// "PATH.part" beside it, one write each, and finish() renames that: it is kept when the program is killed
// and when something cannot be written. Otherwise, and to a device or a pipe, finish() writes all of it.
// Throws a Problem (kExitUsage) when no file can be made there, or another program
// is writing it.
std::unique_ptr<OutputFile> openOutputFile(const std::string& path, bool asItComes);

}  // namespace host

#endif
