// The counter-report experiment on the simulated counter-report facility.
#include "vantor_counters/counter_experiment.h"

#include <memory>
#include <optional>
#include <string>
#include <tuple>
#include <utility>

#include <gmock/gmock.h>

#include "devices/simulator/meterix_facility.h"
#include "platform/services.h"
#include "tests/support/is_error.h"
#include "vantor_counters/counter_report.h"

namespace {

using simulator::CounterChannel;
using simulator::MeterixProfile;
using testing::IsNull;

ZRExperimentResultRef runOn(MeterixProfile profile, platform::ErrorSlot error) {
    platform::installServices(
        {.meterix = simulator::makeMeterixFacility(std::move(profile),
                                                   std::make_shared<simulator::StreamProgress>())});
    return ZRVantorMeterixExperiment().run(error);
}

double measured(const ZRExperimentResult& result, const std::string& name) {
    const MeasurementRef* measurement = result.measurements().find(name);
    return measurement != nullptr ? (*measurement)->doubleValue() : -1.0;
}

// Names that miss a filter by a letter, a case or an affix.
TEST(CounterFilters, KeepWhatTheyShould) {
    const std::tuple<const char*, const char*, bool, bool> rows[] = {
        // group, subgroup, event channel, event subgroup
        {"Q71ISP", "Q71ISP Events", true, true},
        {"DriverQ71ISPCore", "Q71ISP Events", true, true},
        {"Q71ISP", "Q71ISP Events 2", true, false},
        {"Q71ISP", "The Q71ISP Events", true, false},
        {"q71isp", "Q71ISP Events", false, true},
        {"Q71ISP", "Q71ISP events", false, false},
    };
    for (const auto& [group, subgroup, channel, exact] : rows) {
        const WLMeterixChannelDescription description("any", group, subgroup);
        EXPECT_EQ(isISPEventChannel(description), channel) << group << '/' << subgroup;
        EXPECT_EQ(isISPEventSubgroup(description), exact) << group << '/' << subgroup;
    }
}

TEST(CounterExperiment, MeasuresTheKeptChannelsOnly) {
    platform::ErrorRef error;
    const auto result = runOn({.channels = {{"Q71ISP", "Q71ISP Events", "A", 0},
                                            {"Q71ISP", "Q71ISP Power", "B", 2},
                                            {"Q71ISP", "Q71ISP Events", "C", 1ULL << 53}}},
                              &error);
    ASSERT_NE(result, nullptr);
    EXPECT_THAT(error, IsNull());
    EXPECT_EQ(result->measurements().size(), 2U);
    EXPECT_EQ(measured(*result, "A"), 0.0);
    EXPECT_EQ(measured(*result, "C"), 9007199254740992.0);
    EXPECT_EQ(&(*result->measurements().find("A"))->unit(), &ZRDimensionlessUnit::events());
    EXPECT_TRUE(result->auxiliaryData().empty());
    EXPECT_NE(runOn({.channels = {{"CPU", "Cores", "A", 5}}}, nullptr), nullptr);
}

// A facility that reports an error with a call that went well: the run keeps it, and attaches it to a
// later failure that reports none.
TEST(CounterExperiment, ALaterFailureCarriesTheLastErrorReported) {
    struct Grumbling final : platform::MeterixFacility {
        std::shared_ptr<const platform::MeterixChannels> simpleChannels(
            platform::ErrorSlot error) override {
            *error = std::make_shared<const platform::Error>("Meterix", 1, "first");
            return std::make_shared<platform::MeterixChannels>(
                1, std::make_shared<const WLMeterixChannelDescription>("Deaf", "Q71ISP",
                                                                       "Q71ISP Events"));
        }
        std::shared_ptr<const platform::MeterixSamples> sample(
            const platform::MeterixChannels& channels, platform::ErrorSlot error) override {
            *error = complaint;
            return std::make_shared<platform::MeterixSamples>(
                1, WLMeterixSample(WLMeterixChannel(channels.front(), platform::Number())));
        }
        std::shared_ptr<const platform::MeterixSamples> difference(const platform::MeterixSamples&,
                                                                   const platform::MeterixSamples&,
                                                                   platform::ErrorSlot) override {
            return nullptr;
        }
        const platform::ErrorRef complaint =
            std::make_shared<const platform::Error>("Meterix", 2, "second");
    };
    const auto facility = std::make_shared<Grumbling>();
    platform::installServices({.meterix = facility});
    platform::ErrorRef error;
    EXPECT_THAT(ZRVantorMeterixExperiment().run(&error), IsNull());
    EXPECT_THAT(error, test::IsError(ZRMeterixErrorDomain, 100, "Could not get the count of Deaf.",
                                     facility->complaint));
}

}  // namespace
