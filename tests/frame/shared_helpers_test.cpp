#include "frame/shared_helpers.h"

#include <gmock/gmock.h>

#include "frame/host_interface.h"
#include "tests/support/is_error.h"

namespace {

using platform::Dictionary;
using platform::Error;

TEST(MakeError, HasTheFormattedDescriptionAndNothingElse) {
    EXPECT_THAT(ZRMakeError("domain", 213, "Frame %@ is dark", 7U),
                test::IsPlainError("domain", 213, "Frame 7 is dark"));
}

TEST(DictionaryRepresentation, FollowsTheWholeChain) {
    const auto root = std::make_shared<const Error>("root", 1, "the cause");
    const auto middle = std::make_shared<const Error>("middle", -2, "on the way", root);
    const Error top("top", 3, "what failed", middle);
    const Dictionary rootEntries{
        {"message", "the cause"}, {"code", std::int64_t{1}}, {"domain", "root"}};
    EXPECT_EQ(dictionaryRepresentation(top),
              (Dictionary{{"message", "what failed"},
                          {"code", std::int64_t{3}},
                          {"domain", "top"},
                          {"underlying-error", Dictionary{{"message", "on the way"},
                                                          {"code", std::int64_t{-2}},
                                                          {"domain", "middle"},
                                                          {"underlying-error", rootEntries}}}}));
}

TEST(AlphaNumeric, LettersMarksAndNumbersOfAllScripts) {
    for (const char* yes :
         {"", "abcXYZ019", "Größe", "données", "漢字", "٣", "e\u0301", "Ⅷ", "½", "𝒳"}) {
        EXPECT_TRUE(isAlphaNumeric(yes)) << yes;
    }
    for (const char* no : {"a b", "a-b", "a_b", "a.", "\n", "€", "—", "😀", "a\u00a0b"}) {
        EXPECT_FALSE(isAlphaNumeric(no)) << no;
    }
    // A lone continuation, a cut character, an overlong "A", a byte that UTF-8 never uses.
    for (const char* no : {"\x80", "a\xC3", "\xE6\xBC", "\xC1\x81", "\xFF", "\xE6\x41\x41"}) {
        EXPECT_FALSE(isAlphaNumeric(no));
    }
}

}  // namespace
