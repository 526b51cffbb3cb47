#include "host/store/engine.h"

#include <filesystem>
#include <string_view>
#include <system_error>

#include <dlfcn.h>

#include <fmt/format.h>

#include "host/record/mask_passwords.h"
#include "host/record/problem.h"
#include "platform/module.h"

namespace host {

namespace {

constexpr std::string_view kServerSchemes[] = {"postgresql://", "postgres://"};

bool isServer(std::string_view address) {
    return address.starts_with(kServerSchemes[0]) || address.starts_with(kServerSchemes[1]);
}

std::filesystem::path moduleFile(std::string_view engine) {
    std::error_code none;
    const auto folder = std::filesystem::read_symlink("/proc/self/exe", none).parent_path();
    const std::string name = fmt::format("zr_store_{}.so", engine);
    const auto beside = folder / name;
    return std::filesystem::exists(beside, none)
               ? beside
               : (folder / ZR_INSTALLED_ENGINES / name).lexically_normal();
}

const Engine& loadEngine(std::string_view name, const std::string& address) {
    const std::string file = moduleFile(name).string();
    const auto fail = [&](const std::string& reason) {
        throw Problem(kExitError,
                      fmt::format("store {}: {}: {}", maskPasswords(address), file, reason));
    };
    if (std::error_code none; !std::filesystem::exists(file, none)) {
        throw Problem(kExitUsage,
                      fmt::format("store {}: no engine for it is installed: there is no {}",
                                  maskPasswords(address), file));
    }
    const void* module = nullptr;
    try {
        module = platform::loadModule(file);
    } catch (const platform::ModuleProblem& problem) {
        fail(problem.what());
    }
    const auto* engine =
        static_cast<const Engine*>(dlsym(const_cast<void*>(module), kEngineSymbol));
    if (engine == nullptr) {
        fail("it is not the engine of a store");
    }
    if (engine->version != kEngineVersion) {
        fail(fmt::format("it is built for version {} of the engines' interface, this is version {}",
                         engine->version, kEngineVersion));
    }
    return *engine;
}

}  // namespace

std::unique_ptr<Database> openDatabase(const std::string& address, Access access) {
    if (address.empty()) {
        throw Problem(kExitUsage, "store: the address is empty");
    }
    if (!isServer(address) && address.find("://") != std::string::npos) {
        throw Problem(
            kExitUsage,
            fmt::format("store {}: unknown kind; it is a file or postgresql://HOST/DATABASE",
                        maskPasswords(address)));
    }
    const Engine& engine = loadEngine(isServer(address) ? "postgres" : "sqlite", address);
    try {
        return engine.open(address, access);
    } catch (const std::exception& exception) {
        throw Problem(kExitUsage,
                      fmt::format("store {}: {}", maskPasswords(address), exception.what()));
    }
}

}  // namespace host
