#include "vantor_counters/counter_analysis.h"

#include <algorithm>
#include <memory>
#include <set>
#include <string>

#include <gmock/gmock.h>

#include "tests/support/is_error.h"
#include "vantor_counters/expected_channels.h"

namespace {

using testing::IsNull;

ZRExperimentResult withAllBut(std::string_view missing) {
    ZRExperimentResult result;
    for (const std::string_view name : kVantorCounterChannelNames) {
        if (name != missing) {
            result.measurements().set(
                name, std::make_shared<const Measurement>(0.0, ZRDimensionlessUnit::events()));
        }
    }
    return result;
}

TEST(ExpectedChannels, AreSixtyDistinctNamesOfTheFourFamilies) {
    const std::set<std::string_view> names(kVantorCounterChannelNames.begin(),
                                           kVantorCounterChannelNames.end());
    EXPECT_EQ(names.size(), 60U);
    const auto familySize = [&names](std::string_view prefix) {
        return std::count_if(names.begin(), names.end(),
                             [prefix](auto name) { return name.starts_with(prefix); });
    };
    EXPECT_EQ(familySize("Number Xel INT_"), 40);
    EXPECT_EQ(familySize("Number MB "), 10);
    EXPECT_EQ(familySize("Number YB FAULT_"), 8);
    EXPECT_EQ(kVantorCounterChannelNames.front(), "Number Xel INT_ADC_READY_LATCH");
    EXPECT_EQ(kVantorCounterChannelNames[12], "Number Xel INT_FAULT_CC");
    EXPECT_EQ(kVantorCounterChannelNames[58], "Number Qorn NTC");
    EXPECT_EQ(kVantorCounterChannelNames.back(), "Number Fesk NTC");
}

TEST(CounterAnalysis, GivesEachChannelItsOwnMeasurementAndLimit) {
    ZRExperimentResult result = withAllBut("");
    const auto three = std::make_shared<const Measurement>(3.0, ZRDimensionlessUnit::events());
    result.measurements().set("Number Xel INT_FAULT_CC", three);
    result.measurements().set("Not expected", three);

    platform::ErrorRef error;
    const auto analysed = ZRVantorMeterixAnalysis().analyzeExperimentResult(result, &error);
    ASSERT_NE(analysed, nullptr);
    EXPECT_THAT(error, IsNull());
    ASSERT_EQ(analysed->measuredResults().size(), 60U);
    for (std::size_t at = 0; at < 60; ++at) {
        const ZRMeasuredResult& one = *analysed->measuredResults()[at];
        EXPECT_EQ(one.name(), kVantorCounterChannelNames[at]);
        EXPECT_EQ(one.measurement(), *result.measurements().find(one.name()));  // the same object
        ASSERT_NE(one.limit(), nullptr);
        EXPECT_EQ(one.limit()->name(), "Max Reports");
        const ZRBoundRef& lower = one.limit()->lowerBound();
        const ZRBoundRef& upper = one.limit()->upperBound();
        ASSERT_TRUE(lower != nullptr && upper != nullptr);
        EXPECT_NE(lower, upper);
        for (const ZRBoundRef& bound : {lower, upper}) {
            EXPECT_FALSE(bound->open());
            EXPECT_EQ(bound->value()->doubleValue(), 0.0);
            EXPECT_EQ(&bound->value()->unit(), &ZRDimensionlessUnit::events());
        }
    }
    EXPECT_EQ(analysed->measuredResults()[12]->measurement(), three);
}

TEST(CounterAnalysis, NamesEachMissingChannelInTurn) {
    for (const std::string_view missing : kVantorCounterChannelNames) {
        const ZRExperimentResult result = withAllBut(missing);
        platform::ErrorRef error;
        EXPECT_THAT(ZRVantorMeterixAnalysis().analyzeExperimentResult(result, &error), IsNull());
        EXPECT_THAT(error, test::IsPlainError(ZRErrorDomain, 6,
                                              "Missing measurement for " + std::string(missing)));
        EXPECT_THAT(ZRVantorMeterixAnalysis().analyzeExperimentResult(result, nullptr), IsNull());
    }
}

TEST(CounterAnalysis, ReportsTheFirstOfSeveralMissing) {
    platform::ErrorRef error;
    EXPECT_THAT(ZRVantorMeterixAnalysis().analyzeExperimentResult(ZRExperimentResult(), &error),
                IsNull());
    EXPECT_THAT(error,
                test::IsPlainError(ZRErrorDomain, 6,
                                   "Missing measurement for Number Xel INT_ADC_READY_LATCH"));
}

TEST(CounterDescriptions, SayWhatTheyAreFor) {
    EXPECT_EQ(ZRVantorMeterixAnalysis().analysisDescription().summary(),
              "Make sure all the Vantor Meterixs were measured.");
    EXPECT_TRUE(ZRVantorMeterixAnalysis().analysisDescription().parameters().empty());
}

}  // namespace
