#include "host/zrlab/output_file.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <memory>
#include <system_error>
#include <utility>

#include <fcntl.h>
#include <sys/file.h>
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

// An open file.
class Descriptor {
  public:
    Descriptor() = default;
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;
    ~Descriptor() { reset(-1); }
    int get() const { return _file; }
    void reset(int file) {
        if (_file >= 0) {
            close(_file);
        }
        _file = file;
    }

  private:
    int _file = -1;
};

// Puts a file that is written in the target's place, on the disk and with the target's mode.
bool moveTo(const Target& target, const Descriptor& file, const std::string& path) {
    return fchmod(file.get(), target.mode()) == 0 && fsync(file.get()) == 0 &&
           rename(path.c_str(), target.path.c_str()) == 0;
}

// A temporary file beside its target; removed again unless it takes the target's place.
class Temporary {
  public:
    explicit Temporary(const Target& target) : _path(target.path + ".XXXXXX") {
        _file.reset(mkostemp(_path.data(), O_CLOEXEC));
        _isThere = isOpen();
    }
    Temporary(const Temporary&) = delete;
    Temporary& operator=(const Temporary&) = delete;
    ~Temporary() {
        if (_isThere) {
            unlink(_path.c_str());
        }
    }

    bool isOpen() const { return _file.get() >= 0; }

    bool replace(const Target& target, std::string_view content) {
        if (!isOpen() || !writeWhole(_file.get(), content) || !moveTo(target, _file, _path)) {
            return false;
        }
        _isThere = false;
        return true;
    }

  private:
    std::string _path;
    Descriptor _file;
    bool _isThere;
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

namespace {

// Keeps the text in a nameless file, which vanishes with the object, and writes it at the end.
class Spool final : public OutputFile {
  public:
    explicit Spool(std::string path) : _path(std::move(path)), _file(std::tmpfile()) {
        _lost = _file == nullptr;
    }
    ~Spool() override {
        if (_file != nullptr) {
            std::fclose(_file);
        }
    }

    void append(std::string_view text) override {
        _lost = _lost || std::fwrite(text.data(), 1, text.size(), _file) != text.size();
    }

    void finish() override {
        if (_lost || std::fflush(_file) != 0) {
            throw Problem(kExitError,
                          problemWith(_path, "no room for it in the folder of temporary files"));
        }
        const long size = std::ftell(_file);
        if (size == 0) {
            writeFile(_path, "");
            return;
        }
        const auto length = static_cast<std::size_t>(size);
        void* pages = mmap(nullptr, length, PROT_READ, MAP_PRIVATE, fileno(_file), 0);
        if (pages == MAP_FAILED) {
            throw Problem(kExitError, problemWith(_path, errno));
        }
        const std::unique_ptr<void, std::function<void(void*)>> unmapped(
            pages, [length](void* mapped) { munmap(mapped, length); });
        writeFile(_path, {static_cast<const char*>(pages), length});
    }

  private:
    const std::string _path;
    std::FILE* _file;  // owned
    bool _lost;
};

// Writes into a file beside the target as the text comes, and renames it at the end. The file is locked
// meanwhile, so that two programs do not write into one.
class PartFile final : public OutputFile {
  public:
    PartFile(std::string given, Target target)
        : _given(std::move(given)), _target(std::move(target)), _path(_target.path + ".part") {
        do {
            _file.reset(open(_path.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, _target.mode()));
            if (_file.get() < 0) {
                throw Problem(kExitUsage, problemWith(_given, errno));
            }
            if (flock(_file.get(), LOCK_EX | LOCK_NB) != 0 && errno == EWOULDBLOCK) {
                throw Problem(kExitUsage,
                              problemWith(_given, "another program is writing " + _path));
            }
        } while (!_isStillThere());
        // What a program that was killed has left.
        if (ftruncate(_file.get(), 0) != 0) {
            throw Problem(kExitUsage, problemWith(_given, errno));
        }
    }
    ~PartFile() override {
        if (!_isKept) {
            unlink(_path.c_str());
        }
    }

    void append(std::string_view text) override {
        _isKept = true;
        if (_error == 0 && !writeWhole(_file.get(), text)) {
            _error = errno;
        }
    }

    void finish() override {
        const platform::MutexLock lock(Terminal::shared().mutex());
        if (_error == 0 && !moveTo(_target, _file, _path)) {
            _error = errno;
        }
        if (_error != 0) {
            throw Problem(kExitError,
                          problemWith(_given, _error) + "; what could be is in " + _path);
        }
        _isKept = true;
    }

  private:
    // Whether the file that is locked is the one with the name: the program that held the lock before may
    // have renamed it.
    bool _isStillThere() const {
        struct stat named {};
        struct stat locked {};
        return stat(_path.c_str(), &named) == 0 && fstat(_file.get(), &locked) == 0 &&
               named.st_dev == locked.st_dev && named.st_ino == locked.st_ino;
    }

    const std::string _given;
    const Target _target;
    const std::string _path;
    Descriptor _file;
    bool _isKept = false;  // under this name or the target's
    int _error = 0;        // of the first write that failed
};

}  // namespace

std::unique_ptr<OutputFile> openOutputFile(const std::string& path, bool asItComes) {
    Target target(path);
    if (asItComes && !target.isSpecial()) {
        return std::make_unique<PartFile>(path, std::move(target));
    }
    return std::make_unique<Spool>(path);
}

}  // namespace host
