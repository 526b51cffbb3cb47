#include "platform/error.h"

#include <utility>

namespace platform {

Error::Error(std::string_view domain,
             std::int64_t code,
             std::string localizedDescription,
             ErrorRef underlyingError)
    : _domain(domain)
    , _code(code)
    , _localizedDescription(std::move(localizedDescription))
    , _underlyingError(std::move(underlyingError)) {}

}  // namespace platform
