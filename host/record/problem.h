// Problem: why the bench cannot go on, and the program's exit status for it.
//
// Everything in host/ reports in this one way that what was asked for cannot be done: because of the command
// line, a module, a device, a file. It is thrown where it is found and shown in one line by the program.
#ifndef ZR_HOST_RECORD_PROBLEM_H
#define ZR_HOST_RECORD_PROBLEM_H

#include <stdexcept>
#include <string>

namespace host {

// Exit statuses of the program.
inline constexpr int kExitPassed = 0;  // every verdict passed, or an experiment ran
inline constexpr int kExitFailed = 1;  // a verdict failed
inline constexpr int kExitError = 2;   // something did not complete
inline constexpr int kExitUsage = 64;  // the command line is wrong (EX_USAGE of sysexits.h)

class Problem : public std::runtime_error {
  public:
    // `text` is one line that names the culprit.
    Problem(int status, const std::string& text) : std::runtime_error(text), _status(status) {}

    int status() const { return _status; }

  private:
    int _status;
};

}  // namespace host

#endif
