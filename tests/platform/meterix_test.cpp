#include "platform/welkin/meterix.h"

#include <gmock/gmock.h>

#include "platform/services.h"
#include "tests/support/is_error.h"

namespace {

using platform::ErrorRef;
using platform::ErrorSlot;
using platform::MeterixChannels;
using platform::MeterixSamples;
using test::IsPlainError;

// Two channels that count 10 more with each sample; one operation fails when asked to.
class Facility final : public platform::MeterixFacility {
  public:
    enum class Operation { None, Channels, Sample, Difference };
    Operation failing = Operation::None;
    bool givesError = true;

    std::shared_ptr<const MeterixChannels> simpleChannels(ErrorSlot error) override {
        if (_fails(Operation::Channels, error)) {
            return nullptr;
        }
        const auto channel = [](const char* name) {
            return std::make_shared<const WLMeterixChannelDescription>(name, "group", "sub");
        };
        return std::make_shared<const MeterixChannels>(MeterixChannels{channel("a"), channel("b")});
    }
    std::shared_ptr<const MeterixSamples> sample(const MeterixChannels& channels,
                                                 ErrorSlot error) override {
        if (_fails(Operation::Sample, error)) {
            return nullptr;
        }
        MeterixSamples samples;
        _count += 10;
        for (const auto& channel : channels) {
            samples.emplace_back(WLMeterixChannel(channel, _count));
        }
        return std::make_shared<const MeterixSamples>(samples);
    }
    std::shared_ptr<const MeterixSamples> difference(const MeterixSamples& later,
                                                     const MeterixSamples& baseline,
                                                     ErrorSlot error) override {
        if (_fails(Operation::Difference, error)) {
            return nullptr;
        }
        MeterixSamples samples;
        for (std::size_t i = 0; i < later.size(); ++i) {
            samples.emplace_back(
                WLMeterixChannel(later[i].channel().sharedDescription(),
                                 later[i].channel().count().as<std::int64_t>() -
                                     baseline[i].channel().count().as<std::int64_t>()));
        }
        return std::make_shared<const MeterixSamples>(samples);
    }

  private:
    bool _fails(Operation operation, ErrorSlot error) const {
        if (operation == failing && givesError) {
            platform::fail(error, "facility", 9, nullptr, "refused");
        }
        return operation == failing;
    }
    std::int64_t _count = 0;
};

class MeterixTest : public ::testing::Test {
  protected:
    MeterixTest() {
        platform::Services services;
        services.meterix = facility;
        platform::installServices(services);
    }
    ~MeterixTest() override { platform::installServices({}); }

    // The difference of two snapshots of the channel "b".
    static WLMeterixSnapshot measure(ErrorSlot error) {
        const auto report =
            WLMeterix::reportWithOnlySimpleChannels(error).reportByFilteringChannels(
                [](const auto& channel) { return channel.name() == "b"; });
        const WLMeterixSnapshot baseline = report.snapshot(error);
        return report.snapshot(error).snapshotWithBaseline(baseline, error);
    }

    const std::shared_ptr<Facility> facility = std::make_shared<Facility>();
    ErrorRef error;
};

TEST_F(MeterixTest, ReportsTheDifferenceOfTheFilteredChannels) {
    const WLMeterixSnapshot difference = measure(&error);
    ASSERT_EQ(difference.samples().size(), 1U);
    const WLMeterixChannel& channel = difference.samples()[0].channel();
    EXPECT_EQ(channel.channelDescription().name(), "b");
    EXPECT_EQ(channel.count(), platform::Number(std::int64_t{10}));
    EXPECT_EQ(error, nullptr);
}

TEST_F(MeterixTest, AbsenceAndAFailureComeThroughToTheEnd) {
    using enum Facility::Operation;
    for (const auto failing : {Channels, Sample, Difference}) {
        for (const bool givesError : {true, false}) {
            facility->failing = failing;
            facility->givesError = givesError;
            error = nullptr;
            const WLMeterixSnapshot difference = measure(&error);
            EXPECT_FALSE(difference);
            EXPECT_TRUE(difference.samples().empty());
            EXPECT_FALSE(measure(nullptr));
            if (givesError) {
                EXPECT_THAT(error, IsPlainError("facility", 9, "refused"));
            } else {
                EXPECT_EQ(error, nullptr);
            }
        }
    }
}

TEST_F(MeterixTest, WithoutAFacilityOrABaselineTheResultIsAbsentWithoutAnError) {
    const WLMeterixSnapshot present =
        WLMeterix::reportWithOnlySimpleChannels(&error).snapshot(&error);
    EXPECT_TRUE(present);
    EXPECT_FALSE(present.snapshotWithBaseline({}, &error));
    EXPECT_FALSE(WLMeterixSnapshot().snapshotWithBaseline(present, &error));
    platform::installServices({});
    EXPECT_FALSE(measure(&error));
    EXPECT_EQ(error, nullptr);
}

}  // namespace
