// What several runs together made of a fault, and how faults are counted and grouped.
#include "host/campaign/campaign_record.h"

#include <optional>
#include <vector>

#include <gmock/gmock.h>

#include "host/campaign/campaign_forms.h"
#include "host/campaign/kind_lines.h"

namespace {

using host::CampaignFault;
using host::TrialOutcome;
using host::TrialResult;
using testing::ElementsAre;

constexpr auto kCaught = TrialOutcome::Caught;
constexpr auto kBench = TrialOutcome::BenchCaught;
constexpr auto kMissed = TrialOutcome::NotCaught;
constexpr auto kCrashed = TrialOutcome::Crashed;
constexpr auto kHung = TrialOutcome::Hung;

std::vector<std::optional<TrialResult>> runs(
    const std::vector<std::optional<TrialOutcome>>& outcomes) {
    std::vector<std::optional<TrialResult>> results;
    results.reserve(outcomes.size());
    for (const auto& outcome : outcomes) {
        results.push_back(outcome.has_value() ? std::optional(TrialResult{*outcome, ""})
                                              : std::nullopt);
    }
    return results;
}

TEST(CampaignRecord, AFaultIsCaughtByOneRunAndBrokenByOneCrash) {
    const std::pair<std::vector<std::optional<TrialOutcome>>, std::optional<TrialOutcome>> cases[] =
        {
            {{std::nullopt, std::nullopt}, std::nullopt},
            {{std::nullopt, kMissed}, kMissed},
            {{kMissed, kCaught}, kCaught},
            {{kCaught, kMissed}, kCaught},
            {{kBench, kMissed}, kBench},
            {{kBench, kCaught}, kCaught},
            {{kCaught, kCrashed}, kCrashed},
            {{kCrashed, kCaught}, kCrashed},
            {{kCrashed, kHung}, kHung},
        };
    for (const auto& [outcomes, expected] : cases) {
        EXPECT_EQ(outcomeOf(CampaignFault{"", "", "", runs(outcomes)}), expected);
    }
}

TEST(CampaignRecord, KindsOfAGroupStandTogetherAndHaveOneReason) {
    host::CampaignRecord campaign;
    campaign.runs.resize(1);
    const auto add = [&](const char* group, const char* kind, const char* subject,
                         TrialOutcome outcome, const char* why) {
        campaign.faults.push_back({group, kind, subject, {TrialResult{outcome, why}}});
    };
    add("frames", "lost", "1st frame", kCaught, "Domain 1: frame 1 is missing");
    add("display", "off", "panel", kMissed, "");
    add("frames", "lost", "12th frame", kCaught, "Domain 1: frame 12 is missing");
    add("frames", "late", "3rd frame", kMissed, "");
    std::vector<std::string> kinds;
    std::vector<std::string> shares;
    for (const host::GroupTable& table : groupTables(campaign)) {
        shares.push_back(table.group + ": " + caughtText(table.counts));
        EXPECT_EQ(table.runs[0].caught, table.counts.caught);
        for (const host::KindLine& line : table.lines) {
            kinds.push_back(table.group + ", " + line.kind + ": " + line.how + "|" + line.missed);
        }
    }
    EXPECT_THAT(shares, ElementsAre("frames: 2 of 3 faults caught (66.7 %)",
                                    "display: 0 of 1 fault caught (0.0 %)"));
    EXPECT_THAT(kinds, ElementsAre("frames, lost: Domain 1: frame … is missing|",
                                   "frames, late: |3rd frame", "display, off: |panel"));
    const host::CampaignCounts counts = countsOf(campaign);
    EXPECT_EQ(counts.faults, 4);
    EXPECT_EQ(counts.caught, 2);
    EXPECT_EQ(counts.notCaught, 2);
}

}  // namespace
