// Counter reports on the simulated facility: counts that rise with the stream.
#include "devices/simulator/meterix_facility.h"

#include <memory>
#include <optional>
#include <utility>

#include <gmock/gmock.h>

#include "platform/services.h"

namespace {

using platform::Number;
using simulator::MeterixProfile;

class MeterixFacility : public ::testing::Test {
  protected:
    ~MeterixFacility() override { platform::installServices({}); }

    // The difference over 60 frames in two seconds of the channels in "events".
    WLMeterixSnapshot measure(MeterixProfile profile, platform::ErrorSlot error) {
        const auto progress = std::make_shared<simulator::StreamProgress>();
        platform::installServices(
            {.meterix = simulator::makeMeterixFacility(std::move(profile), progress)});
        const auto report =
            WLMeterix::reportWithOnlySimpleChannels(error).reportByFilteringChannels(
                [](const auto& channel) { return channel.subGroupName() == "events"; });
        const WLMeterixSnapshot baseline = report.snapshot(error);
        progress->frames = 60;
        progress->microseconds = 2'000'000;
        return report.snapshot(error).snapshotWithBaseline(baseline, error);
    }

    MeterixProfile profile{.channels = {{"g", "events", "steady", 7},
                                        {"g", "power", "other", 7},
                                        {"g", "events", "rising", 7, 1.5},
                                        {"g", "events", "late", 7, 0, 60, 4},
                                        {"g", "events", "too late", 7, 0, 61, 4},
                                        {"g", "events", "deaf", std::nullopt, 1.5}}};
};

TEST_F(MeterixFacility, TheDifferenceIsWhatStreamingAdded) {
    platform::ErrorRef error;
    const WLMeterixSnapshot difference = measure(profile, &error);
    const std::pair<const char*, Number> expected[] = {{"steady", Number(std::int64_t{0})},
                                                       {"rising", Number(std::int64_t{3})},
                                                       {"late", Number(std::int64_t{4})},
                                                       {"too late", Number(std::int64_t{0})},
                                                       {"deaf", Number()}};
    ASSERT_EQ(difference.samples().size(), std::size(expected));
    for (std::size_t at = 0; at < std::size(expected); ++at) {
        const WLMeterixChannel& channel = difference.samples()[at].channel();
        EXPECT_EQ(channel.channelDescription().name(), expected[at].first);
        EXPECT_EQ(channel.count(), expected[at].second) << expected[at].first;
    }
    EXPECT_EQ(error, nullptr);
}

}  // namespace
