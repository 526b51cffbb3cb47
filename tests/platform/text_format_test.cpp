#include "platform/text_format.h"

#include <cmath>
#include <limits>

#include <gtest/gtest.h>

namespace {

using platform::format;
using platform::Number;

TEST(TextFormat, FillsEachPlaceholder) {
    constexpr double kNan = std::numeric_limits<double>::quiet_NaN();
    constexpr double kInfinity = std::numeric_limits<double>::infinity();
    const std::string text = "a text";
    const char* const kNoText = nullptr;
    const struct {
        std::string made;
        std::string expected;
    } rows[] = {
        {format(""), ""},
        {format("%%d %d%%", 5), "%d 5%"},
        {format("[%@|%@|%@]", text, "literal", std::string_view("view")), "[a text|literal|view]"},
        {format("%@", "%d is not read again"), "%d is not read again"},
        {format("%@ %@ %@", Number(), Number(true), Number(2.5F)), "(null) 1 2.5"},
        {format("%@ %@", 7, 0.1), "7 0.1"},
        {format("%@ %@ %@", kNoText, nullptr, kNan), "(null) (null) nan"},
        {format("%d", std::numeric_limits<std::int64_t>::min()), "-9223372036854775808"},
        {format("%d", std::int8_t{-7}), "-7"},
        {format("%lu", std::numeric_limits<std::uint64_t>::max()), "18446744073709551615"},
        {format("%lf %lf", 1.0 / 3, -2.5F), "0.333333 -2.500000"},
        {format("%lf %lf %lf %lf", kNan, -kNan, kInfinity, -kInfinity), "nan nan inf -inf"},
        {format("%lf %@", std::copysign(std::numeric_limits<float>::quiet_NaN(), -1.0F), -kNan),
         "nan nan"},
        {format("%d alone", 1, "ignored", 2.0), "1 alone"},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(row.made, row.expected);
    }
    EXPECT_EQ(format("%lf", std::numeric_limits<double>::lowest()).size(), 1 + 309 + 7U);
}

}  // namespace
