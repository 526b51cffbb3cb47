// Loading of plug-in modules.
#ifndef ZR_HOST_RUN_MODULE_LOADER_H
#define ZR_HOST_RUN_MODULE_LOADER_H

#include <string>

namespace host {

// Maps the module file at `path` into the process; its initializer registers what it offers with the
// lab. Throws a Problem (kExitError) when it cannot be loaded (platform/module.h says why) or registers
// nothing. A module stays mapped until the process ends; loading the same file again does nothing. One
// thread at a time.
void loadModule(const std::string& path);

}  // namespace host

#endif
