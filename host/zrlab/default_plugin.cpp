#include "host/zrlab/default_plugin.h"

#include <filesystem>
#include <system_error>

namespace host {

std::string defaultPlugin() {
    std::error_code none;
    const auto folder = std::filesystem::read_symlink("/proc/self/exe", none).parent_path();
    const auto beside = folder / "zr_plugin.so";
    return std::filesystem::exists(beside, none)
               ? beside.string()
               : (folder / ZR_INSTALLED_PLUGIN).lexically_normal().string();
}

}  // namespace host
