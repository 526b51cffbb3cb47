#include <chrono>
#include <cmath>
#include <limits>

#include <gtest/gtest.h>

#include "platform/deadline.h"
#include "platform/media_time.h"
#include "platform/wall_clock.h"

namespace {

using platform::Date;
using platform::MediaTime;

TEST(MediaTime, SecondsAreARatioUnlessAFlagSaysOtherwise) {
    constexpr double kNan = std::numeric_limits<double>::quiet_NaN();
    constexpr double kInfinity = std::numeric_limits<double>::infinity();
    // The flags as bits: capture services send them so.
    EXPECT_EQ(MediaTime::kHasBeenRounded, 2U);
    EXPECT_EQ(MediaTime().epoch, 0);
    const struct {
        MediaTime time;
        double seconds;
    } rows[] = {
        {{}, 0.0},
        {{1001, 30000}, 1001.0 / 30000},
        {{7}, 7.0},
        {{-1, 4, 1, 9}, -0.25},
        {{1, 3, 1 | 2}, 1.0 / 3},
        {{std::numeric_limits<std::int64_t>::max(), 1}, 0x1p63},
        {{1, 2, 0}, kNan},
        {{1, 2, 4}, kNan},
        {{1, 2, 1 | 16}, kNan},
        {{1, 2, 1 | 16 | 4}, kNan},
        {{1, 2, 1 | 4}, kInfinity},
        {{1, 2, 1 | 8}, -kInfinity},
        {{1, 0}, kInfinity},
        {{-1, 0}, -kInfinity},
        {{0, 0}, kNan},
    };
    for (const auto& row : rows) {
        const double seconds = row.time.seconds();
        EXPECT_TRUE(seconds == row.seconds || (std::isnan(seconds) && std::isnan(row.seconds)))
            << row.time.value << '/' << row.time.timescale << " flags " << row.time.flags << ": "
            << seconds;
    }
}

TEST(Date, TextsAreInUtc) {
    using std::chrono::milliseconds;
    const struct {
        std::int64_t sinceEpoch;
        const char* text;
        const char* timestamp;
    } rows[] = {
        {0, "1970-01-01 00:00:00 +0000", "1970-01-01T00:00:00.000Z"},
        {-1, "1969-12-31 23:59:59 +0000", "1969-12-31T23:59:59.999Z"},
        {951868799'999, "2000-02-29 23:59:59 +0000", "2000-02-29T23:59:59.999Z"},
        {1795541647'125, "2026-11-24 17:34:07 +0000", "2026-11-24T17:34:07.125Z"},
    };
    for (const auto& row : rows) {
        const Date date{std::chrono::system_clock::time_point(milliseconds(row.sinceEpoch))};
        EXPECT_EQ(date.text(), row.text);
        EXPECT_EQ(date.timestamp(), row.timestamp);
    }
}

TEST(Deadline, BeyondTheClocksEndIsTheClocksLastTimePoint) {
    using std::chrono::nanoseconds;
    using Clock = std::chrono::steady_clock;
    using Seconds = std::chrono::duration<double>;
    constexpr auto kNever = Clock::time_point::max();
    const auto before = Clock::now();
    EXPECT_EQ(platform::deadlineAfter(nanoseconds::max()), kNever);
    // Beyond by more than a double of so many seconds can resolve.
    EXPECT_EQ(platform::deadlineAfter(kNever - before + std::chrono::milliseconds(1)), kNever);
    EXPECT_EQ(platform::deadlineAfter(Seconds(1e300)), kNever);
    EXPECT_EQ(platform::deadlineAfter(Seconds(HUGE_VAL)), kNever);
    EXPECT_LT(platform::deadlineAfter(nanoseconds::min()), before);
    EXPECT_LT(platform::deadlineAfter(Seconds(-HUGE_VAL)), before);
    EXPECT_GE(platform::deadlineAfter(Seconds(3600.5)),
              before + std::chrono::milliseconds(3600500));
    const auto now = platform::deadlineAfter(Seconds(std::nan("")));
    EXPECT_GE(now, before);
    EXPECT_LE(now, Clock::now());
}

}  // namespace
