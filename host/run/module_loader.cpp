#include "host/run/module_loader.h"

#include <filesystem>
#include <set>
#include <system_error>

#include <dlfcn.h>

#include "frame/host_interface.h"

namespace host {

namespace {

std::size_t registeredCount() {
    const ZRLab& lab = ZRLab::defaultLab();
    return lab.experimentNames().size() + lab.analysisNames().size() + lab.diagnostics().size() +
           lab.refusals().size();
}

}  // namespace

std::optional<std::string> loadModule(const std::string& path) {
    std::error_code noStatus;
    const auto status = std::filesystem::status(path, noStatus);
    if (!std::filesystem::exists(status)) {
        return "plug-in module " + path + ": no such file";
    }
    if (!std::filesystem::is_regular_file(status)) {
        return "plug-in module " + path + ": not a file";
    }
    // An absolute path keeps the loader from searching its own folders.
    const std::string absolute = std::filesystem::absolute(path).string();
    static std::set<void*>& loaded = *new std::set<void*>;  // of modules that registered something
    const std::size_t before = registeredCount();
    void* const module = dlopen(absolute.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (module == nullptr) {
        return "plug-in module " + path + ": cannot be loaded: " + dlerror();
    }
    if (registeredCount() != before) {
        loaded.insert(module);
    }
    return loaded.contains(module)
               ? std::nullopt
               : std::optional("plug-in module " + path + ": it registers nothing");
}

}  // namespace host
