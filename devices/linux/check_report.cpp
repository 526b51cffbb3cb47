#include "devices/linux/check_report.h"

#include <algorithm>
#include <array>
#include <charconv>

#include <grp.h>
#include <pwd.h>
#include <sys/stat.h>

#include "input/text_file.h"

namespace linux_device {

namespace {

constexpr std::string_view kOk = "ok";
constexpr std::string_view kConstant = "constant";
constexpr std::string_view kMissing = "missing";

std::string padded(std::string text, std::size_t width) {
    text.resize(std::max(width, text.size()), ' ');
    return text;
}

std::string octal(unsigned number) {
    std::array<char, 16> digits{'0'};
    auto* const end =
        std::to_chars(digits.data() + 1, digits.data() + digits.size(), number, 8).ptr;
    return {digits.data(), end};
}

std::string userName(uid_t id) {
    const passwd* user = getpwuid(id);
    return user != nullptr ? user->pw_name : std::to_string(id);
}

std::string groupName(gid_t id) {
    const group* found = getgrgid(id);
    return found != nullptr ? found->gr_name : std::to_string(id);
}

}  // namespace

void CheckReport::begin(const std::string& section) {
    _sections.push_back({section, {}});
}

void CheckReport::found(const std::string& name, const std::string& what) {
    _add(std::string(kOk), name, what);
}

void CheckReport::constant(const std::string& name, const std::string& what) {
    _add(std::string(kConstant), name, what);
}

void CheckReport::missing(const std::string& name, const std::string& why) {
    _add(std::string(kMissing), name, why);
}

void CheckReport::advise(const std::string& text) {
    if (std::find(_advice.begin(), _advice.end(), text) == _advice.end()) {
        _advice.push_back(text);
    }
}

std::string CheckReport::withOwner(const std::string& path) const {
    struct stat file {};
    if (stat(_machine.at(path).c_str(), &file) != 0) {
        return path;
    }
    constexpr unsigned kPermissions = 0777;
    return path + " (" + userName(file.st_uid) + ":" + groupName(file.st_gid) + " " +
           octal(file.st_mode & kPermissions) + ")";
}

bool CheckReport::isPrivate(const std::string& path) const {
    struct stat file {};
    return stat(_machine.at(path).c_str(), &file) == 0 && file.st_gid == 0 &&
           (file.st_mode & S_IROTH) == 0;
}

devices::Findings CheckReport::findings() const {
    devices::Findings findings;
    std::size_t constants = 0;
    std::size_t all = 0;
    for (const Section& section : _sections) {
        findings.lines.push_back(section.name);
        std::size_t width = 0;
        for (const Row& row : section.rows) {
            width = std::max(width, row.name.size());
        }
        for (const Row& row : section.rows) {
            findings.lines.push_back(input::oneLine("  " + padded(row.state, kConstant.size()) +
                                                    "  " + padded(row.name, width) + "  " +
                                                    row.text));
            ++all;
            constants += row.state == kConstant ? 1 : 0;
            findings.missing += row.state == kMissing ? 1 : 0;
        }
    }
    findings.lines.insert(findings.lines.end(), _advice.begin(), _advice.end());
    findings.lines.push_back(std::to_string(all) + " described, " +
                             std::to_string(all - constants - findings.missing) + " found, " +
                             std::to_string(constants) + " constant, " +
                             std::to_string(findings.missing) + " missing");
    return findings;
}

void CheckReport::_add(const std::string& state, const std::string& name, const std::string& text) {
    _sections.back().rows.push_back({state, name, text});
}

}  // namespace linux_device
