#include "input/nearest.h"

#include <string>
#include <vector>

#include <gtest/gtest.h>

namespace {

TEST(Nearest, FindsASlipAndNothingElse) {
    const std::vector<std::string> names = {"healthy", "counter-stuck", "run"};
    EXPECT_EQ(input::nearest("helthy", names), "healthy");
    EXPECT_EQ(input::nearest("HEALTHY", names), "healthy");
    EXPECT_EQ(input::nearest("counterstuck", names), "counter-stuck");
    EXPECT_EQ(input::nearest("rnu", names), "run");
    EXPECT_EQ(input::nearest("rn", names), "run");
    EXPECT_EQ(input::nearest("Cou", names), "counter-stuck");
    EXPECT_EQ(input::nearest("co", names), "");
    EXPECT_EQ(input::nearest("rxy", names), "");
    EXPECT_EQ(input::nearest("something", names), "");
    EXPECT_EQ(input::nearest("", names), "");
}

}  // namespace
