#include "host/zrlab/terminal.h"

#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <thread>

#include <poll.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <climits>

#include "host/record/clean_text.h"

namespace host {

namespace {

constexpr std::string_view kClearLine = "\r\x1b[K";

// How long a reader may take nothing once the program is to stop, and how often that is looked at.
constexpr std::chrono::seconds kLongestStall{1};
constexpr int kStallCheck = 100;  // milliseconds

std::string_view environment(const char* name) {
    const char* value = std::getenv(name);
    return value != nullptr ? value : "";
}

}  // namespace

bool writeWhole(int file, std::string_view text) {
    while (!text.empty()) {
        const ssize_t written = ::write(file, text.data(), text.size());
        if (written < 0 && errno != EINTR) {
            return false;
        }
        text.remove_prefix(written > 0 ? static_cast<std::size_t>(written) : 0);
    }
    return true;
}

Terminal::Terminal()
    : _errorIsTerminal(isatty(STDERR_FILENO) == 1 && environment("TERM") != "dumb") {}

// The text's first `columns` characters. Every character that the program shows takes one column.
std::string_view cutTo(std::string_view text, std::size_t columns) {
    std::size_t at = 0;
    for (; at < text.size(); ++at) {
        const bool begins = (static_cast<unsigned char>(text[at]) & 0xC0) != 0x80;
        if (begins && columns-- == 0) {
            break;
        }
    }
    return text.substr(0, at);
}

std::size_t widthOf(int terminal) {
    winsize size{};
    const bool known = ioctl(terminal, TIOCGWINSZ, &size) == 0 && size.ws_col > 0;
    return known ? size.ws_col : 80;
}

bool takesColour(int file, Colour asked) {
    if (asked != Colour::Automatic) {
        return asked == Colour::Always;
    }
    return isatty(file) == 1 && environment("NO_COLOR").empty() && environment("TERM") != "dumb";
}

Terminal& Terminal::shared() {
    static Terminal& terminal = *new Terminal;
    return terminal;
}

bool Terminal::outputTakesColour(Colour asked) {
    return takesColour(STDOUT_FILENO, asked);
}

bool Terminal::errorTakesColour(Colour asked) {
    return takesColour(STDERR_FILENO, asked);
}

void Terminal::complain(std::string_view problem) {
    line("zrlab: " + plainLine(problem));
}

bool Terminal::output(std::string_view text) {
    const platform::MutexLock lock(_mutex);
    if (_statusShown) {
        _write(STDERR_FILENO, kClearLine);
        _statusShown = false;
    }
    return _write(STDOUT_FILENO, text);
}

bool Terminal::_write(int file, std::string_view text) {
    while (!text.empty()) {
        const auto since = std::chrono::steady_clock::now();
        pollfd writable{file, POLLOUT, 0};
        while (!_isStalled && poll(&writable, 1, kStallCheck) == 0) {
            _isStalled = _isHurried && std::chrono::steady_clock::now() - since > kLongestStall;
        }
        if (_isStalled) {
            errno = ETIMEDOUT;
            return false;
        }
        // A pipe that can be written to takes this much without waiting.
        const std::string_view piece = text.substr(0, PIPE_BUF);
        if (!writeWhole(file, piece)) {
            return false;
        }
        text.remove_prefix(piece.size());
    }
    return true;
}

void Terminal::line(std::string_view text) {
    const platform::MutexLock lock(_mutex);
    std::string whole(_statusShown ? kClearLine : "");
    whole += text;
    whole += '\n';
    _statusShown = false;
    _write(STDERR_FILENO, whole);
}

void Terminal::leave(int status) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::milliseconds(500);
    bool held = _mutex.tryLock();
    while (!held && std::chrono::steady_clock::now() < deadline) {
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
        held = _mutex.tryLock();
    }
    if (_errorIsTerminal && !_isStalled) {
        writeWhole(STDERR_FILENO, kClearLine);
    }
    _exit(status);
}

void Terminal::status(std::string_view text) {
    const platform::MutexLock lock(_mutex);
    if (!_errorIsTerminal || (text.empty() && !_statusShown)) {
        return;
    }
    // One column stays free, because some terminals begin another line.
    const std::string_view shown = cutTo(text, widthOf(STDERR_FILENO) - 1);
    _write(STDERR_FILENO, std::string(kClearLine) + std::string(shown));
    _statusShown = !text.empty();
}

}  // namespace host
