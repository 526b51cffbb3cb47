#include "devices/linux/machine.h"

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <cstring>
#include <system_error>

#include <fcntl.h>
#include <fnmatch.h>

#include "devices/linux/file_descriptor.h"
#include "devices/linux/system_problem.h"

namespace linux_device {

namespace {

constexpr std::size_t kLongestFile = std::size_t{1} << 20U;

bool hasWildcard(std::string_view part) {
    return part.find_first_of("*?[") != std::string_view::npos;
}

// Throws when the folder is there and cannot be read.
std::vector<std::string> entriesOf(const std::filesystem::path& folder, const std::string& shown) {
    std::error_code problem;
    std::vector<std::string> names;
    std::filesystem::directory_iterator entry(folder, problem);
    for (; !problem && entry != std::filesystem::directory_iterator(); entry.increment(problem)) {
        names.push_back(entry->path().filename().string());
    }
    if (problem && problem.value() != ENOENT && problem.value() != ENOTDIR) {
        failWithErrno(shown, problem.value());
    }
    std::sort(names.begin(), names.end(), [](const std::string& a, const std::string& b) {
        return strverscmp(a.c_str(), b.c_str()) < 0;
    });
    return names;
}

}  // namespace

std::filesystem::path Machine::at(std::string_view path) const {
    return _root / std::filesystem::path(path).relative_path();
}

std::vector<std::string> Machine::findAll(const FilePattern& pattern) const {
    // A path so far, and the folder that its last wildcard matched.
    struct Place {
        std::string path;
        std::string matched;
    };
    std::vector<Place> places = {{}};
    for (const auto& component : std::filesystem::path(pattern.path).relative_path()) {
        const std::string part = component.string();
        std::vector<Place> next;
        for (const Place& place : places) {
            if (!hasWildcard(part)) {
                next.push_back({place.path + "/" + part, place.matched});
                continue;
            }
            for (const std::string& name : entriesOf(at(place.path), place.path)) {
                if (fnmatch(part.c_str(), name.c_str(), FNM_PERIOD) == 0) {
                    next.push_back({place.path + "/" + name, place.path + "/" + name});
                }
            }
        }
        places = std::move(next);
    }
    std::vector<std::string> found;
    for (const Place& place : places) {
        const bool isMeant =
            std::all_of(pattern.where.begin(), pattern.where.end(), [&](const auto& where) {
                return line(place.matched + "/" + where.first) == where.second;
            });
        std::error_code problem;
        const bool exists = std::filesystem::exists(at(place.path), problem);
        // What stands behind a folder that is closed to us is for read() to complain about.
        if (isMeant && (exists || problem)) {
            found.push_back(place.path);
        }
    }
    return found;
}

std::string Machine::find(const FilePattern& pattern) const {
    const std::vector<std::string> found = findAll(pattern);
    if (found.empty()) {
        failWithErrno(pattern.path, ENOENT);
    }
    if (found.size() > 1) {
        throw SystemProblem(pattern.path + ": " + std::to_string(found.size()) + " files match, " +
                                found[0] + " and " + found[1] + " among them",
                            ENOTUNIQ);
    }
    return found.front();
}

std::string Machine::read(std::string_view path) const {
    const std::string shown(path);
    const FileDescriptor file(::open(at(path).c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
    if (!file.isOpen()) {
        failWithErrno(shown);
    }
    std::string text;
    constexpr std::size_t kStep = 4096;
    for (;;) {
        const std::size_t before = text.size();
        if (before >= kLongestFile) {
            failWithErrno(shown, EFBIG);
        }
        text.resize(before + kStep);
        const ssize_t count = ::read(file.number(), text.data() + before, kStep);
        const int code = errno;
        text.resize(before + static_cast<std::size_t>(std::max<ssize_t>(count, 0)));
        if (count == 0) {
            return text;
        }
        if (count < 0 && code != EINTR) {
            failWithErrno(shown, code);
        }
    }
}

std::string Machine::readLine(std::string_view path) const {
    std::string text = read(path);
    text.erase(text.find_last_not_of(" \t\r\n") + 1);
    return text;
}

std::string Machine::line(std::string_view path) const {
    try {
        return readLine(path);
    } catch (const SystemProblem&) {
        return "";
    }
}

std::vector<std::string> Machine::names(std::string_view folder) const {
    try {
        return entriesOf(at(folder), std::string(folder));
    } catch (const SystemProblem&) {
        return {};
    }
}

std::string Machine::target(std::string_view path) const {
    std::error_code problem;
    const auto full = std::filesystem::canonical(at(path), problem);
    if (problem) {
        return "";
    }
    const auto root = std::filesystem::canonical(_root, problem);
    return ("/" / full.lexically_relative(root)).string();
}

}  // namespace linux_device
