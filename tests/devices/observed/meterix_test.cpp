#include "devices/observed/meterix.h"

#include <memory>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using platform::ErrorSlot;
using platform::MeterixChannels;
using platform::MeterixSamples;
using ::testing::ElementsAre;

const auto kJam = std::make_shared<const platform::Error>("facility", 9, "jam");

// Returns as many samples as it is told; a negative number of them fails.
struct FakeMeterix final : platform::MeterixFacility {
    std::shared_ptr<const MeterixChannels> simpleChannels(ErrorSlot slot) override {
        return platform::failWith(slot, kJam);
    }
    std::shared_ptr<const MeterixSamples> sample(const MeterixChannels& /*channels*/,
                                                 ErrorSlot slot) override {
        if (samples < 0) {
            return platform::failWith(slot, kJam);
        }
        const WLMeterixChannel channel(
            std::make_shared<const WLMeterixChannelDescription>("name", "group", "subgroup"), 7);
        return std::make_shared<const MeterixSamples>(samples, WLMeterixSample(channel));
    }
    std::shared_ptr<const MeterixSamples> difference(const MeterixSamples& /*later*/,
                                                     const MeterixSamples& /*baseline*/,
                                                     ErrorSlot slot) override {
        return platform::failWith(slot, kJam);
    }
    int samples = 2;
};

struct MeterixJournal final : observed::Observer {
    void countersSampled(const MeterixSamples& samples) override {
        lines.push_back(std::to_string(samples.size()) + " samples");
    }
    void errorReported(std::string_view call, const platform::ErrorRef& error) override {
        lines.push_back(std::string(call) + ": " + error->localizedDescription());
    }
    void misused(std::string_view what) override { lines.emplace_back(what); }
    std::vector<std::string> lines;
};

TEST(ObservedMeterix, ReportsSnapshotsErrorsAndSamplesThatDoNotMatch) {
    const auto journal = std::make_shared<MeterixJournal>();
    const auto fake = std::make_shared<FakeMeterix>();
    const auto meterix = observed::observeMeterix(fake, observed::Reporter(journal));
    const MeterixChannels channels(2);
    const auto samples = meterix->sample(channels, nullptr);
    ASSERT_NE(samples, nullptr);
    fake->samples = 3;
    EXPECT_NE(meterix->sample(channels, nullptr), nullptr);
    fake->samples = -1;
    for (platform::ErrorRef error; const ErrorSlot slot : {&error, ErrorSlot()}) {
        EXPECT_EQ(meterix->sample(channels, slot), nullptr);
        EXPECT_EQ(meterix->simpleChannels(slot), nullptr);
        EXPECT_EQ(meterix->difference(*samples, *samples, slot), nullptr);
        EXPECT_EQ(error, kJam);
    }
    EXPECT_THAT(journal->lines,
                ElementsAre("2 samples", "sample() returned 3 samples for 2 channels", "3 samples",
                            "sample(): jam", "simpleChannels(): jam", "difference(): jam",
                            "sample(): jam", "simpleChannels(): jam", "difference(): jam"));
}

}  // namespace
