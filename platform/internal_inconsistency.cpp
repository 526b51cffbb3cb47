#include "platform/internal_inconsistency.h"

namespace platform {

InternalInconsistency::~InternalInconsistency() = default;

}  // namespace platform
