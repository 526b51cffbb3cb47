#include "host/results/statistics.h"

#include <cmath>

#include <gtest/gtest.h>

namespace {

// Figures of textbooks, or calculated by hand.
TEST(Statistics, WilsonInterval) {
    const struct {
        std::int64_t count, of;
        double low, high;
    } kCases[] = {
        {81, 263, 0.2553, 0.3662},  // Newcombe 1998, table I
        {15, 148, 0.0624, 0.1605}, {0, 20, 0.0, 0.1611},
        {1, 29, 0.0061, 0.1718},   {20, 20, 0.8389, 1.0},
    };
    for (const auto& [count, of, low, high] : kCases) {
        const auto share = host::shareOf(count, of);
        ASSERT_TRUE(share.has_value());
        EXPECT_NEAR(share->low, low, 5e-5) << count << " of " << of;
        EXPECT_NEAR(share->high, high, 5e-5) << count << " of " << of;
    }
    EXPECT_FALSE(host::shareOf(0, 0).has_value());
}

TEST(Statistics, FisherTest) {
    // The lady who tastes tea: 3 of 4 cups (Fisher 1935), 34/70 two-sided.
    EXPECT_NEAR(*host::fisherTest(3, 4, 1, 4), 34.0 / 70, 1e-9);
    EXPECT_NEAR(*host::fisherTest(1, 10, 11, 14), 0.0027594561852200836, 1e-9);
    EXPECT_NEAR(*host::fisherTest(5, 5, 7, 7), 1, 1e-9);
    EXPECT_LT(*host::fisherTest(900'000, 1'000'000, 910'000, 1'000'000), 1e-12);
    EXPECT_FALSE(host::fisherTest(0, 0, 1, 4).has_value());
}

TEST(Statistics, MomentsKeepDigitsBesideAGreatMean) {
    // 1e9 + {4, 7, 13, 16} around a middle that is 1 off: mean 1e9 + 10, variance 30.
    const host::Moments moments{4, 1e9 + 9, 4.0, 25 + 4 + 16 + 49};
    EXPECT_EQ(moments.mean(), 1e9 + 10);
    EXPECT_NEAR(moments.deviation(), std::sqrt(30.0), 1e-12);
    EXPECT_TRUE(std::isnan(host::Moments{}.mean()));
    EXPECT_TRUE(std::isnan((host::Moments{1, 5, 0, 0}).deviation()));
}

TEST(Statistics, CapabilityNeedsSpreadValuesAndBounds) {
    const host::Moments moments{50, 1.0, 0.0, 49.0};  // mean 1, deviation 1
    const auto both = host::capabilityOf(moments, -5, 4);
    EXPECT_DOUBLE_EQ(*both.cp, 1.5);
    EXPECT_DOUBLE_EQ(*both.cpk, 1.0);
    const auto one = host::capabilityOf(moments, -5, std::nullopt);
    EXPECT_FALSE(one.cp.has_value());
    EXPECT_DOUBLE_EQ(*one.cpk, 2.0);
    EXPECT_LT(*host::capabilityOf(moments, -5, 0.5).cpk, 0);
    EXPECT_FALSE(host::capabilityOf(moments, std::nullopt, std::nullopt).cpk.has_value());
    EXPECT_FALSE(host::capabilityOf({50, 0, 0, 0}, 0, 1).cpk.has_value());
    EXPECT_FALSE(host::capabilityOf({29, 1, 0, 28}, -5, 4).cp.has_value());
}

}  // namespace
