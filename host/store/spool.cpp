#include "host/store/spool.h"

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <string_view>
#include <system_error>

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/store/engine.h"
#include "host/store/run_json.h"

namespace host {

namespace {

namespace fs = std::filesystem;

constexpr std::string_view kEntry = ".json";
constexpr std::string_view kPart = ".part";

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
    bool lock() const { return flock(_number, LOCK_EX | LOCK_NB) == 0; }

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

// Makes entries of files whose writer died; whether they are whole shows when they are read.
void adoptParts(const fs::path& folder) {
    for (const fs::path& part : filesWith(kPart, folder)) {
        const Descriptor file(part, O_RDONLY);
        if (file && file.lock()) {  // no writer has it
            fs::path entry = part;
            entry.replace_extension().replace_extension();
            std::error_code gone;
            fs::rename(part, entry, gone);
        }
    }
}

std::string contentOf(const fs::path& path) {
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
}

// Under a name that no delivery looks at. Returns what to say of it.
std::string setAside(const fs::path& entry, const char* ending, const std::string& why) {
    fs::path aside = entry;
    aside += ending;
    std::error_code gone;
    fs::rename(entry, aside, gone);
    return fmt::format("{}: {}", aside.string(), plainLine(why));
}

}  // namespace

void Spool::add(const SessionRecord& session, const RunRecord& run, Attachments attachments) const {
    const std::string text = runToJson(session, run, attachments);
    fs::create_directories(_folder);
    const fs::path entry = _folder / (run.uuid + std::string(kEntry));
    // A delivery may take the file for one whose writer died, before it is locked. Then it is written again.
    for (int attempt = 0;; ++attempt) {
        const fs::path part = fmt::format("{}.{}-{}{}", entry.string(), getpid(), attempt, kPart);
        const Descriptor file(part, O_WRONLY | O_CREAT | O_EXCL);
        if (!file) {
            failWith(errno, part);
        }
        if (!file.lock() && attempt < 100) {
            continue;
        }
        try {
            writeWhole(file, text, part);
        } catch (...) {
            unlink(part.c_str());
            throw;
        }
        if (rename(part.c_str(), entry.c_str()) == 0) {
            break;
        }
        if (errno != ENOENT || attempt >= 100) {
            failWith(errno, entry);
        }
    }
    syncFolder(_folder);
}

Spool::Delivery Spool::deliver(Store& store, std::chrono::milliseconds atMost) const {
    using Clock = std::chrono::steady_clock;
    const auto start = Clock::now();
    Delivery result;
    adoptParts(_folder);
    const std::vector<fs::path> entries = filesWith(kEntry, _folder);
    result.waiting = entries.size();
    for (const fs::path& entry : entries) {
        if (Clock::now() - start > atMost) {
            break;
        }
        const Descriptor exists(entry, O_RDONLY);
        if (!exists) {
            if (errno != ENOENT) {  // another process delivered it
                result.setAside.push_back(fmt::format("{}: cannot be read", entry.string()));
                continue;
            }
            --result.waiting;
            continue;
        }
        try {
            const SessionRecord session = runFromJson(contentOf(entry));
            store.write(session, session.runs.front(), {.frames = true, .images = true});
            std::error_code gone;
            fs::remove(entry, gone);
            ++result.delivered;
        } catch (const StoreProblem& problem) {
            if (problem.cause() != StoreProblem::Cause::Refused) {
                result.problem = problem;
                break;
            }
            result.setAside.push_back(setAside(entry, ".refused", problem.what()));
        } catch (const std::exception& exception) {
            result.setAside.push_back(setAside(entry, ".damaged", exception.what()));
        }
        --result.waiting;
    }
    return result;
}

std::filesystem::path defaultSpoolFolder(const std::string& where) {
    const char* state = std::getenv("XDG_STATE_HOME");
    const char* home = std::getenv("HOME");
    const fs::path base = state != nullptr && *state != '\0'
                              ? fs::path(state)
                              : fs::path(home != nullptr ? home : "/") / ".local/state";
    const std::string shown = shownAddress(where);
    const std::string store =
        shown.find("://") != std::string::npos ? shown : fs::absolute(shown).lexically_normal().string();
    // A name that people recognise, and a number that tells apart what it makes alike.
    std::uint64_t hash = 14695981039346656037U;  // FNV-1a
    std::string name;
    for (const char c : store) {
        hash = (hash ^ static_cast<unsigned char>(c)) * 1099511628211U;
        const bool isPlain =
            (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '.';
        name += isPlain ? c : '-';
    }
    name = name.substr(name.size() - std::min<std::size_t>(name.size(), 60));
    return base / "zrlab/spool" / fmt::format("{}-{:016x}", name, hash);
}

}  // namespace host
