// Loading of shared objects whose initializers register what they offer.
#ifndef ZR_PLATFORM_MODULE_H
#define ZR_PLATFORM_MODULE_H

#include <stdexcept>
#include <string>

namespace platform {

// Why a file could not be loaded: one line without the file's name.
class ModuleProblem : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

// Maps the module file at `path` into the process; its initializers have run when this returns. Returns
// a handle that is the same for every load of the same file. A module stays mapped until the process
// ends: what it registered may be called at any time.
//
// Throws a ModuleProblem when the file cannot be found, is not a regular file or is refused by the
// loader, or when an initializer throws. In the last case this thread keeps the loader's lock: end the
// process soon.
//
// Any thread, one at a time.
const void* loadModule(const std::string& path);

}  // namespace platform

#endif
