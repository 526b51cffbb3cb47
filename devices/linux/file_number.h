// A number in a text file of the machine.
#ifndef ZR_DEVICES_LINUX_FILE_NUMBER_H
#define ZR_DEVICES_LINUX_FILE_NUMBER_H

#include <cstddef>
#include <optional>
#include <regex>
#include <string>
#include <string_view>

#include "devices/linux/machine.h"
#include "platform/number.h"

namespace linux_device {

// Which fields of a line, parted by white space and counted from 1. Several are summed up; a range without an end
// goes on to the first field that is not a number, as in the columns of /proc/interrupts.
struct FieldRange {
    std::size_t first = 1;
    std::optional<std::size_t> last = 1;
};

struct FileNumber {
    FilePattern file = {};
    // The first line that it is found in counts (ECMAScript, searched): with a field, the field of that line, else
    // the pattern's first group. Without it the file's first line counts, and without a field its first one.
    std::optional<std::regex> match = {};
    std::string matchText = {};
    std::optional<FieldRange> field = {};
};

// The number in a text of such a file. Throws a SystemProblem that says what is not there; `name` is the file's.
platform::Number numberIn(std::string_view text, const FileNumber& wanted, const std::string& name);

// Finds the file, reads it and returns the number. Throws a SystemProblem.
platform::Number readNumber(const Machine& machine, const FileNumber& wanted);

// A number as files show them: decimal, 0x..., with a fraction. Absent when it is none.
platform::Number parseNumber(std::string_view text);

}  // namespace linux_device

#endif
