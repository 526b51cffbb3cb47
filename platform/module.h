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
// Throws a ModuleProblem when there is no such file, when it is not a regular file, when the system's
// loader refuses it (not a shared object, a symbol that nothing defines) and when an initializer throws. After the last
// the loader's lock stays held by this thread: end the process soon.
//
// Any thread, one at a time.
const void* loadModule(const std::string& path);

}  // namespace platform

#endif
