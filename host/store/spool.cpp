#include "host/store/spool.h"

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstdlib>
#include <stdexcept>
#include <string_view>
#include <system_error>
#include <variant>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <fmt/format.h>
#include <nlohmann/json.hpp>

#include "host/record/clean_text.h"
#include "host/record/mask_passwords.h"
#include "host/record/uuid.h"
#include "host/store/run_json.h"

namespace host {

namespace {

namespace fs = std::filesystem;

constexpr std::string_view kEntry = ".json";
constexpr std::string_view kPart = ".part";
constexpr std::size_t kMostName = 60;

// A descriptor that is closed at its end; with it goes the lock on the file.
class Descriptor {
  public:
    Descriptor(const fs::path& path, int flags)
        : _number(open(path.c_str(), flags | O_CLOEXEC, 0666)) {}
    ~Descriptor() {
        if (_number >= 0) {
            close(_number);
        }
    }
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;

    int operator*() const { return _number; }
    explicit operator bool() const { return _number >= 0; }
    // Of this file among those who lock it.
    bool lock() const { return flock(_number, LOCK_EX) == 0; }
    bool tryLock() const { return flock(_number, LOCK_EX | LOCK_NB) == 0; }

  private:
    const int _number;
};

[[noreturn]] void failWith(int error, const fs::path& file) {
    throw std::system_error(error, std::generic_category(), file.string());
}

void writeWhole(const Descriptor& file, std::string_view text, const fs::path& path) {
    while (!text.empty()) {
        const ssize_t written = write(*file, text.data(), text.size());
        if (written < 0 && errno != EINTR) {
            failWith(errno, path);
        }
        text.remove_prefix(static_cast<std::size_t>(std::max<ssize_t>(written, 0)));
    }
    if (fsync(*file) != 0) {
        failWith(errno, path);
    }
}

// So that the names in it survive a loss of power.
void syncFolder(const fs::path& folder) {
    const Descriptor opened(folder, O_RDONLY | O_DIRECTORY);
    if (opened) {
        fsync(*opened);
    }
}

// The files of the folder with that ending, in the order of their names, which is that of the runs' time.
std::vector<fs::path> filesWith(std::string_view ending, const fs::path& folder) {
    std::vector<fs::path> files;
    if (fs::exists(folder)) {
        for (const fs::directory_entry& entry : fs::directory_iterator(folder)) {
            if (entry.path().native().ends_with(ending)) {
                files.push_back(entry.path());
            }
        }
    }
    std::sort(files.begin(), files.end());
    return files;
}

// Makes entries of files whose writer died; whether they are whole shows when they are read. A writer holds the
// lock from before the first byte on.
void adoptParts(const fs::path& folder) {
    for (const fs::path& part : filesWith(kPart, folder)) {
        const Descriptor file(part, O_RDONLY);
        struct stat status {};
        if (file && file.tryLock() && fstat(*file, &status) == 0 && status.st_size > 0) {
            fs::path entry = part;
            std::error_code gone;
            fs::rename(part, entry.replace_extension(), gone);
        }
    }
}

std::string contentOf(const Descriptor& file, const fs::path& path) {
    std::string content;
    char block[65536];
    for (ssize_t count = 1; count != 0;) {
        count = read(*file, block, sizeof block);
        if (count < 0 && errno != EINTR) {
            failWith(errno, path);
        }
        content.append(block, static_cast<std::size_t>(std::max<ssize_t>(count, 0)));
    }
    return content;
}

// The run in an entry, or why it is none.
std::variant<SessionRecord, std::string> runIn(const std::string& content) {
    try {
        SessionRecord session = runFromJson(content);
        if (!isUuid(session.runs.front().uuid)) {
            return "its run has no well-formed uuid";
        }
        return session;
    } catch (const nlohmann::json::exception& exception) {
        return exception.what();
    } catch (const std::runtime_error& exception) {
        return exception.what();
    }
}

// Gives the entry a name that no delivery looks at.
void setAside(const fs::path& entry,
              const char* ending,
              const std::string& why,
              Spool::Delivery& result) {
    fs::path aside = entry;
    aside += ending;
    if (rename(entry.c_str(), aside.c_str()) == 0) {
        result.setAside.push_back(fmt::format("{}: {}", aside.string(), plainLine(why)));
    } else if (errno != ENOENT) {  // else another process did it
        failWith(errno, aside);
    }
    --result.waiting;
}

}  // namespace

void Spool::add(const SessionRecord& session, const RunRecord& run, Attachments attachments) const {
    if (!isUuid(run.uuid)) {
        throw std::runtime_error(fmt::format("run \"{}\": not a uuid", plainLine(run.uuid)));
    }
    const std::string text = runToJson(session, run, attachments);
    fs::create_directories(_folder);
    fs::path entry = _folder / run.uuid;
    entry += kEntry;
    fs::path part = entry;
    part += kPart;
    const Descriptor file(part, O_WRONLY | O_CREAT | O_EXCL);
    if (!file || !file.lock()) {
        failWith(errno, part);
    }
    try {
        writeWhole(file, text, part);
        fs::rename(part, entry);
    } catch (...) {
        unlink(part.c_str());
        throw;
    }
    syncFolder(_folder);
}

Spool::Delivery Spool::deliver(Store& store, std::chrono::milliseconds atMost) const {
    Delivery result;
    try {
        _deliver(store, atMost, result);
    } catch (const std::exception& exception) {
        result.problem = plainLine(exception.what());
    }
    return result;
}

void Spool::_deliver(Store& store, std::chrono::milliseconds atMost, Delivery& result) const {
    using Clock = std::chrono::steady_clock;
    const auto start = Clock::now();
    adoptParts(_folder);
    const std::vector<fs::path> entries = filesWith(kEntry, _folder);
    result.waiting = entries.size();
    for (const fs::path& entry : entries) {
        // In milliseconds: the greatest of them do not fit into the clock's unit.
        if (std::chrono::floor<std::chrono::milliseconds>(Clock::now() - start) > atMost) {
            break;
        }
        const Descriptor file(entry, O_RDONLY);
        if (!file) {
            if (errno != ENOENT) {
                failWith(errno, entry);
            }
            --result.waiting;  // another process delivered it
            continue;
        }
        const auto read = runIn(contentOf(file, entry));
        if (const auto* why = std::get_if<std::string>(&read)) {
            setAside(entry, ".damaged", *why, result);
            continue;
        }
        const auto& session = std::get<SessionRecord>(read);
        try {
            result.delivered +=
                store.write(session, session.runs.front(), {.frames = true, .images = true}) ? 1
                                                                                             : 0;
        } catch (const StoreProblem& problem) {
            if (problem.cause() != StoreProblem::Cause::Refused) {
                throw;
            }
            setAside(entry, ".refused", problem.what(), result);
            continue;
        }
        fs::remove(entry);
        --result.waiting;
    }
}

std::size_t Spool::waiting() const {
    return filesWith(kEntry, _folder).size();
}

std::filesystem::path defaultSpoolFolder(const std::string& where) {
    const char* state = std::getenv("XDG_STATE_HOME");
    const char* home = std::getenv("HOME");
    const fs::path base = state != nullptr && *state != '\0'
                              ? fs::path(state)
                              : fs::path(home != nullptr ? home : "/") / ".local/state";
    const std::string shown = maskPasswords(where);
    const std::string store = shown.find("://") != std::string::npos
                                  ? shown
                                  : fs::absolute(shown).lexically_normal().string();
    // A name that people recognise, and a hash: different stores may get the same name.
    std::uint64_t hash = 14695981039346656037U;  // FNV-1a
    std::string name;
    for (const char c : store) {
        hash = (hash ^ static_cast<unsigned char>(c)) * 1099511628211U;
        const bool isPlain =
            (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '.';
        name += isPlain ? c : '-';
    }
    name.erase(0, std::max(name.size(), kMostName) - kMostName);
    name.erase(0, name.find_first_not_of('-'));
    return base / "zrlab/spool" / fmt::format("{}-{:016x}", name, hash);
}

}  // namespace host
