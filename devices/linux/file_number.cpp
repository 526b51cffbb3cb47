#include "devices/linux/file_number.h"

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cstdint>
#include <vector>

#include "devices/linux/system_problem.h"

namespace linux_device {

namespace {

constexpr std::string_view kSpace = " \t\r\v\f";
// The regular expressions of the library recurse for each character.
constexpr std::size_t kLongestLine = 4096;

// Takes the first line off the text.
std::string_view takeLine(std::string_view& text) {
    const std::size_t end = text.find('\n');
    const std::string_view line = text.substr(0, end);
    text.remove_prefix(end == std::string_view::npos ? text.size() : end + 1);
    return line;
}

std::vector<std::string_view> fieldsOf(std::string_view line) {
    std::vector<std::string_view> fields;
    for (;;) {
        const std::size_t begin = line.find_first_not_of(kSpace);
        if (begin == std::string_view::npos) {
            return fields;
        }
        line.remove_prefix(begin);
        const std::size_t end = std::min(line.find_first_of(kSpace), line.size());
        fields.push_back(line.substr(0, end));
        line.remove_prefix(end);
    }
}

[[noreturn]] void failData(const std::string& name, const std::string& reason) {
    throw SystemProblem(name + ": " + reason, ENODATA);
}

platform::Number requireNumber(std::string_view text, const std::string& name) {
    const platform::Number number = parseNumber(text);
    if (!number.isPresent()) {
        failData(name, "\"" + std::string(text.substr(0, 40)) + "\" is not a number");
    }
    return number;
}

platform::Number sum(const platform::Number& a, const platform::Number& b) {
    return a.isFloating() || b.isFloating()
               ? platform::Number(a.asDouble() + b.asDouble())
               : platform::Number(a.as<std::int64_t>() + b.as<std::int64_t>());
}

platform::Number sumOfFields(std::string_view line,
                             const FieldRange& range,
                             const std::string& name) {
    const std::vector<std::string_view> fields = fieldsOf(line);
    if (fields.size() < range.last.value_or(range.first)) {
        failData(name, "the line has " + std::to_string(fields.size()) + " fields, field " +
                           std::to_string(range.last.value_or(range.first)) + " is asked for");
    }
    platform::Number total = requireNumber(fields[range.first - 1], name);
    const std::size_t end = range.last.value_or(fields.size());
    for (std::size_t at = range.first; at < end; ++at) {
        const platform::Number next = parseNumber(fields[at]);
        if (!next.isPresent() && !range.last.has_value()) {
            break;
        }
        total = sum(total, requireNumber(fields[at], name));
    }
    return total;
}

}  // namespace

platform::Number parseNumber(std::string_view text) {
    const char* end = text.data() + text.size();
    const auto as = [&](auto value, auto... format) {
        const auto [stopped, problem] = std::from_chars(text.data(), end, value, format...);
        return problem == std::errc() && stopped == end ? platform::Number(value)
                                                        : platform::Number();
    };
    if (text.starts_with("0x") || text.starts_with("0X")) {
        text.remove_prefix(2);
        return as(std::uint64_t{0}, 16);
    }
    if (const platform::Number whole = as(std::int64_t{0}); whole.isPresent()) {
        return whole;
    }
    const platform::Number large = as(std::uint64_t{0});
    return large.isPresent() ? large : as(0.0);
}

platform::Number numberIn(std::string_view text,
                          const FileNumber& wanted,
                          const std::string& name) {
    if (!wanted.match.has_value()) {
        return sumOfFields(takeLine(text), wanted.field.value_or(FieldRange()), name);
    }
    while (!text.empty()) {
        const std::string_view line = takeLine(text).substr(0, kLongestLine);
        std::cmatch groups;
        if (!std::regex_search(line.data(), line.data() + line.size(), groups, *wanted.match)) {
            continue;
        }
        return wanted.field.has_value()
                   ? sumOfFields(line, *wanted.field, name)
                   : requireNumber({groups[1].first, static_cast<std::size_t>(groups[1].length())},
                                   name);
    }
    failData(name, "no line matches \"" + wanted.matchText + "\"");
}

platform::Number readNumber(const Machine& machine, const FileNumber& wanted) {
    const std::string path = machine.find(wanted.file);
    return numberIn(machine.read(path), wanted, path);
}

}  // namespace linux_device
