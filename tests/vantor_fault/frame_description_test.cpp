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

// Key number i holds i + 1, but for a boolean, a float and a wide one.
MutableDictionary metadata(std::string_view without = "") {
    MutableDictionary entries;
    int next = 0;
    for (const std::string_view key : kKeys) {
        ++next;
        if (key != without) {
            entries.set(key, next);
        }
    }
    if (without != "MetaDataProjectorMode") {
        entries.set("MetaDataProjectorMode", true);
    }
    if (without != "NTCTemperatureIdle") {
        entries.set("NTCTemperatureIdle", 27.25);
    }
    if (without != "MetaDataProjectorIndex") {
        entries.set("MetaDataProjectorIndex", std::numeric_limits<std::uint64_t>::max());
    }
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
    EXPECT_THAT(description->description(),
                ::testing::EndsWith(" monotonic count: 7 illuminated: 2"));
    EXPECT_EQ(description->presentationTime(), (MediaTime{.value = 5, .timescale = 4, .epoch = 9}));
}

TEST(FrameDescription, StartsWithZerosAndNoFloodTemperature) {
    Description description;
    description.setCreationDate(platform::Date({}));
    EXPECT_EQ(description.csvRepresentation(),
              "0,1970-01-01 00:00:00 +0000,0.000000,0,0,0,0,0,0,0,0,0,0,(null),0,0,0,0,0,0,0\n");
    EXPECT_EQ(description.hardwareEvents().kind(), Number(0).kind());
}

TEST(FrameDescription, PrintsTimesThatAreNoNumbers) {
    constexpr std::pair<std::uint32_t, std::string_view> kTimes[] = {
        {0, "nan"},
        {MediaTime::kValid | MediaTime::kIndefinite, "nan"},
        {MediaTime::kValid | MediaTime::kPositiveInfinity, "inf"},
        {MediaTime::kValid | MediaTime::kNegativeInfinity, "-inf"},
    };
    for (const auto& [flags, text] : kTimes) {
        const auto row = describe(metadata(), {.value = 1, .flags = flags})->csvRepresentation();
        EXPECT_THAT(row, ::testing::HasSubstr("+0000," + std::string(text) + ",1,2,"));
    }
}

// Every number has its own property: the setter changes what the getter and the row show, and
// nothing else.
TEST(FrameDescription, KeepsEachNumberUnderItsKey) {
    using Getter = const Number& (Description::*)() const;
    constexpr Getter kGetters[] = {
        &Description::projectorMode,          &Description::infraredLightSource,
        &Description::projectorIndex,         &Description::projectorPowerLow,
        &Description::projectorPowerHigh,     &Description::projectorPowerFlood,
        &Description::projectorProbeMode,     &Description::projectorPowerProbeA,
        &Description::projectorPowerProbeB,   &Description::projectorPulseWidth,
        &Description::floodActiveTemperature, &Description::NTCTemperatureIdle,
        &Description::NTCTemperatureStandby,  &Description::NTCTemperatureActive,
        &Description::DIETemperatureIdle,     &Description::DIETemperatureStandby,
        &Description::DIETemperatureActive,   &Description::hardwareEvents,
    };
    using Setter = void (Description::*)(Number);
    constexpr Setter kSetters[] = {
        &Description::setProjectorMode,          &Description::setInfraredLightSource,
        &Description::setProjectorIndex,         &Description::setProjectorPowerLow,
        &Description::setProjectorPowerHigh,     &Description::setProjectorPowerFlood,
        &Description::setProjectorProbeMode,     &Description::setProjectorPowerProbeA,
        &Description::setProjectorPowerProbeB,   &Description::setProjectorPulseWidth,
        &Description::setFloodActiveTemperature, &Description::setNTCTemperatureIdle,
        &Description::setNTCTemperatureStandby,  &Description::setNTCTemperatureActive,
        &Description::setDIETemperatureIdle,     &Description::setDIETemperatureStandby,
        &Description::setDIETemperatureActive,   &Description::setHardwareEvents,
    };
    const auto read = describe(metadata());
    Description written;
    const Dictionary expected(metadata());
    for (std::size_t column = 0; column < std::size(kKeys); ++column) {
        const Number number = expected.number(kKeys[column]);
        EXPECT_EQ((read.get()->*kGetters[column])(), number) << kKeys[column];
        (written.*kSetters[column])(number);
        EXPECT_EQ((written.*kGetters[column])(), number) << kKeys[column];
    }
    const auto tail = [](const std::string& row) { return row.substr(row.find(".000000,")); };
    EXPECT_EQ(tail(written.csvRepresentation()), tail(read->csvRepresentation()));
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
        {0x2000, true},
        {0x1FFF, false},
        {0x12000, true},
        {0x10000, false},
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
