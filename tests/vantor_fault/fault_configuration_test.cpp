// Setup and the phases of a run up to the start of the stream, each step refused in every way.
#include <limits>

#include "tests/vantor_fault/fault_bench.h"

namespace {

using platform::Dictionary;
using platform::ErrorRef;
using platform::Value;
using simulator::Fault;
using test::FaultTest;
using test::IsError;
using test::IsPlainError;

class FaultSetup : public FaultTest {};

TEST_F(FaultSetup, WritesThePropertiesInOrder) {
    const auto stream = std::make_shared<test::HandFedStream>();
    install({stream});
    const auto experiment = make(1, 0);
    experiment->setFormatIndex(5);
    EXPECT_NE(experiment->run(nullptr), nullptr);
    const std::pair<std::string_view, Value> kBeforeTheHandlers[] = {
        {kRylCaptureStreamProperty_InfraredLightSourceConfiguration,
         Dictionary{{"ryl.light-source.mode", 2},
                    {"ryl.light-source.current", 0},
                    {"ryl.light-source.pattern", 1}}},
        {kRylCaptureStreamProperty_MultipleOutputSupportEnabled, true},
        {kRylCaptureStreamProperty_FormatIndex, std::uint64_t{5}},
        {kRylCaptureStreamProperty_MinimumFrameRate, 30},
        {kRylCaptureStreamProperty_MaximumFrameRate, 30},
        {kRylCaptureStreamProperty_VideoOutputConfigurations,
         Dictionary{{"ryl.output.primary-scaler", Dictionary{{"ryl.output.attach-raw", true}}}}},
        {kRylCaptureStreamProperty_VideoOutputsEnabled,
         Dictionary{{"ryl.output.primary-scaler", true}}},
        {kRylCaptureStreamProperty_AEEnabled, false},
    };
    ASSERT_EQ(stream->written.size(), std::size(kBeforeTheHandlers) + 1);
    for (std::size_t at = 0; at < std::size(kBeforeTheHandlers); ++at) {
        EXPECT_EQ(stream->written[at].first, kBeforeTheHandlers[at].first);
        EXPECT_EQ(stream->written[at].second, kBeforeTheHandlers[at].second) << at;
    }
    EXPECT_EQ(stream->written.back().first, kRylCaptureStreamProperty_VideoOutputHandlers);
}

// The gallery has every other refusal, which differs in its code and text.
TEST_F(FaultSetup, EndsTheRunAtTheStepThatFails) {
    constexpr auto kCapture = ZRCapturePlugInErrorDomain;
    constexpr auto kMeterix = ZRMeterixErrorDomain;
    const struct {
        std::function<void(const Fault&)> fail;
        std::string_view domain;
        int code;
        std::string_view text;
        bool afterPortTypes = true;  // a failed port-type read may have left its error behind
    } kSteps[] = {
        {[&](auto& f) { capture.device = f; }, kCapture, 200, "Failed to get the capture plugin!",
         false},
        {[&](auto& f) { capture.streamList = f; }, kCapture, 202, "Failed to get streams!", false},
        {[&](auto& f) { camera().control = f; }, kCapture, 203,
         "Failed to request the zorvel stream!"},
        {[&](auto& f) { camera().propertyFaults.set(kRylCaptureStreamProperty_FormatIndex, f); },
         kCapture, 209, "Failed to set format index 5."},
        {[&](auto& f) { meterix.report = f; }, kMeterix, 100,
         "Cannot get Meterix before streaming."},
        {[&](auto& f) { meterix.difference = f; }, kMeterix, 100,
         "Cannot get Meterix delta after streaming."},
    };
    const simulator::CaptureProfile healthyCapture = capture;
    const simulator::MeterixProfile healthyMeterix = meterix;
    const ErrorRef portTypeError = test::serviceError("port type");
    for (const auto& [fail, domain, code, text, afterPortTypes] : kSteps) {
        for (const ErrorRef& failure : {ErrorRef(), test::serviceError("this step")}) {
            SCOPED_TRACE(text);
            capture = healthyCapture;
            meterix = healthyMeterix;
            capture.streams.insert(capture.streams.begin(), camera());
            capture.streams.front().propertyFaults.set(kRylCaptureStreamProperty_PortType,
                                                       Fault::failing(portTypeError));
            fail(Fault::failing(failure));
            install();
            const auto experiment = make(1, 0);
            experiment->setFormatIndex(5);
            EXPECT_EQ(experiment->run(&error), nullptr);
            const ErrorRef leftBehind = afterPortTypes ? portTypeError : nullptr;
            EXPECT_THAT(error,
                        IsError(domain, code, text, failure != nullptr ? failure : leftBehind));
            EXPECT_EQ(experiment->stream() != nullptr, afterPortTypes);
            EXPECT_EQ(experiment->teardown(&error), code != 200);
            if (code == 200) {
                EXPECT_THAT(error,
                            IsPlainError(domain, 200, "Failed to invalidate the capture device."));
            }
        }
    }
}

TEST_F(FaultSetup, ReportsAStreamWithoutPortTypeAndGoesOn) {
    const ErrorRef reported = test::serviceError("unreadable");
    constexpr std::string_view kText = "Failed to get stream port type!";
    capture.streams.insert(capture.streams.begin(), camera());
    capture.streams[0].propertyFaults.set(kRylCaptureStreamProperty_PortType,
                                          Fault::failing(reported));
    EXPECT_NE(run(1, 0), nullptr);
    EXPECT_THAT(error, IsError(ZRCapturePlugInErrorDomain, 202, kText, reported));
    camera().portType = "ryl.port.other";
    EXPECT_EQ(run(1, 0), nullptr);
    EXPECT_THAT(error, IsPlainError(ZRCapturePlugInErrorDomain, 202, "Failed to find stream!"));

    install({nullptr, std::make_shared<test::HandFedStream>()});
    EXPECT_NE(make(1, 0)->run(&error), nullptr);
    EXPECT_THAT(error, IsPlainError(ZRCapturePlugInErrorDomain, 202, kText));
}

TEST_F(FaultSetup, UsesTheFirstStreamOfItsPort) {
    capture.streams.insert(capture.streams.begin(), 3, camera());
    capture.streams[0].portType = "ryl.port.other";
    install();
    const std::string temporary = "ryl.port.";
    for (const std::size_t at : {0U, 1U}) {
        const auto experiment = at == 0 ? make(0, 0, temporary + "other") : make(0, 0);
        EXPECT_NE(experiment->run(nullptr), nullptr);
        EXPECT_EQ(experiment->stream(), (*experiment->device()->streams(nullptr))[at]);
    }
}

TEST_F(FaultSetup, RefusesNegativeParameters) {
    constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
    constexpr double kNever = std::numeric_limits<double>::infinity();
    const struct {
        Dictionary parameters;
        std::string_view negative;  // empty: accepted
    } kCases[] = {
        {{{"frameCount", "-1"}, {"timeout", Value()}}, ""},
        {{{"frameCount", -0.9}, {"timeout", kNaN}}, ""},
        {{{"frameCount", 1e30}, {"timeout", kNever}}, ""},
        {{{"frameCount", -1}, {"timeout", -1}}, "frameCount"},
        {{{"frameCount", std::numeric_limits<std::uint64_t>::max()}}, "frameCount"},
        {{{"frameCount", 3}, {"timeout", -0.5}}, "timeout"},
    };
    for (const auto& [parameters, negative] : kCases) {
        ErrorRef caught;
        Experiment experiment;
        EXPECT_EQ(experiment.setupWithParameters(parameters, nullptr, &caught), negative.empty());
        if (negative.empty()) {
            EXPECT_EQ(caught, nullptr);
        } else {
            EXPECT_THAT(caught, IsPlainError(ZRErrorDomain, 5,
                                             std::string(negative) + " cannot be negative!"));
        }
    }
    // A frame count is kept although the time-out after it is refused.
    install();
    const auto experiment = make(1, kNever);
    EXPECT_FALSE(
        experiment->setupWithParameters({{"frameCount", 3}, {"timeout", -0.5}}, nullptr, nullptr));
    const auto result = experiment->run(nullptr);
    ASSERT_NE(result, nullptr);
    EXPECT_GE((*result->measurements().find("FrameCount"))->doubleValue(), 3);
}

}  // namespace
