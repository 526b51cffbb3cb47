#include "host/record/frame_gap.h"

#include <limits>
#include <optional>
#include <vector>

#include <gtest/gtest.h>

namespace {

using Numbers = std::vector<std::optional<std::int64_t>>;

TEST(LostFrames, AreWhatTheSensorsNumbersSkip) {
    constexpr std::int64_t kLast = std::numeric_limits<std::int64_t>::max();
    const struct {
        Numbers numbers;
        std::optional<std::uint64_t> lost;
    } kCases[] = {
        {{}, std::nullopt},
        {{std::nullopt, std::nullopt}, std::nullopt},
        {{7, 8, 9}, 0},  // what was before the first is not known
        {{1, 3, 4, 8}, 4},
        {{5, 5, 3, 4, 6}, 1},          // only behind the 4
        {{1, std::nullopt, 3}, 0},     // the frame without a number is the second
        {{1, std::nullopt, 5, 7}, 3},  // that one is not counted twice
        {{9, std::nullopt, 1, 2}, 0},  // the sensor began anew
        {{kLast, -kLast, kLast - 1, kLast}, static_cast<std::uint64_t>(kLast) * 2 - 2},
    };
    for (const auto& [numbers, lost] : kCases) {
        host::LostFrames frames;
        for (const auto& number : numbers) {
            frames.before(number);
        }
        EXPECT_EQ(frames.count(), lost) << testing::PrintToString(numbers);
    }
}

TEST(LostFrames, AGapLiesBetweenFramesThatHaveNumbers) {
    std::vector<host::FrameRecord> frames;
    for (const auto& number : Numbers{4, 5, std::nullopt, 9, 10}) {
        frames.push_back({frames.size() + 1, number, 0, 0, {}, {}});
    }
    const std::vector<host::FrameGap> gaps = host::gapsIn(frames);
    ASSERT_EQ(gaps.size(), 1U);
    EXPECT_EQ(host::gapText(gaps.front()),
              "2 frames lost between the received frames 2 and 4 (the sensor's 5 and 9)");
}

}  // namespace
