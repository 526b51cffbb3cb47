// What a call to the system, or a look for something of the machine, failed with.
#ifndef ZR_DEVICES_LINUX_SYSTEM_PROBLEM_H
#define ZR_DEVICES_LINUX_SYSTEM_PROBLEM_H

#include <cerrno>
#include <stdexcept>
#include <string>
#include <utility>

#include "platform/error.h"

namespace linux_device {

// The domain of the errors of this kind of device. Their code is the errno of the call, or the nearest one when
// no call failed; their text names the node or the file.
inline constexpr std::string_view kLinuxErrorDomain = "linux";

// Inside the device. The operations of its interfaces do not throw it: see attempt().
class SystemProblem : public std::runtime_error {
  public:
    SystemProblem(const std::string& text, int code) : std::runtime_error(text), _code(code) {}
    int code() const { return _code; }

  private:
    int _code;
};

// "WHAT: Input/output error (EIO)".
std::string errorText(const std::string& what, int code);

// Throws that text.
[[noreturn]] void failWithErrno(const std::string& what, int code = errno);

// The error object of a problem.
platform::ErrorRef errorOf(const SystemProblem& problem);

// What `call` returns; when it throws a SystemProblem, a failure with its error.
template <class Call>
auto attempt(platform::ErrorSlot error, const Call& call) -> decltype(call()) {
    try {
        return call();
    } catch (const SystemProblem& problem) {
        return platform::failWith(error, errorOf(problem));
    }
}

}  // namespace linux_device

#endif
