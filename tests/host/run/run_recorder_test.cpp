#include "host/run/run_recorder.h"

#include <gtest/gtest.h>

namespace {

using platform::Value;

TEST(RunRecorder, CountsFramesAndLossesWhetherItKeepsThemOrNot) {
    for (const bool keeps : {false, true}) {
        host::RunRecorder recorder([](const host::LogRecord&) {}, keeps);
        host::RunRecord run;
        std::uint64_t number = 0;
        const auto deliver = [&](const Value& sensorNumber) {
            recorder.frameDelivered({.number = ++number,
                                     .time = platform::MediaTime(),
                                     .delivered = std::chrono::steady_clock::now(),
                                     .metadata = {{"FrameNumber", sensorNumber}}});
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

}  // namespace
