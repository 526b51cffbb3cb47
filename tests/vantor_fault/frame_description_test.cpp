#include "vantor_fault/frame_description.h"

#include <limits>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using platform::Dictionary;
using platform::MediaTime;
using platform::MutableDictionary;
using platform::Number;
using Description = ZRVantorFrameDescription;

constexpr std::string_view kKeys[] = {
    "MetaDataProjectorMode",       "RylInfraredLightSource",       "MetaDataProjectorIndex",
    "MetaDataProjectorPowerLow",   "MetaDataProjectorPowerHigh",   "MetaDataProjectorPowerFlood",
    "MetaDataProjectorProbeMode",  "MetaDataProjectorPowerProbeA", "MetaDataProjectorPowerProbeB",
    "MetaDataProjectorPulseWidth", "RylFloodActiveTemperature",    "NTCTemperatureIdle",
    "NTCTemperatureStandby",       "NTCTemperatureActive",         "DIETemperatureIdle",
    "DIETemperatureStandby",       "DIETemperatureActive",         "HardwareEvents",
};
constexpr std::string_view kOptional = "RylFloodActiveTemperature";

// Key number i holds i + 1, except for a boolean, a double and a wide one.
MutableDictionary metadata(std::string_view without = "") {
    MutableDictionary entries;
    int next = 0;
    for (const std::string_view key : kKeys) {
        entries.set(key, ++next);
    }
    entries.set("MetaDataProjectorMode", true);
    entries.set("NTCTemperatureIdle", 27.25);
    entries.set("MetaDataProjectorIndex", std::numeric_limits<std::uint64_t>::max());
    entries.remove(without);
    return entries;
}

std::shared_ptr<Description> describe(MutableDictionary entries, MediaTime time = {}) {
    return Description::descriptionWithMonotonicCount(7, time, Dictionary(std::move(entries)));
}

TEST(FrameDescription, PrintsItsRowByteForByte) {
    const auto description = describe(metadata(), {.value = 5, .timescale = 4, .epoch = 9});
    description->setCreationDate(platform::Date(
        std::chrono::sys_days{std::chrono::year{2024} / 2 / 29} + std::chrono::hours{23}));
    EXPECT_EQ(description->csvRepresentation(),
              "7,2024-02-29 23:00:00 +0000,1.250000,1,2,18446744073709551615,4,5,6,7,8,9,10,11,"
              "27.25,13,14,15,16,17,18\n");
    EXPECT_EQ(Description::csvRepresentationHeader(),
              "Frame,Date,MediaTime(s),MetaDataProjectorMode,RylInfraredLightSource,"
              "MetaDataProjectorIndex,MetaDataProjectorPowerLow,MetaDataProjectorPowerHigh,"
              "MetaDataProjectorPowerFlood,MetaDataProjectorProbeMode,MetaDataProjectorPowerProbeA,"
              "MetaDataProjectorPowerProbeB,MetaDataProjectorPulseWidth,RylFloodActiveTemperature,"
              "NTCTemperatureIdle,NTCTemperatureStandby,NTCTemperatureActive,DIETemperatureIdle,"
              "DIETemperatureStandby,DIETemperatureActive,HardwareEvents\n");
    EXPECT_THAT(
        description->description(),
        ::testing::MatchesRegex("<ZRVantorFrameDescription: 0x[0-9a-f]+> monotonic count: 7 "
                                "illuminated: 2"));
    EXPECT_EQ(description->presentationTime(), (MediaTime{.value = 5, .timescale = 4, .epoch = 9}));
}

TEST(FrameDescription, StartsWithZerosAndNoFloodTemperature) {
    Description description;
    description.setCreationDate(platform::Date({}));
    description.setPresentationTime({.flags = 0});
    EXPECT_EQ(description.csvRepresentation(),
              "0,1970-01-01 00:00:00 +0000,nan,0,0,0,0,0,0,0,0,0,0,(null),0,0,0,0,0,0,0\n");
}

TEST(FrameDescription, NeedsANumberUnderEveryKeyButTheFloodTemperature) {
    EXPECT_EQ(describe({}), nullptr);
    for (const std::string_view key : kKeys) {
        MutableDictionary wrong = metadata();
        wrong.set(key, "1");
        for (const auto& description : {describe(metadata(key)), describe(wrong)}) {
            ASSERT_EQ(description != nullptr, key == kOptional) << key;
            if (description != nullptr) {
                EXPECT_FALSE(description->floodActiveTemperature().isPresent());
                EXPECT_THAT(description->csvRepresentation(), ::testing::HasSubstr(",(null),"));
            }
        }
    }
}

TEST(FrameDescription, ReadsTheSafetyBitOfSixteen) {
    const std::pair<Number, bool> kCases[] = {
        {0x1FFF, false},
        {0x12000, true},
        {65536.0, false},
        {73728.5, true},
        {-1, true},
        {Number(), false},
        {std::numeric_limits<double>::quiet_NaN(), false},
        {std::uint64_t{0x8000000000002000}, true},
    };
    for (const auto& [events, disabled] : kCases) {
        Description description;
        description.setHardwareEvents(events);
        EXPECT_EQ(description.safetyDisabledProjection(), disabled) << events.text();
    }
}

}  // namespace
