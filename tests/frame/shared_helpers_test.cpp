#include "frame/shared_helpers.h"

#include <string_view>
#include <vector>

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
         {"", "abcXYZ019", "Größe", "données", "漢字", "٣", "e\u0301", "Ⅷ", "½", "𝒳", "\u0800",
          "\U00010000"}) {  // the first of three bytes, and of four
        EXPECT_TRUE(isAlphaNumeric(yes)) << yes;
    }
    for (const char* no : {"a b", "a-b", "a_b", "a.", "\n", "€", "—", "😀", "a\u00a0b"}) {
        EXPECT_FALSE(isAlphaNumeric(no)) << no;
    }
    // A lone continuation, cut characters, an overlong "A", a byte that UTF-8 never uses. Nothing behind the
    // text is read.
    for (const std::string_view no :
         {"\x80", "a\xC3", "\xE6\xBC", "\xC1\x81", "\xFF", "\xE6\x41\x41"}) {
        const std::vector<char> bytes(no.begin(), no.end());
        EXPECT_FALSE(isAlphaNumeric({bytes.data(), bytes.size()}));
    }
}

}  // namespace
