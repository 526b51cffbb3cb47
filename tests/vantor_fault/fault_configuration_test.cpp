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

// The writes in their order, with the code and text of their refusal.
struct Write {
    std::string_view property;
    Value value;  // nothing: the handlers
    int code;
    std::string_view text;
};

const std::vector<Write>& writes() {
    static const std::vector<Write> kWrites = {
        {kRylCaptureStreamProperty_InfraredLightSourceConfiguration,
         Dictionary{{"ryl.light-source.mode", 2},
                    {"ryl.light-source.current", 0},
                    {"ryl.light-source.pattern", 1}},
         212, "Failed to configure structured light!"},
        {kRylCaptureStreamProperty_MultipleOutputSupportEnabled, true, 208,
         "Failed to enable multiple outputs."},
        {kRylCaptureStreamProperty_FormatIndex, std::uint64_t{5}, 209,
         "Failed to set format index 5."},
        {kRylCaptureStreamProperty_MinimumFrameRate, 30, 207, "Failed to set min frame rate."},
        {kRylCaptureStreamProperty_MaximumFrameRate, 30, 207, "Failed to set max frame rate."},
        {kRylCaptureStreamProperty_VideoOutputConfigurations,
         Dictionary{{"ryl.output.primary-scaler", Dictionary{{"ryl.output.attach-raw", true}}}},
         208, "Failed to configure primary scalar."},
        {kRylCaptureStreamProperty_VideoOutputsEnabled,
         Dictionary{{"ryl.output.primary-scaler", true}}, 208, "Failed to enable primary scalar."},
        {kRylCaptureStreamProperty_AEEnabled, false, 211, "Failed to diable AE."},
        {kRylCaptureStreamProperty_VideoOutputHandlers,
         {},
         208,
         "Failed to set callback handlers."},
    };
    return kWrites;
}

struct Profiles {
    simulator::CaptureProfile& capture;
    simulator::MeterixProfile& meterix;
};

// A step of the run: how to make it fail, and what the run then reports.
struct Step {
    std::string name;
    std::function<void(Profiles, const Fault&)> fail;
    std::string_view domain;
    int code;
    std::string_view text;
    std::size_t written;         // writes that were made by then
    bool afterPortTypes = true;  // a failed port-type read may have left its error behind
    bool neverUnderlying = false;
};

void PrintTo(const Step& step, std::ostream* out) {
    *out << step.name;
}

std::vector<Step> steps() {
    constexpr auto kCapture = ZRCapturePlugInErrorDomain;
    const std::size_t all = writes().size();
    std::vector<Step> steps = {
        {"Device", [](Profiles p, const Fault& f) { p.capture.device = f; }, kCapture, 200,
         "Failed to get the capture plugin!", 0, false},
        {"StreamList", [](Profiles p, const Fault& f) { p.capture.streamList = f; }, kCapture, 202,
         "Failed to get streams!", 0, false},
        {"NoSuchStream", [](Profiles p, const Fault&) { p.capture.streams.back().portType += "?"; },
         kCapture, 202, "Failed to find stream!", 0, true, true},
        {"Control", [](Profiles p, const Fault& f) { p.capture.streams.back().control = f; },
         kCapture, 203, "Failed to request the zorvel stream!", 0},
        {"CounterReport", [](Profiles p, const Fault& f) { p.meterix.report = f; },
         ZRMeterixErrorDomain, 100, "Cannot get Meterix before streaming.", all},
        {"CounterBaseline", [](Profiles p, const Fault& f) { p.meterix.firstSnapshot = f; },
         ZRMeterixErrorDomain, 100, "Cannot get Meterix before streaming.", all},
        {"Start", [](Profiles p, const Fault& f) { p.capture.streams.back().start = f; }, kCapture,
         204, "Failed to start streaming zorvel.", all},
        {"SecondSnapshot", [](Profiles p, const Fault& f) { p.meterix.laterSnapshots = f; },
         ZRMeterixErrorDomain, 100, "Cannot get Meterix delta after streaming.", all},
        {"CounterDifference", [](Profiles p, const Fault& f) { p.meterix.difference = f; },
         ZRMeterixErrorDomain, 100, "Cannot get Meterix delta after streaming.", all},
    };
    for (std::size_t at = 0; at < all; ++at) {
        const std::string_view key = writes()[at].property;
        steps.push_back({"Write" + std::to_string(at + 1),
                         [key](Profiles p, const Fault& f) {
                             p.capture.streams.back().propertyFaults.set(key, f);
                         },
                         kCapture, writes()[at].code, writes()[at].text, at});
    }
    return steps;
}

// Whether exactly the first `count` writes reached the stream.
void expectWritten(WLRylCaptureStream& stream, std::size_t count) {
    for (std::size_t at = 0; at < writes().size(); ++at) {
        const auto& [property, expected, code, text] = writes()[at];
        const Value value = stream.valueForProperty(property, nullptr);
        ASSERT_EQ(value.isPresent(), at < count) << property;
        if (at < count && expected.isPresent()) {
            EXPECT_EQ(value, expected) << property;
        }
    }
}

class FaultConfiguration : public FaultTest, public ::testing::WithParamInterface<Step> {};

TEST_P(FaultConfiguration, EndsTheRunAtTheStepThatFails) {
    const Step& step = GetParam();
    const ErrorRef reported = test::serviceError("this step");
    const ErrorRef portTypeError = test::serviceError("port type");
    const simulator::CaptureProfile healthyCapture = capture;
    const simulator::MeterixProfile healthyMeterix = meterix;
    // Another stream before the right one: none, one whose port type cannot be read, and one whose
    // port type cannot be read for a reason.
    const std::optional<ErrorRef> kPortTypeFailures[] = {std::nullopt, ErrorRef(), portTypeError};

    for (const ErrorRef& failure : {ErrorRef(), reported}) {
        for (const auto& portTypeFailure : kPortTypeFailures) {
            for (const bool hasSlot : {true, false}) {
                capture = healthyCapture;
                meterix = healthyMeterix;
                if (portTypeFailure.has_value()) {
                    capture.streams.insert(capture.streams.begin(), camera());
                    capture.streams.front().propertyFaults.set(kRylCaptureStreamProperty_PortType,
                                                               Fault::failing(*portTypeFailure));
                }
                step.fail({capture, meterix}, Fault::failing(failure));
                install();
                const auto experiment = make(1, 0);
                experiment->setFormatIndex(5);
                ErrorRef caught;
                EXPECT_EQ(experiment->run(hasSlot ? &caught : nullptr), nullptr);

                ErrorRef underlying = failure;
                if (underlying == nullptr && step.afterPortTypes) {
                    underlying = portTypeFailure.value_or(nullptr);
                }
                if (step.neverUnderlying) {
                    underlying = nullptr;
                }
                if (hasSlot) {
                    EXPECT_THAT(caught, IsError(step.domain, step.code, step.text, underlying));
                } else {
                    EXPECT_EQ(caught, nullptr);
                }
                if (experiment->stream() != nullptr) {
                    expectWritten(*experiment->stream(), step.written);
                }
                EXPECT_EQ(experiment->stream() != nullptr, step.afterPortTypes && step.code != 202);
                EXPECT_EQ(experiment->teardown(nullptr), step.code != 200);
            }
        }
    }
}

INSTANTIATE_TEST_SUITE_P(Steps,
                         FaultConfiguration,
                         ::testing::ValuesIn(steps()),
                         [](const auto& info) { return info.param.name; });

class FaultSetup : public FaultTest {};

TEST_F(FaultSetup, WithoutAPlugInOrATeardownThatWorksTheDeviceIsLost) {
    capture.plugIn = false;
    EXPECT_EQ(run(1, 0), nullptr);
    EXPECT_THAT(error,
                IsPlainError(ZRCapturePlugInErrorDomain, 200, "Failed to get the capture plugin!"));
    constexpr std::string_view kText = "Failed to invalidate the capture device.";
    EXPECT_FALSE(std::make_shared<Experiment>()->teardown(&error));
    EXPECT_THAT(error, IsPlainError(ZRCapturePlugInErrorDomain, 200, kText));

    capture.plugIn = true;
    for (const ErrorRef& reported : {ErrorRef(), test::serviceError("busy")}) {
        capture.invalidate = Fault::failing(reported);
        install();
        const auto experiment = make(1, 0);
        EXPECT_NE(experiment->run(nullptr), nullptr);
        EXPECT_FALSE(experiment->teardown(&error));
        EXPECT_THAT(error, IsError(ZRCapturePlugInErrorDomain, 200, kText, reported));
        EXPECT_FALSE(experiment->teardown(nullptr));
    }
}

// A run that goes well leaves the slot as the port-type read of another stream left it.
TEST_F(FaultSetup, ReportsAStreamWithoutPortTypeAndGoesOn) {
    const ErrorRef untouched = error = test::serviceError("untouched");
    EXPECT_NE(run(1, 0), nullptr);
    EXPECT_EQ(error, untouched);

    const ErrorRef reported = test::serviceError("unreadable");
    capture.streams.insert(capture.streams.begin(), 2, camera());
    capture.streams[0].propertyFaults.set(kRylCaptureStreamProperty_PortType,
                                          Fault::failing(reported));
    capture.streams[1].propertyFaults.set(kRylCaptureStreamProperty_PortType,
                                          Fault::failing(nullptr));
    EXPECT_NE(run(1, 0), nullptr);
    EXPECT_THAT(error, IsError(ZRCapturePlugInErrorDomain, 202, "Failed to get stream port type!",
                               reported));
}

TEST_F(FaultSetup, TakesANullStreamForOneWithoutPortType) {
    const auto stream = std::make_shared<test::HandFedStream>();
    install({nullptr, stream});
    EXPECT_NE(make(1, 0)->run(&error), nullptr);
    EXPECT_THAT(error,
                IsPlainError(ZRCapturePlugInErrorDomain, 202, "Failed to get stream port type!"));
    install({nullptr});
    EXPECT_EQ(make(1, 0)->run(&error), nullptr);
    EXPECT_THAT(error, IsPlainError(ZRCapturePlugInErrorDomain, 202, "Failed to find stream!"));
}

TEST_F(FaultSetup, UsesTheFirstStreamOfItsPort) {
    capture.streams.insert(capture.streams.begin(), 3, camera());
    capture.streams[0].portType = "ryl.port.other";
    camera().start = Fault::failing(nullptr);
    install();
    EXPECT_EQ(Experiment().port(), kRylCapturePortType_FrontFacingInfraredCamera);
    const std::string temporary = "a port type that is made of ";
    const Experiment owning(temporary + "pieces");
    EXPECT_EQ(owning.port(), "a port type that is made of pieces");
    for (const std::string_view port :
         {kRylCapturePortType_FrontFacingInfraredCamera, std::string_view("ryl.port.other")}) {
        const auto experiment = make(0, 0, port);
        EXPECT_NE(experiment->run(nullptr), nullptr);
        const auto streams = experiment->device()->streams(nullptr);
        EXPECT_EQ(experiment->stream(), (*streams)[experiment->port() == "ryl.port.other" ? 0 : 1]);
        EXPECT_EQ(
            experiment->stream()->valueForProperty(kRylCaptureStreamProperty_FormatIndex, nullptr),
            Value(std::uint64_t{0}));
    }
}

TEST_F(FaultSetup, RefusesNegativeParameters) {
    constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
    constexpr double kNever = std::numeric_limits<double>::infinity();
    const struct {
        Dictionary parameters;
        std::string_view negative;  // empty: accepted
    } kCases[] = {
        {{}, ""},
        {{{"frameCount", 0}, {"timeout", 0}}, ""},
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
        EXPECT_EQ(experiment.setupWithParameters(parameters, nullptr, nullptr), negative.empty());
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
