#include "platform/error.h"

#include <gmock/gmock.h>

#include "tests/support/is_error.h"

namespace {

using platform::ErrorRef;
using test::IsError;
using test::IsPlainError;

// An object that counts how often its text was asked for.
struct Counted {
    int& texts;
    std::string text() const { return "text " + std::to_string(++texts); }
};

TEST(Error, IsStoredOnlyInASlotAndFormattedOnlyForOne) {
    int texts = 0;
    EXPECT_FALSE(platform::fail(nullptr, "domain", 1, nullptr, "%@", Counted{texts}));
    EXPECT_EQ(texts, 0);

    ErrorRef first;
    EXPECT_FALSE(platform::fail(&first, "domain", 1, nullptr, "%@ of %lu", Counted{texts}, 2U));
    EXPECT_THAT(first, IsPlainError("domain", 1, "text 1 of 2"));

    ErrorRef second;
    EXPECT_FALSE(platform::fail(&second, "other", -7, first, "Failed."));
    EXPECT_THAT(second, IsError("other", -7, "Failed.", first));

    EXPECT_FALSE(platform::failWith(nullptr, first));
    EXPECT_FALSE(platform::failWith(&second, first));
    EXPECT_FALSE(platform::failWith(&second, nullptr));
    EXPECT_EQ(second, first);
}

}  // namespace
