#include "host/run/module_loader.h"

#include <cstddef>
#include <set>

#include "frame/host_interface.h"
#include "host/record/problem.h"
#include "platform/module.h"

namespace host {

namespace {

std::size_t registeredCount() {
    const ZRLab& lab = ZRLab::defaultLab();
    return lab.experimentNames().size() + lab.analysisNames().size() + lab.diagnostics().size() +
           lab.refusals().size();
}

}  // namespace

void loadModule(const std::string& path) {
    const auto fail = [&path](const std::string& reason) {
        throw Problem(kExitError, "plug-in module " + path + ": " + reason);
    };
    static std::set<const void*>& loaded = *new std::set<const void*>;
    const std::size_t before = registeredCount();
    const void* module = nullptr;
    try {
        module = platform::loadModule(path);
    } catch (const platform::ModuleProblem& problem) {
        fail(problem.what());
    }
    if (loaded.insert(module).second && registeredCount() == before) {
        loaded.erase(module);
        fail("it registers nothing");
    }
}

}  // namespace host
