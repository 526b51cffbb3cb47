// Error objects, the slot through which an operation reports one, and the one way to fail.
//
// An operation that can fail returns false or nothing and, only when its caller passed a slot,
// stores a new error object there. Success leaves the slot alone, with one documented exception: the
// fault experiment's run(). Without a slot no error object is built and no message is formatted.
#ifndef ZR_PLATFORM_ERROR_H
#define ZR_PLATFORM_ERROR_H

#include <concepts>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/text_format.h"

namespace platform {

class Error;

// A shared, immutable error object; null means that there is no error.
using ErrorRef = std::shared_ptr<const Error>;

// Where an operation stores its error; null when the caller wants none.
using ErrorSlot = ErrorRef*;

// Error: what failed. Its user information has two entries: the localized description and, when a
// lower layer reported one, the underlying error. Immutable, so any thread may read it.
class Error {
  public:
    Error(std::string_view domain,
          std::int64_t code,
          std::string localizedDescription,
          ErrorRef underlyingError = nullptr);

    const std::string& domain() const { return _domain; }
    std::int64_t code() const { return _code; }
    const std::string& localizedDescription() const { return _localizedDescription; }
    const ErrorRef& underlyingError() const { return _underlyingError; }  // null when there is none

  private:
    std::string _domain;
    std::int64_t _code;
    std::string _localizedDescription;
    ErrorRef _underlyingError;
};

// The result of an operation that failed: converts to whatever the operation returns for failure.
struct [[nodiscard]] Failure {
    // To bool exactly: by way of a bool an optional number would hold a zero.
    template <std::same_as<bool> T>
    operator T() const {
        return false;
    }
    template <class T>
    operator std::shared_ptr<T>() const {
        return nullptr;
    }
    template <class T>
    operator std::optional<T>() const {
        return std::nullopt;
    }
};

// Fails with the given error, which is built only when there is a slot:
//     return fail(error, ZRErrorDomain, 6, nullptr, "Missing measurement for %@", name);
// `underlying` may be null.
template <class... Args>
Failure fail(ErrorSlot slot,
             std::string_view domain,
             std::int64_t code,
             const ErrorRef& underlying,
             FormatText<std::type_identity_t<Args>...> text,
             const Args&... args) {
    if (slot != nullptr) {
        *slot = std::make_shared<const Error>(domain, code, format(text, args...), underlying);
    }
    return {};
}

// Fails with an error that exists already, handed on unchanged; null leaves the slot alone.
inline Failure failWith(ErrorSlot slot, const ErrorRef& error) {
    if (slot != nullptr && error != nullptr) {
        *slot = error;
    }
    return {};
}

}  // namespace platform

#endif
