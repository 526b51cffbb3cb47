// Four helpers that stand outside any one experiment. All may be called on any thread.
#ifndef ZR_FRAME_SHARED_HELPERS_H
#define ZR_FRAME_SHARED_HELPERS_H

#include <string_view>

#include "platform/error.h"
#include "platform/log.h"
#include "platform/value.h"

// A new error whose only user information is the localized description: `text` with its placeholders
// filled.
template <class... Args>
platform::ErrorRef ZRMakeError(std::string_view domain,
                               std::int64_t code,
                               platform::FormatText<std::type_identity_t<Args>...> text,
                               const Args&... args) {
    return std::make_shared<const platform::Error>(domain, code, platform::format(text, args...));
}

// The error as a dictionary: "message" (string), "code" (signed integer), "domain" (string) and, when
// there is an underlying error, "underlying-error": its dictionary of the same form, and so on along
// the chain.
platform::Dictionary dictionaryRepresentation(const platform::Error& error);

// Whether every character of the UTF-8 `text` is a letter, a mark or a number (the general categories
// L, M and N of Unicode 14.0). True for the empty string; false for bytes that are not UTF-8.
bool isAlphaNumeric(std::string_view text);

// The plug-in's one log handle: category "zerith". Made by the first call, the same on every thread,
// and alive until the process ends.
const platform::Log& ZRLogHandle();

#endif
