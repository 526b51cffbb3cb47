#include "devices/linux/system_problem.h"

#include <cstring>
#include <memory>

namespace linux_device {

std::string errorText(const std::string& what, int code) {
    const char* description = strerrordesc_np(code);
    const char* name = strerrorname_np(code);
    return what + ": " +
           (description != nullptr && name != nullptr ? std::string(description) + " (" + name + ")"
                                                      : "error " + std::to_string(code));
}

void failWithErrno(const std::string& what, int code) {
    throw SystemProblem(errorText(what, code), code);
}

platform::ErrorRef errorOf(const SystemProblem& problem) {
    return std::make_shared<const platform::Error>(kLinuxErrorDomain, problem.code(),
                                                   problem.what());
}

}  // namespace linux_device
