#include "platform/module.h"

#include <exception>
#include <filesystem>
#include <system_error>

#include <dlfcn.h>

namespace platform {

const void* loadModule(const std::string& path) {
    std::error_code noStatus;
    const auto status = std::filesystem::status(path, noStatus);
    if (!std::filesystem::exists(status)) {
        throw ModuleProblem("no such file");
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
        throw ModuleProblem(std::string("cannot be loaded: ") + dlerror());
    }
    return module;
}

}  // namespace platform
