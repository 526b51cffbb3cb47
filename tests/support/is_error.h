// Matchers for error objects, used by every test that looks at one.
#ifndef ZR_TESTS_SUPPORT_IS_ERROR_H
#define ZR_TESTS_SUPPORT_IS_ERROR_H

#include <string>

#include <gmock/gmock.h>

#include "platform/error.h"

namespace test {

// An error with exactly this domain, code and description, and this underlying error (the same
// object; null for none).
MATCHER_P4(IsError, domain, code, text, underlying, "") {
    if (arg == nullptr) {
        *result_listener << "there is no error";
        return false;
    }
    *result_listener << arg->domain() << ' ' << arg->code() << " \"" << arg->localizedDescription()
                     << "\" underlying " << (arg->underlyingError() ? "set" : "none");
    return arg->domain() == domain && arg->code() == code && arg->localizedDescription() == text &&
           arg->underlyingError() == platform::ErrorRef(underlying);
}

// The same without an underlying error.
MATCHER_P3(IsPlainError, domain, code, text, "") {
    return ::testing::ExplainMatchResult(
        IsError(domain, code, std::string(text), platform::ErrorRef()), arg, result_listener);
}

}  // namespace test

#endif
