#include "vantor_counters/counter_analysis.h"

#include <memory>
#include <set>
#include <string>

#include <gmock/gmock.h>

#include "tests/support/is_error.h"
#include "vantor_counters/expected_channels.h"

namespace {

using testing::IsNull;

TEST(ExpectedChannels, AreSixtyDistinctNames) {
    const std::set<std::string_view> names(kVantorCounterChannelNames.begin(),
                                           kVantorCounterChannelNames.end());
    EXPECT_EQ(names.size(), 60U);
}

TEST(CounterAnalysis, GivesEachChannelItsOwnMeasurementAndLimit) {
    ZRExperimentResult result;
    for (const std::string_view name : kVantorCounterChannelNames) {
        result.measurements().set(
            name, std::make_shared<const Measurement>(0.0, ZRDimensionlessUnit::events()));
    }
    result.measurements().set("Not expected", nullptr);

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
}

TEST(CounterAnalysis, NamesTheFirstMeasurementThatIsMissing) {
    ZRExperimentResult result;
    for (const std::string_view name : kVantorCounterChannelNames) {
        if (name != kVantorCounterChannelNames[7] && name != kVantorCounterChannelNames[40]) {
            result.measurements().set(
                name, std::make_shared<const Measurement>(0.0, ZRDimensionlessUnit::events()));
        }
    }
    platform::ErrorRef error;
    EXPECT_EQ(ZRVantorMeterixAnalysis().analyzeExperimentResult(result, nullptr), nullptr);
    EXPECT_EQ(ZRVantorMeterixAnalysis().analyzeExperimentResult(result, &error), nullptr);
    EXPECT_THAT(error, test::IsPlainError(ZRErrorDomain, 6,
                                          "Missing measurement for " +
                                              std::string(kVantorCounterChannelNames[7])));
}

TEST(CounterDescriptions, SayWhatTheyAreFor) {
    EXPECT_EQ(ZRVantorMeterixAnalysis().analysisDescription().summary(),
              "Make sure all the Vantor Meterixs were measured.");
}

}  // namespace
