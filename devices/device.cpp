#include "devices/device.h"

#include <algorithm>
#include <cctype>
#include <set>
#include <stdexcept>

#include "platform/module.h"
#include "platform/sync.h"

namespace devices {

namespace {

// Never destroyed: a module's initializer may come first, an item may ask while the process exits.
struct Registry {
    platform::Mutex mutex;
    std::vector<Kind> kinds ZR_GUARDED_BY(mutex);
    std::vector<std::string> refusals ZR_GUARDED_BY(mutex);
};

Registry& registry() {
    static Registry& shared = *new Registry;
    return shared;
}

bool isWellFormed(std::string_view name) {
    return !name.empty() && std::islower(static_cast<unsigned char>(name.front())) != 0 &&
           std::all_of(name.begin(), name.end(), [](unsigned char c) {
               return std::islower(c) != 0 || std::isdigit(c) != 0 || c == '-';
           });
}

// Why the kind cannot be registered; empty when it can.
std::string problemWith(const Kind& kind, const std::vector<Kind>& known) {
    if (!isWellFormed(kind.name)) {
        return "the kind name \"" + kind.name + "\" is not a letter followed by a-z, 0-9 and -";
    }
    if (!kind.open) {
        return "the kind \"" + kind.name + "\" cannot open a device";
    }
    const bool isTaken = std::any_of(known.begin(), known.end(),
                                     [&](const Kind& other) { return other.name == kind.name; });
    return isTaken ? "the kind \"" + kind.name + "\" is registered already" : "";
}

}  // namespace

void detail::registerKind(int interfaceVersion, const Kind& kind) {
    Registry& shared = registry();
    const platform::MutexLock lock(shared.mutex);
    std::string problem = interfaceVersion != kInterfaceVersion
                              ? "it is built for version " + std::to_string(interfaceVersion) +
                                    " of the device interface, this is version " +
                                    std::to_string(kInterfaceVersion)
                              : problemWith(kind, shared.kinds);
    if (problem.empty()) {
        shared.kinds.push_back(kind);
    } else {
        shared.refusals.push_back(std::move(problem));
    }
}

std::vector<Kind> kinds() {
    Registry& shared = registry();
    const platform::MutexLock lock(shared.mutex);
    return shared.kinds;
}

std::vector<std::string> refusals() {
    Registry& shared = registry();
    const platform::MutexLock lock(shared.mutex);
    return shared.refusals;
}

void loadDeviceModule(const std::string& path) {
    static std::set<const void*>& loaded = *new std::set<const void*>;
    const auto fail = [&path](const std::string& reason) {
        throw std::runtime_error("device module " + path + ": " + reason);
    };
    const std::size_t kindsBefore = kinds().size();
    const std::size_t refusalsBefore = refusals().size();
    const void* module = nullptr;
    try {
        module = platform::loadModule(path);
    } catch (const platform::ModuleProblem& problem) {
        fail(problem.what());
    }
    if (loaded.contains(module)) {
        return;
    }
    const std::vector<std::string> refused = refusals();
    if (refused.size() > refusalsBefore) {
        fail(refused[refusalsBefore]);
    }
    if (kinds().size() == kindsBefore) {
        fail("it registers no kind of device");
    }
    loaded.insert(module);
}

}  // namespace devices
