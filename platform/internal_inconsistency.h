// InternalInconsistency: thrown when the system finds itself in a state that should be impossible.
#ifndef ZR_PLATFORM_INTERNAL_INCONSISTENCY_H
#define ZR_PLATFORM_INTERNAL_INCONSISTENCY_H

#include <stdexcept>

namespace platform {

class InternalInconsistency : public std::logic_error {
  public:
    using std::logic_error::logic_error;
    // Out of line, so that one library holds the type information by which a catch finds it.
    ~InternalInconsistency() override;
};

}  // namespace platform

#endif
