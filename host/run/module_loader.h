// Loading of plug-in modules.
#ifndef ZR_HOST_RUN_MODULE_LOADER_H
#define ZR_HOST_RUN_MODULE_LOADER_H

#include <optional>
#include <string>

namespace host {

// Maps the module file at `path` into the process; its initializer registers what it offers with the
// lab. Returns nothing on success, else one line that says what is wrong: no such file, no module, or
// a module that registered nothing. A module stays mapped until the process ends; loading the same
// file again does nothing. One thread at a time.
std::optional<std::string> loadModule(const std::string& path);

}  // namespace host

#endif
