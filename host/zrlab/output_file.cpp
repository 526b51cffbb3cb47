#include "host/zrlab/output_file.h"

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <memory>
#include <system_error>

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include "host/record/problem.h"
#include "host/zrlab/terminal.h"

namespace host {

namespace {

std::string problemWith(const std::string& path, const std::string& reason) {
    return "cannot write " + path + ": " + reason;
}

std::string problemWith(const std::string& path, int number) {
    return problemWith(path, std::generic_category().message(number));
}

// Where a report goes: what stands there now, its links followed.
struct Target {
    explicit Target(const std::string& given) : path(given) {
        std::error_code none;
        const auto real = std::filesystem::canonical(given, none);
        if (!none) {
            path = real.string();
        }
        exists = stat(path.c_str(), &status) == 0;
    }
    bool isFolder() const { return exists && S_ISDIR(status.st_mode); }
    bool isSpecial() const { return exists && !S_ISREG(status.st_mode); }

    // The mode that a file made in the ordinary way would get, unless there is one already.
    mode_t mode() const {
        if (exists) {
            return status.st_mode & 07777;
        }
        const mode_t mask = umask(0);
        umask(mask);
        return 0666 & ~mask;
    }

    std::string path;
    struct stat status {};
    bool exists = false;
};

// A temporary file beside its target; removed again unless it takes the target's place.
class Temporary {
  public:
    explicit Temporary(const Target& target) : _path(target.path + ".XXXXXX") {
        _file = mkostemp(_path.data(), O_CLOEXEC);
    }
    Temporary(const Temporary&) = delete;
    Temporary& operator=(const Temporary&) = delete;
    ~Temporary() {
        if (_file >= 0) {
            close(_file);
            unlink(_path.c_str());
        }
    }

    bool isOpen() const { return _file >= 0; }

    bool replace(const Target& target, std::string_view content) {
        if (!isOpen() || !writeWhole(_file, content) || fchmod(_file, target.mode()) != 0 ||
            fsync(_file) != 0 || rename(_path.c_str(), target.path.c_str()) != 0) {
            return false;
        }
        close(_file);
        _file = -1;
        return true;
    }

  private:
    std::string _path;
    int _file;
};

bool writeSpecial(const Target& target, std::string_view content) {
    const int file = open(target.path.c_str(), O_WRONLY | O_CLOEXEC);
    if (file < 0) {
        return false;
    }
    const bool written = writeWhole(file, content);
    return close(file) == 0 && written;
}

}  // namespace

void requireWritable(const std::string& path) {
    const Target target(path);
    if (target.isFolder()) {
        throw Problem(kExitUsage, problemWith(path, EISDIR));
    }
    const bool isWritable =
        target.isSpecial() ? access(target.path.c_str(), W_OK) == 0 : Temporary(target).isOpen();
    if (!isWritable) {
        throw Problem(kExitUsage, problemWith(path, errno));
    }
}

void writeFile(const std::string& path, std::string_view content) {
    const platform::MutexLock lock(Terminal::shared().mutex());
    const Target target(path);
    const bool written = target.isSpecial() ? writeSpecial(target, content)
                                            : Temporary(target).replace(target, content);
    if (!written) {
        throw Problem(kExitError, problemWith(path, errno));
    }
}

Spool::Spool() : _file(std::tmpfile()), _lost(_file == nullptr) {}

Spool::~Spool() {
    if (_file != nullptr) {
        std::fclose(_file);
    }
}

void Spool::append(std::string_view text) {
    _lost = _lost || std::fwrite(text.data(), 1, text.size(), _file) != text.size();
}

void Spool::writeTo(const std::string& path) {
    if (_lost || std::fflush(_file) != 0) {
        throw Problem(kExitError,
                      problemWith(path, "no room for it in the folder of temporary files"));
    }
    const long size = std::ftell(_file);
    if (size == 0) {
        writeFile(path, "");
        return;
    }
    const auto length = static_cast<std::size_t>(size);
    void* pages = mmap(nullptr, length, PROT_READ, MAP_PRIVATE, fileno(_file), 0);
    if (pages == MAP_FAILED) {
        throw Problem(kExitError, problemWith(path, errno));
    }
    const std::unique_ptr<void, std::function<void(void*)>> unmapped(
        pages, [length](void* mapped) { munmap(mapped, length); });
    writeFile(path, {static_cast<const char*>(pages), length});
}

}  // namespace host
