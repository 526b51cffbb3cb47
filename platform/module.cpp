#include "platform/module.h"

#include <exception>
#include <filesystem>
#include <string_view>
#include <system_error>

#include <dlfcn.h>

namespace platform {

const void* loadModule(const std::string& path) {
    std::error_code failure;
    const auto status = std::filesystem::status(path, failure);
    if (status.type() == std::filesystem::file_type::not_found) {
        throw ModuleProblem("no such file");
    }
    if (failure) {
        throw ModuleProblem(failure.message());
    }
    if (!std::filesystem::is_regular_file(status)) {
        throw ModuleProblem("not a file");
    }
    // An absolute path keeps the loader from searching its own folders.
    const std::string absolute = std::filesystem::absolute(path).string();
    // Through a pointer that the compiler cannot follow: the declaration of dlopen() promises not to
    // throw, and an exception of an initializer would end the process.
    void* (*volatile const open)(const char*, int) = dlopen;
    const void* module = nullptr;
    try {
        module = open(absolute.c_str(), RTLD_NOW | RTLD_LOCAL | RTLD_NODELETE);
    } catch (const std::exception& exception) {
        throw ModuleProblem(std::string("its initializer failed: ") + exception.what());
    } catch (...) {
        throw ModuleProblem("its initializer failed with an exception of an unknown kind");
    }
    if (module == nullptr) {
        std::string_view reason = dlerror();
        if (const std::string prefix = absolute + ": "; reason.starts_with(prefix)) {
            reason.remove_prefix(prefix.size());
        }
        throw ModuleProblem("cannot be loaded: " + std::string(reason));
    }
    return module;
}

}  // namespace platform
