#include "vantor_fault/fault_analysis.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/support/is_error.h"
#include "vantor_counters/expected_channels.h"

namespace {

using test::IsPlainError;

const ZRDimensionlessUnit& unitOf(std::string_view name) {
    return name == "FrameCount"         ? ZRDimensionlessUnit::frames()
           : name.starts_with("Number") ? ZRDimensionlessUnit::events()
                                        : ZRDimensionlessUnit::errors();
}

// What a run measures, in values that tell the measurements apart, without those named.
ZRExperimentResult measured(const std::vector<std::string_view>& without) {
    ZRExperimentResult result;
    double value = 0;
    const auto put = [&](std::string_view name) {
        result.measurements().set(name,
                                  std::make_shared<const Measurement>(value += 1, unitOf(name)));
    };
    std::for_each(kVantorCounterChannelNames.begin(), kVantorCounterChannelNames.end(), put);
    for (const auto name : {"FrameCount", "I2C", "MIPI", "SIF", "LPDP", "Number Other"}) {
        put(name);
    }
    for (const std::string_view name : without) {
        result.measurements().remove(name);
    }
    return result;
}

TEST(FaultAnalysis, JudgesSixtyChannelsTheFramesAndThreeErrorCounts) {
    ZRVantorFaultAnalysis analysis;
    platform::ErrorRef error;
    ASSERT_TRUE(analysis.setupWithParameters({{"frameCount", -2.5}}, nullptr, &error));
    const ZRExperimentResult experiment = measured({});
    const auto result = analysis.analyzeExperimentResult(experiment, &error);
    ASSERT_NE(result, nullptr);
    EXPECT_EQ(error, nullptr);
    const auto& results = result->measuredResults();
    ASSERT_EQ(results.size(), 64U);

    constexpr std::pair<std::string_view, std::string_view> kAfterChannels[] = {
        {"Actual Frames", "FrameCount"},
        {"I2C Errors", "I2C"},
        {"MIPI Errors", "MIPI"},
        {"SIF Errors", "SIF"},
    };
    for (std::size_t at = 0; at < results.size(); ++at) {
        const ZRMeasuredResult& judged = *results[at];
        const bool isChannel = at < 60;
        const auto key =
            isChannel ? kVantorCounterChannelNames[at] : kAfterChannels[at - 60].second;
        EXPECT_EQ(judged.name(), isChannel ? key : kAfterChannels[at - 60].first);
        EXPECT_EQ(judged.measurement(), *experiment.measurements().find(key));  // the same object
        const ZRBoundRef& lower = judged.limit()->lowerBound();
        ASSERT_NE(lower, nullptr);
        EXPECT_FALSE(lower->open());
        EXPECT_EQ(&lower->value()->unit(), &unitOf(key)) << key;
        const bool isFrames = key == "FrameCount";
        EXPECT_EQ(judged.limit()->name(), isFrames ? "Min Frame Count" : "Limit");
        EXPECT_EQ(lower->value()->doubleValue(), isFrames ? -2.5 : 0);
        EXPECT_EQ(judged.limit()->upperBound(), isFrames ? nullptr : lower);  // one bound for both
    }
}

TEST(FaultAnalysis, NamesTheFirstMeasurementThatIsMissing) {
    const struct {
        std::vector<std::string_view> without;
        std::string_view text;
    } kCases[] = {
        {{"Number Fesk NTC", "Number YB FAULT_A", "FrameCount"},
         "Missing measurement for Number YB FAULT_A"},
        {{"FrameCount", "I2C"}, "Missing FrameCount measurement!"},
        {{"I2C", "MIPI", "SIF"}, "Missing measurement named I2C!"},
        {{"SIF"}, "Missing measurement named SIF!"},
    };
    for (const auto& [without, text] : kCases) {
        ZRVantorFaultAnalysis analysis;
        platform::ErrorRef error;
        EXPECT_EQ(analysis.analyzeExperimentResult(measured(without), &error), nullptr);
        EXPECT_THAT(error, IsPlainError(ZRErrorDomain, 6, text));
    }
}

}  // namespace
