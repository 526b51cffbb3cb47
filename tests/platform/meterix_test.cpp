// Absence comes through a sequence of calls to its end: the facility is not asked, and no error is stored.
#include "platform/welkin/meterix.h"

#include <memory>

#include <gtest/gtest.h>

#include "platform/services.h"

namespace {

using platform::ErrorSlot;
using platform::MeterixChannels;
using platform::MeterixSamples;

// Every call succeeds, with an empty list.
class EmptyFacility : public platform::MeterixFacility {
  public:
    std::shared_ptr<const MeterixChannels> simpleChannels(ErrorSlot) override {
        return std::make_shared<MeterixChannels>();
    }
    std::shared_ptr<const MeterixSamples> sample(const MeterixChannels&, ErrorSlot) override {
        return std::make_shared<MeterixSamples>();
    }
    std::shared_ptr<const MeterixSamples> difference(const MeterixSamples&,
                                                     const MeterixSamples&,
                                                     ErrorSlot) override {
        return std::make_shared<MeterixSamples>();
    }
};

TEST(Meterix, WithoutAFacilityAReportOrABaselineTheResultIsAbsentWithoutAnError) {
    platform::ErrorRef error;
    const auto facility = std::make_shared<EmptyFacility>();
    const WLMeterixSnapshot present(facility, std::make_shared<MeterixSamples>());
    ASSERT_TRUE(present.snapshotWithBaseline(present, &error));
    EXPECT_FALSE(present.snapshotWithBaseline({}, &error));
    EXPECT_FALSE(WLMeterixSnapshot().snapshotWithBaseline(present, &error));
    EXPECT_TRUE(WLMeterixSnapshot().samples().empty());

    platform::installServices({.meterix = facility});
    EXPECT_TRUE(WLMeterix::reportWithOnlySimpleChannels(&error).snapshot(&error));
    EXPECT_FALSE(WLMeterix().snapshot(&error));
    platform::installServices({});
    EXPECT_FALSE(WLMeterix::reportWithOnlySimpleChannels(&error));
    EXPECT_EQ(error, nullptr);
}

}  // namespace
