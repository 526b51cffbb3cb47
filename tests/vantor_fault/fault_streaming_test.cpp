// What ends a run, and what comes out of it.
#include <cmath>

#include "tests/vantor_fault/fault_bench.h"
#include "vantor_counters/expected_channels.h"
#include "vantor_fault/frame_description.h"

namespace {

using platform::Dictionary;
using platform::LogLevel;
using simulator::Fault;
using test::FaultTest;
using test::IsPlainError;
using test::kLate;
using ::testing::ElementsAre;
using ::testing::StartsWith;

constexpr std::string_view kTimeoutLine = "Timeout has been reached.";

double value(const ZRExperimentResultRef& result, std::string_view name) {
    const MeasurementRef* measurement = result->measurements().find(name);
    return measurement != nullptr ? (*measurement)->doubleValue() : std::nan("");
}

class FaultStreaming : public FaultTest {};

TEST_F(FaultStreaming, EndsAsItsFramesAndItsStopDecide) {
    constexpr auto kLight = kRylCaptureStreamMetadata_InfraredLightSource;
    const struct {
        std::string_view name;
        std::function<void()> prepare;
        double frameCount;
        int code;  // of the error; 0: a result
        std::string_view text;
    } kCases[] = {
        {"no frame asked for", [] {}, 0, 0, ""},
        {"a light source read as 32 bits",
         [&] { at(1).set.set(kLight, (std::int64_t{1} << 32) + 2); }, 2, 0, ""},
        {"dropped frames have no ordinal",
         [&] {
             at(1).dropped = true;
             at(2).set.set(kLight, 0);
         },
         9, 206, "Frame 1 is not illuminated for unknown reason!"},
        {"unlit, and the device says that it is for safety",
         [&] {
             at(1).set.set(kLight, 0);
             at(1).set.set("HardwareEvents", 0x2000);
         },
         9, 213, "Frame 1 is not illuminated for safety reason!"},
        {"does not stop after an unlit frame",
         [&] {
             at(1).set.set(kLight, 0);
             camera().stop = Fault::failing(test::serviceError("stuck"));
         },
         1, 206, "Frame 1 is not illuminated for unknown reason!"},
        {"neither stops nor counts",
         [&] {
             camera().stop = Fault::failing(nullptr);
             camera().errorCounters = {};
         },
         1, 205, "Failed to stop stream!"},
    };
    const auto healthy = capture;
    for (const auto& [name, prepare, frameCount, code, text] : kCases) {
        SCOPED_TRACE(name);
        capture = healthy;
        prepare();
        error = nullptr;
        const auto result = run(frameCount, kLate);
        if (code == 0) {
            ASSERT_NE(result, nullptr);
            EXPECT_EQ(error, nullptr);
            EXPECT_GE(value(result, "FrameCount"), std::max(frameCount, 1.0));
        } else {
            EXPECT_EQ(result, nullptr);
            EXPECT_THAT(error, IsPlainError(ZRCapturePlugInErrorDomain, code, text));
        }
    }
    EXPECT_EQ(log->count(LogLevel::Debug, "There was an error stopping the stream."), 1U);
}

TEST_F(FaultStreaming, MeasuresFramesErrorsAndTheRiseOfTheCounters) {
    camera().stallAfterFrame = 3;
    camera().errorCounters = Dictionary{{kRylCaptureStreamPropertyValue_I2CErrorCount, 1},
                                        {kRylCaptureStreamPropertyValue_MIPIErrorCount, 2.0},
                                        {"LPDPErrorCount", true},
                                        {"UARTErrorCount", std::uint8_t{4}},
                                        {"ProjectorErrorCount", 6},
                                        {"OtherErrorCount", 7}};
    constexpr auto kEvents = "Q71ISP Events";
    meterix.channels = {{"Q71ISP", kEvents, "Rising", 5, 0, 2, 40},
                        {"Other group", kEvents, "Still", 9},
                        {"Q71ISP", kEvents, "Countless", std::nullopt},
                        {"Q71ISP", kEvents, "UART", 0, 0, 1, 77},
                        {"Q71ISP", "Q71ISP Events 2", "Another subgroup", 1}};
    const auto result = run(3, kLate);
    ASSERT_NE(result, nullptr);
    const std::pair<std::string_view, double> kExpected[] = {
        {"FrameCount", 3}, {"I2C", 1},       {"MIPI", 2},    {"LPDP", 1},  {"UART", 77},
        {"SIF", 0},        {"Projector", 6}, {"Rising", 40}, {"Still", 0}, {"Countless", 0}};
    EXPECT_EQ(result->measurements().size(), std::size(kExpected));
    for (const auto& [name, expected] : kExpected) {
        EXPECT_EQ(value(result, name), expected) << name;
    }
    const auto unit = [&](auto name) { return &(*result->measurements().find(name))->unit(); };
    EXPECT_EQ(unit("FrameCount"), &ZRDimensionlessUnit::frames());
    EXPECT_EQ(unit("SIF"), &ZRDimensionlessUnit::errors());
    EXPECT_EQ(unit("UART"), &ZRDimensionlessUnit::events());
    EXPECT_TRUE(result->auxiliaryData().empty());
}

// The device resets its counters when it stops; receipt must not wait behind validation.
TEST_F(FaultStreaming, ReadsTheErrorCountersBeforeItStopsAndReceivesBeforeItValidates) {
    const auto stream = std::make_shared<test::HandFedStream>();
    install({stream});
    const auto experiment = make(1, 3600);
    stream->onStart = [&] { frameHandler (*experiment)(buffer(), {}); };
    EXPECT_NE(experiment->run(nullptr), nullptr);
    ASSERT_GE(stream->asked.size(), 2U);
    EXPECT_EQ(*(stream->asked.end() - 2), kRylCaptureStreamProperty_ErrorCounters);
    EXPECT_EQ(stream->asked.back(), "stop");
    EXPECT_LT(log->threadOf("Received frame 1.").nice, 10);
    EXPECT_GE(log->threadOf("Processing frame 1.").nice, 10);
    // The ends of the queues' labels.
    EXPECT_EQ(log->threadOf("Received frame 1.").name, "t.primaryScalar");
    EXPECT_EQ(log->threadOf("Processing frame 1.").name, "FaultExperiment");
    EXPECT_EQ(log->count(LogLevel::Debug, "Frame 1 is the last frame."), 1U);
}

TEST_F(FaultStreaming, LogsEachStepOfAFrameThatFailed) {
    camera().stallAfterFrame = 2;
    at(2).set.set(kRylCaptureStreamMetadata_InfraredLightSource, 0);
    camera().events = {{.frame = 1, .code = -4, .info = 99}};
    EXPECT_EQ(run(2, kLate), nullptr);
    EXPECT_EQ(log->count(LogLevel::Error, "Frame 2 failed projection validation."), 1U);
    auto lines = log->messages(LogLevel::Debug);
    // The two queues log side by side; each keeps its own order.
    const auto belongs = [](const std::string& line) {
        return line.starts_with("Received") || line.starts_with("Processing event");
    };
    const auto split = std::stable_partition(lines.begin(), lines.end(), belongs);
    EXPECT_THAT(
        std::vector<std::string>(lines.begin(), split),
        ElementsAre("Processing event -4 at 0.033333.", "Received frame 1.", "Received frame 2."));
    EXPECT_THAT(
        std::vector<std::string>(split, lines.end()),
        ElementsAre("Processing frame 1.", "Processing frame 2.",
                    StartsWith(ZRVantorFrameDescription::csvRepresentationHeader() + "\n2,"),
                    "We are stopping because there was an error. If stopping the stream "
                    "fails, it will be ignored."));
}

TEST_F(FaultStreaming, EndsWithAResultAtTheTimeOut) {
    camera().stallAfterFrame = 10;
    for (const double timeout : {0.0, std::nan(""), 0.05}) {
        const auto result = run(100, timeout);
        ASSERT_NE(result, nullptr);
        EXPECT_LE(value(result, "FrameCount"), 10);
    }
    EXPECT_EQ(error, nullptr);
    EXPECT_GE(log->count(LogLevel::Error, kTimeoutLine), 3U);
}

// What is received after the stop is logged with its time, in seconds, and not counted.
TEST_F(FaultStreaming, CountsNoFrameAfterTheStop) {
    camera().stallAfterFrame = 0;
    install();
    const auto experiment = make(5, 0);
    const auto result = experiment->run(nullptr);
    const WLRylFrameHandler deliver = frameHandler(*experiment);
    deliver(buffer(), {.value = 5, .timescale = 2});
    EXPECT_TRUE(
        log->waitFor(LogLevel::Default, "Received frame that won't be counted at time: 2.5"));
    EXPECT_EQ(value(result, "FrameCount"), 0);
}

TEST_F(FaultStreaming, TakesANullBufferForOneWithoutMetadata) {
    const auto stream = std::make_shared<test::HandFedStream>();
    install({stream});
    const auto experiment = make(9, kLate);
    stream->onStart = [&] { frameHandler (*experiment)(nullptr, {}); };
    EXPECT_EQ(experiment->run(&error), nullptr);
    EXPECT_THAT(error, IsPlainError(ZRCapturePlugInErrorDomain, 206, "Frame metadata is missing!"));
    EXPECT_EQ(log->count(LogLevel::Debug, "Received frame 1."), 1U);
}

// While a description waits for its validation its buffer is back with the stream already.
TEST_F(FaultStreaming, GivesTheBufferBackBeforeItValidates) {
    camera().stallAfterFrame = 40;  // more than there are buffers
    at(40).noMetadata = true;       // received ahead of the first frame's validation
    log->hold("Processing frame 1.");
    EXPECT_EQ(run(100, kLate), nullptr);
    EXPECT_THAT(error, IsPlainError(ZRCapturePlugInErrorDomain, 206, "Frame metadata is missing!"));
    EXPECT_TRUE(log->waitFor(LogLevel::Debug, "Processing frame 1."));
    EXPECT_TRUE(test::eventually([&] { return liveBuffers() == 0; }));
}

// Two triggers meet; whichever comes first decides, the other changes nothing. A second stop() would
// be reported as a misuse of the stream.
TEST_F(FaultStreaming, TheFirstTriggerDecidesTheOutcome) {
    constexpr int kRounds = 60;
    constexpr auto kLight = kRylCaptureStreamMetadata_InfraredLightSource;
    const struct {
        std::uint64_t last;     // 0: none
        std::uint64_t unlit;    // 0: none
        std::uint64_t missing;  // 0: none
        bool timesOut;
    } kPairs[] = {
        {5, 6, 0, false}, {5, 0, 6, false}, {0, 5, 6, false}, {5, 0, 0, true},
        {0, 5, 0, true},  {0, 0, 5, true},  {4, 5, 6, true},
    };
    const auto healthy = capture;
    for (const auto& [last, unlit, missing, timesOut] : kPairs) {
        SCOPED_TRACE(::testing::Message()
                     << last << ' ' << unlit << ' ' << missing << ' ' << timesOut);
        for (int round = 0; round < kRounds; ++round) {
            capture = healthy;
            if (unlit != 0) {
                at(unlit).set.set(kLight, 0);
            }
            if (missing != 0) {  // later and later: receiving runs far ahead of processing
                at(missing + static_cast<std::uint64_t>(round) * 8).noMetadata = true;
            }
            install();
            const double timeout = timesOut ? round * 5e-6 : kLate;
            const auto experiment = make(last != 0 ? static_cast<double>(last) : 1e9, timeout);
            platform::ErrorRef caught;
            const auto result = experiment->run(&caught);
            EXPECT_TRUE(experiment->teardown(nullptr));
            ASSERT_NE(result == nullptr, caught == nullptr);
            if (result != nullptr) {
                EXPECT_TRUE(last != 0 || timesOut);
                EXPECT_EQ(value(result, "Projector"), 0);
            } else if (caught->localizedDescription().starts_with("Frame metadata")) {
                EXPECT_NE(missing, 0U);
            } else {
                EXPECT_THAT(caught, IsPlainError(ZRCapturePlugInErrorDomain, 206,
                                                 "Frame " + std::to_string(unlit) +
                                                     " is not illuminated for unknown reason!"));
                EXPECT_NE(unlit, 0U);
            }
        }
    }
}

}  // namespace
