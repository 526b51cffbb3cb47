// Terminal: the one place through which the program writes to standard output and standard error.
//
// Standard output carries the report and nothing else; standard error carries log lines, problems and
// progress. A write is whole: an interrupt waits for the one in progress before it ends the program,
// so no line and no file is cut.
#ifndef ZR_HOST_ZRLAB_TERMINAL_H
#define ZR_HOST_ZRLAB_TERMINAL_H

#include <atomic>
#include <string>
#include <string_view>

#include "platform/sync.h"

namespace host {

// Writes all of the text to an open file; false when that fails, with errno set.
bool writeWhole(int file, std::string_view text);

enum class Colour { Automatic, Always, Never };

class Terminal {
  public:
    // The program's terminal; lives until the process ends.
    static Terminal& shared();

    // Reports a problem in one line on standard error: "zrlab: …".
    void complain(std::string_view problem);

    // Whether standard output takes colour: as asked; Automatic means on a terminal, unless the
    // environment has a NO_COLOR that is not empty or TERM is "dumb".
    static bool outputTakesColour(Colour asked);
    // The same of standard error.
    static bool errorTakesColour(Colour asked);

    // Whether standard error is a terminal that can take a status line.
    bool progressIsTerminal() const { return _errorIsTerminal; }

    // Writes to standard output, whole. False when it cannot be written (the reader has gone).
    bool output(std::string_view text);
    // Writes one line to standard error, above the status line.
    void line(std::string_view text);
    // Shows a status line on standard error, in place of the one before and cut to the terminal's
    // width; only on a terminal. Empty text takes it away.
    void status(std::string_view text);

    // The program is to stop: from now on a write fails when its reader takes nothing for a second, and so
    // does every later one. Any thread, without waiting.
    void hurry() { _isHurried = true; }

    // Ends the program with this exit status, from any thread, without destroying anything. Waits a moment
    // for a write in progress; one whose reader has stalled is cut.
    [[noreturn]] void leave(int status);

    // Held while something is written that an interrupt must not cut.
    platform::Mutex& mutex() ZR_RETURNS_MUTEX(_mutex) { return _mutex; }

  private:
    Terminal();

    bool _write(int file, std::string_view text) ZR_REQUIRES(_mutex);

    const bool _errorIsTerminal;
    std::atomic<bool> _isHurried{false};
    std::atomic<bool> _isStalled{false};
    platform::Mutex _mutex;
    bool _statusShown ZR_GUARDED_BY(_mutex) = false;
};

}  // namespace host

#endif
