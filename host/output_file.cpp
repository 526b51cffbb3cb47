#include "host/output_file.h"

#include <cerrno>
#include <cstdlib>
#include <system_error>

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include "host/terminal.h"

namespace host {

namespace {

std::string problemWith(const std::string& path, int number) {
    return "cannot write " + path + ": " + std::generic_category().message(number);
}

// A temporary file beside its target; removed again unless it takes the target's place.
class Temporary {
  public:
    explicit Temporary(const std::string& target) : _path(target + ".XXXXXX") {
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

    bool replace(const std::string& target, std::string_view content) {
        while (!content.empty()) {
            const ssize_t written = ::write(_file, content.data(), content.size());
            if (written < 0 && errno != EINTR) {
                return false;
            }
            if (written > 0) {
                content.remove_prefix(static_cast<std::size_t>(written));
            }
        }
        // What a file made in the ordinary way would get; the temporary one is its owner's only.
        const mode_t mask = umask(0);
        umask(mask);
        if (fchmod(_file, 0666 & ~mask) != 0 || fsync(_file) != 0 ||
            rename(_path.c_str(), target.c_str()) != 0) {
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

}  // namespace

std::optional<std::string> cannotWrite(const std::string& path) {
    struct stat status {};
    if (stat(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode)) {
        return problemWith(path, EISDIR);
    }
    const Temporary temporary(path);
    return temporary.isOpen() ? std::nullopt : std::optional(problemWith(path, errno));
}

std::optional<std::string> writeFile(const std::string& path, std::string_view content) {
    const platform::MutexLock lock(Terminal::shared().mutex());
    Temporary temporary(path);
    if (!temporary.isOpen() || !temporary.replace(path, content)) {
        return problemWith(path, errno);
    }
    return std::nullopt;
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

std::optional<std::string> Spool::writeTo(const std::string& path) {
    if (_lost || std::fflush(_file) != 0) {
        return "cannot write " + path + ": no room for it in the folder of temporary files";
    }
    const long size = std::ftell(_file);
    if (size == 0) {
        return writeFile(path, "");
    }
    const auto length = static_cast<std::size_t>(size);
    void* pages = mmap(nullptr, length, PROT_READ, MAP_PRIVATE, fileno(_file), 0);
    if (pages == MAP_FAILED) {
        return problemWith(path, errno);
    }
    auto problem = writeFile(path, {static_cast<const char*>(pages), length});
    munmap(pages, length);
    return problem;
}

}  // namespace host
