#include "host/run/run_recorder.h"

#include <latch>
#include <numeric>
#include <string>
#include <vector>

#include <gtest/gtest.h>

namespace {

using platform::Value;

observed::DeliveredFrame frameNumbered(std::uint64_t number, const Value& sensorNumber) {
    return {.number = number,
            .time = platform::MediaTime(),
            .delivered = std::chrono::steady_clock::now(),
            .metadata = {{"FrameNumber", sensorNumber}}};
}

TEST(RunRecorder, CountsFramesAndLossesWhetherItKeepsThemOrNot) {
    for (const bool keeps : {false, true}) {
        host::RunRecorder recorder([](const host::LogRecord&) {}, keeps);
        host::RunRecord run;
        std::uint64_t number = 0;
        const auto deliver = [&](const Value& sensorNumber) {
            recorder.frameDelivered(frameNumbered(++number, sensorNumber));
        };
        recorder.begin();
        deliver(1);
        deliver(4);
        recorder.takeFrames(run);
        EXPECT_EQ(run.framesLost, 2U);
        deliver("5");
        deliver(std::uint8_t{7});
        recorder.imageDelivered(1);
        recorder.end(run);
        EXPECT_EQ(run.framesDelivered, 4U);
        EXPECT_EQ(run.framesLost, 3U);
        EXPECT_EQ(run.imagesDelivered, 1U);
        ASSERT_EQ(run.frames.size(), keeps ? 4U : 0U);
        if (keeps) {
            EXPECT_EQ(run.frames[1].sensorNumber, 4);
            EXPECT_EQ(run.frames[2].sensorNumber, std::nullopt);
            EXPECT_EQ(run.frames[3].number, 4U);
        }
        recorder.begin();
        recorder.end(run = {});
        EXPECT_EQ(run.framesLost, std::nullopt);
    }
}

// Whoever takes the frames may have stopped: the device's thread goes on, and no frame is lost.
TEST(RunRecorder, HandsOnEveryFrameInItsOrderWithoutWaitingForItsReader) {
    constexpr std::uint64_t kFrames = 333;
    for (const bool stops : {false, true}) {
        std::latch goesOn(1);
        std::vector<std::uint64_t> numbers;
        host::RunRecorder recorder([](const host::LogRecord&) {}, false,
                                   [&](const host::FrameBatch& batch) {
                                       goesOn.wait();
                                       for (const host::FrameRecord& frame : batch.frames) {
                                           numbers.push_back(frame.number);
                                       }
                                   });
        if (!stops) {
            goesOn.count_down();
        }
        host::RunRecord run;
        recorder.begin();
        for (std::uint64_t number = 1; number <= kFrames; ++number) {
            recorder.frameDelivered(frameNumbered(number, number));
        }
        if (stops) {
            goesOn.count_down();
        }
        recorder.takeFrames(run);
        std::vector<std::uint64_t> expected(kFrames);
        std::iota(expected.begin(), expected.end(), 1);
        EXPECT_EQ(numbers, expected);
        EXPECT_EQ(run.framesDelivered, kFrames);
        EXPECT_TRUE(run.frames.empty());

        recorder.frameDelivered(frameNumbered(kFrames + 1, Value()));
        recorder.end(run);
        EXPECT_EQ(numbers.back(), kFrames + 1);
    }
}

// With details, the events and the metadata come with the frames that they stand among.
TEST(RunRecorder, HandsOnEventsAndMetadataWhenAsked) {
    std::vector<std::string> came;
    host::RunRecorder recorder(
        [](const host::LogRecord&) {}, false,
        [&](const host::FrameBatch& batch) {
            std::size_t event = 0;
            for (std::size_t at = 0; at <= batch.frames.size(); ++at) {
                for (; event < batch.events.size() && batch.events[event].framesBefore == at;
                     ++event) {
                    came.push_back("event " + std::to_string(batch.events[event].code));
                }
                if (at < batch.frames.size()) {
                    came.push_back("frame " + batch.metadata[at].number("FrameNumber").text());
                }
            }
        },
        true);
    std::vector<std::string> expected;
    recorder.begin();
    for (int number = 1; number <= 100; ++number) {
        if (number % 7 == 0) {
            recorder.eventDelivered({.code = number, .time = {}, .info = 0, .delivered = {}});
            expected.push_back("event " + std::to_string(number));
        }
        recorder.frameDelivered(frameNumbered(static_cast<std::uint64_t>(number), number));
        expected.push_back("frame " + std::to_string(number));
    }
    host::RunRecord run;
    recorder.end(run);
    EXPECT_EQ(came, expected);
}

}  // namespace
