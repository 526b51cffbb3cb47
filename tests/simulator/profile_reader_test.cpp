#include "simulator/profile_reader.h"

#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <limits>
#include <optional>
#include <string>
#include <string_view>
#include <tuple>
#include <utility>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "tests/support/is_error.h"

namespace {

namespace fs = std::filesystem;
using simulator::DeviceProfile;
using simulator::loadProfile;
using ::testing::ElementsAre;
using ::testing::Field;
using ::testing::SizeIs;

constexpr auto kLast = std::numeric_limits<std::uint64_t>::max();

// In a folder of its own, so that a file's name is all that problems say of it.
class ProfileReader : public ::testing::Test {
  protected:
    ProfileReader() : _before(fs::current_path()) {
        std::string name = (fs::temp_directory_path() / "zrlab-profile-XXXXXX").string();
        _folder = mkdtemp(name.data());
        fs::current_path(_folder);
    }
    ~ProfileReader() override {
        fs::current_path(_before);
        fs::remove_all(_folder);
    }

    static void write(const std::string& file, const std::string& text) {
        std::ofstream(file, std::ios::binary) << text;
    }
    static std::string problemOf(const std::string& nameOrFile) {
        std::string problem;
        EXPECT_FALSE(loadProfile(nameOrFile, problem).has_value()) << nameOrFile;
        return problem;
    }
    static DeviceProfile load(const std::string& nameOrFile) {
        std::string problem;
        auto device = loadProfile(nameOrFile, problem);
        EXPECT_EQ(problem, "");
        return device.value_or(DeviceProfile());
    }
    static std::string fileOfTests(const std::string& name) { return ZR_PROFILE_TESTS "/" + name; }

  private:
    const fs::path _before;
    fs::path _folder;
};

TEST_F(ProfileReader, LoadsTheWholeGalleryTheHealthyDeviceFirst) {
    const auto entries = simulator::gallery();
    ASSERT_THAT(entries, SizeIs(::testing::Gt(50U)));
    EXPECT_EQ(entries.front().name, "healthy");
    for (std::size_t at = 0; at < entries.size(); ++at) {
        const DeviceProfile device = load(entries[at].name);
        EXPECT_EQ(device.name, entries[at].name);
        EXPECT_EQ(device.summary, entries[at].summary);
        EXPECT_TRUE(at < 2 || entries[at - 1].name < entries[at].name) << entries[at].name;
    }
}

TEST_F(ProfileReader, TellsWhatIsWrongWithAProfile) {
    std::ifstream file(fileOfTests("broken_profiles.json"));
    const auto broken = nlohmann::ordered_json::parse(file);
    ASSERT_THAT(broken, SizeIs(::testing::Gt(50U)));
    for (const auto& row : broken) {
        write("x.json", row.at("profile").dump());
        const auto reason = row.at("problem").get<std::string>();
        EXPECT_EQ(problemOf("x.json"), "x.json: " + reason);
    }
}

TEST_F(ProfileReader, TellsWhatIsNoStrictJson) {
    const std::pair<std::string, std::string> kCases[] = {
        {"",
         "line 1, column 1: syntax error while parsing value - unexpected end of input; "
         "expected '[', '{', or a literal"},
        {"{\n  \"summary\": \"a\",\n}",
         "line 3, column 1: syntax error while parsing object key - unexpected '}'; expected "
         "string literal"},
        {"{} // no comments",
         "line 1, column 4: syntax error while parsing value - invalid literal; last read: '{} /'; "
         "expected end of input"},
        {R"({"display": {"powered": 1, "property": true, "powered": 0}})",
         "/display/powered: the key comes twice"},
        {R"({"a": [{}, {"b": 1, "c": [], "b": 2}]})", "/a/1/b: the key comes twice"},
        {R"({"summary": "", "a\nb": 1})", "/a?b: unknown key"},
        {R"({"display": {"powered": 1e999}})", "number overflow parsing '1e999'"},
        {std::string(100000, '['),
         [] {
             std::string pointer;
             for (int level = 0; level < 64; ++level) {
                 pointer += "/0";
             }
             return pointer + ": nested more than 64 deep";
         }()},
        {std::string((1U << 20U) + 1, ' '), "longer than 1 MiB"},
    };
    for (const auto& [text, problem] : kCases) {
        write("x.json", text);
        EXPECT_EQ(problemOf("x.json"), "x.json: " + problem) << text.substr(0, 60);
    }
}

TEST_F(ProfileReader, TellsWhatCannotBeFound) {
    fs::create_directory("sub");
    write("sub/a.json", R"({"extends": "./b.json"})");
    write("sub/b.json", R"({"extends": "../sub/a.json"})");
    write("sub/c.json", R"({"extends": "./c.json"})");
    write("sub/broken.json", R"({"display": 1})");
    write("typo.json", R"({"extends": "helthy"})");
    write("missing.json", R"({"extends": "./sub/none.json"})");
    write("base.json", R"({"extends": "sub/broken.json", "hid": {"manager": false}})");
    const std::pair<std::string, std::string> kCases[] = {
        {"helthy", R"(unknown device "helthy"; did you mean healthy?)"},
        {"xyz", R"(unknown device "xyz")"},
        {"none.json", "none.json: cannot be read: No such file or directory"},
        {"./sub", "sub: a folder, not a profile"},
        {"typo.json", R"(typo.json: /extends: unknown device "helthy"; did you mean healthy?)"},
        {"missing.json",
         "missing.json: /extends: sub/none.json: cannot be read: No such file or directory"},
        {"base.json", "sub/broken.json: /display: not an object"},
        {"sub/a.json", "sub/b.json: /extends: sub/a.json extends itself"},
        {"sub/c.json", "sub/c.json: /extends: sub/c.json extends itself"},
    };
    for (const auto& [name, problem] : kCases) {
        EXPECT_EQ(problemOf(name), problem);
    }

    for (int level = 0; level < 17; ++level) {
        write(std::to_string(level) + ".json",
              R"({"extends": "./)" + std::to_string(level + 1) + R"(.json"})");
    }
    write("17.json", "{}");
    EXPECT_EQ(problemOf("0.json"), "15.json: /extends: more than 16 profiles in a row");
    write("healthy", R"({"extends": "healthy"})");
    load("./healthy");
    EXPECT_EQ(load("2.json").display.powered, platform::Value(true));
}

TEST_F(ProfileReader, AnEmptyProfileIsADeviceWithoutFaults) {
    write("x.json", "{}");
    const DeviceProfile device = load("./x.json");
    EXPECT_EQ(device.name, "./x.json");
    EXPECT_THAT(device.capture.streams,
                ElementsAre(Field(&simulator::StreamProfile::portType, "ryl.port.rear"),
                            Field(&simulator::StreamProfile::portType, "ryl.port.front"),
                            Field(&simulator::StreamProfile::portType, "ryl.port.front-infrared")));
    EXPECT_EQ(device.capture.streams[2].lightSources, (std::vector<std::int32_t>{1, 2}));
    EXPECT_THAT(device.meterix.channels, SizeIs(64));
    EXPECT_THAT(device.hid.devices, SizeIs(3));
    EXPECT_EQ(device.display.powered, platform::Value(true));
}

TEST_F(ProfileReader, AnExtensionChangesWhatItNamesAndKeepsTheRest) {
    fs::create_directory("sub");
    write("sub/base.json", R"({"summary": "Base", "extends": "i2c-errors",
        "capture": {"streams": {"front-infrared": {"seed": 5, "metadata": {"Own": 1, "Other": 2},
            "overrides": [{"frames": "1"}, {"frames": "2"}], "faults": {"start": true}}}},
        "counters": {"channels": {"New": {"group": "g", "subgroup": "s", "count": 4}}}})");
    write("top.json", R"({"extends": "sub/base.json",
        "capture": {"streams": {"front-infrared": {"metadata": {"Own": null, "Other": 3},
            "overrides": [{"frames": "3"}], "faults": {"start": false}}}},
        "counters": {"channels": {"New": {"count": 6}}}})");
    const DeviceProfile device = load("top.json");
    EXPECT_EQ(device.summary, "");
    const auto& stream = device.capture.streams[2];
    EXPECT_EQ(stream.errorCounters["ryl.errors.i2c"], platform::Value(2));
    EXPECT_EQ(stream.seed, 5U);
    EXPECT_FALSE(stream.metadata.contains("Own"));
    EXPECT_EQ(*stream.metadata.find("Other"), platform::Value(3));
    EXPECT_TRUE(stream.metadata.contains("HardwareEvents"));
    ASSERT_THAT(stream.overrides, SizeIs(1));
    EXPECT_EQ(stream.overrides[0].firstFrame, 3U);
    EXPECT_FALSE(stream.start.fails());
    const auto& channel = device.meterix.channels.back();
    EXPECT_EQ(std::tie(channel.name, channel.group, channel.subgroup, channel.count),
              std::make_tuple("New", "g", "s", std::optional<std::uint64_t>(6)));
}

platform::ErrorRef errorOf(const simulator::Fault& fault) {
    platform::ErrorRef error;
    EXPECT_TRUE(fault.strikes(&error));
    return error;
}

TEST_F(ProfileReader, ReadsEveryKeyOfTheCaptureService) {
    const auto capture = load(fileOfTests("every_key.json")).capture;
    EXPECT_TRUE(capture.plugIn);
    EXPECT_FALSE(capture.device.fails() || capture.streamList.fails());
    EXPECT_EQ(errorOf(capture.invalidate), nullptr);
    ASSERT_THAT(capture.streams, SizeIs(3));
    EXPECT_EQ(capture.streams[0].portType, "ryl.port.front");
    EXPECT_EQ(capture.streams[2].portType, "ryl.port.front-infrared");
    EXPECT_THAT(capture.streams[2].metadata, SizeIs(17));

    const auto& stream = capture.streams[1];
    const platform::ErrorRef start = errorOf(stream.start);
    EXPECT_THAT(start, test::IsError("Outer", -3, "no start", start->underlyingError()));
    EXPECT_THAT(start->underlyingError(), test::IsPlainError("Inner", 7, "no power"));
    EXPECT_TRUE(stream.control.fails() && stream.stop.fails());
    EXPECT_THAT(stream.propertyFaults, SizeIs(11));
    EXPECT_FALSE(stream.propertyFaults.find(kRylCaptureStreamProperty_PortType)->fails());
    for (const std::string_view key :
         {kRylCaptureStreamProperty_InfraredLightSourceConfiguration,
          kRylCaptureStreamProperty_MultipleOutputSupportEnabled,
          kRylCaptureStreamProperty_FormatIndex, kRylCaptureStreamProperty_MinimumFrameRate,
          kRylCaptureStreamProperty_MaximumFrameRate,
          kRylCaptureStreamProperty_VideoOutputConfigurations,
          kRylCaptureStreamProperty_VideoOutputsEnabled, kRylCaptureStreamProperty_AEEnabled,
          kRylCaptureStreamProperty_VideoOutputHandlers, kRylCaptureStreamProperty_ErrorCounters}) {
        const auto* fault = stream.propertyFaults.find(key);
        EXPECT_TRUE(fault != nullptr && fault->fails()) << key;
    }
    EXPECT_EQ(stream.errorCounters,
              platform::Value(platform::Dictionary{{"ryl.errors.i2c", 1},
                                                   {"ryl.errors.mipi", 2},
                                                   {"LPDPErrorCount", 3},
                                                   {"SIFErrorCount", "five"},
                                                   {"ProjectorErrorCount", 6.0}}));

    // Numbers keep their kind.
    const auto metadata = platform::Dictionary(stream.metadata);
    EXPECT_EQ(metadata["RylInfraredLightSource"], platform::Value(std::int32_t{2}));
    EXPECT_FALSE(metadata.contains("RylFloodActiveTemperature"));
    EXPECT_EQ(metadata["HardwareEvents"], platform::Value(kLast));
    EXPECT_EQ(metadata["MetaDataProjectorMode"], platform::Value(std::int64_t{3000000000}));
    EXPECT_EQ(metadata["NTCTemperatureIdle"], platform::Value(30.0));
    EXPECT_EQ(metadata["DIETemperatureIdle"], platform::Value("warm"));
    EXPECT_EQ(metadata["own"]["list"],
              platform::Value(platform::List{true, platform::Value(), std::int32_t{-1}}));
    EXPECT_EQ(stream.lightSources, (std::vector<std::int32_t>{0, 1}));
    EXPECT_EQ(*stream.warming.find("NTCTemperatureIdle"), 4);
    EXPECT_FALSE(stream.warming.contains("DIETemperatureIdle"));

    ASSERT_THAT(stream.overrides, SizeIs(4));
    const auto& dark = stream.overrides[0];
    EXPECT_EQ(std::pair(dark.firstFrame, dark.lastFrame), std::pair(3UL, 3UL));
    EXPECT_EQ(*dark.set.find("RylInfraredLightSource"), platform::Value(0));
    EXPECT_THAT(dark.remove, ElementsAre("HardwareEvents"));
    const auto& missing = stream.overrides[1];
    EXPECT_EQ(std::pair(missing.firstFrame, missing.lastFrame), std::pair(4UL, 6UL));
    EXPECT_TRUE(missing.noMetadata && !missing.metadataIsNoDictionary && !missing.dropped);
    const auto& corrupt = stream.overrides[2];
    EXPECT_EQ(std::pair(corrupt.firstFrame, corrupt.lastFrame), std::pair(7UL, kLast));
    EXPECT_TRUE(corrupt.metadataIsNoDictionary && !corrupt.noMetadata);
    const auto& dropped = stream.overrides[3];
    EXPECT_EQ(std::pair(dropped.firstFrame, dropped.lastFrame), std::pair(1UL, kLast));
    EXPECT_TRUE(dropped.dropped);
    ASSERT_THAT(stream.events, SizeIs(1));
    EXPECT_EQ(std::tuple(stream.events[0].frame, stream.events[0].code, stream.events[0].info),
              std::tuple(2, -4, 5));
    EXPECT_EQ(stream.jitterMicroseconds, 12.5);
    EXPECT_EQ(stream.seed, 9U);
    EXPECT_EQ(stream.stallAfterFrame, 0U);
    EXPECT_EQ(stream.framesAfterStop, 3U);
}

TEST_F(ProfileReader, ReadsEveryKeyOfTheCountersTheHidBusAndTheDisplay) {
    const DeviceProfile device = load(fileOfTests("every_key.json"));
    const auto& counters = device.meterix;
    EXPECT_TRUE(counters.report.fails() && counters.firstSnapshot.fails() &&
                counters.laterSnapshots.fails() && counters.difference.fails());
    EXPECT_THAT(counters.channels, SizeIs(64));
    int seen = 0;
    for (const auto& channel : counters.channels) {
        EXPECT_NE(channel.name, "Number YB FAULT_B");
        if (channel.name == "Number Xel INT_FAULT_CC") {
            EXPECT_EQ(channel.count, 3U);
            EXPECT_EQ(std::tuple(channel.risePerSecond, channel.riseAtFrame, channel.riseBy),
                      std::tuple(0.5, 10, 2));
            ++seen;
        } else if (channel.name == "Number YB FAULT_A") {
            EXPECT_EQ(channel.count, std::nullopt);
            ++seen;
        }
    }
    EXPECT_EQ(seen, 2);
    EXPECT_EQ(counters.channels.back().count, 0U);

    EXPECT_FALSE(device.hid.managerAvailable);
    ASSERT_THAT(device.hid.devices, SizeIs(3));
    const auto& sensor = device.hid.devices[0];
    EXPECT_EQ(std::tie(sensor.product, sensor.usagePage, sensor.usage),
              std::make_tuple("Kirra", 65281, 37));
    EXPECT_TRUE(sensor.open.fails() && sensor.close.fails());
    EXPECT_TRUE(sensor.featureReports.at(171).fails());
    EXPECT_FALSE(sensor.featureReports.at(172).fails());
    EXPECT_FALSE(sensor.needsFeatureReports);
    EXPECT_EQ(sensor.reportsPerSecond, 60);
    EXPECT_EQ(sensor.maxReports, 0U);
    ASSERT_THAT(sensor.overrides, SizeIs(2));
    EXPECT_EQ(sensor.overrides[0].firstReport, 2U);
    EXPECT_EQ(sensor.overrides[0].lastReport, 3U);
    EXPECT_EQ(sensor.overrides[0].length, 12U);
    EXPECT_EQ(sensor.overrides[0].reportID, 119);
    EXPECT_TRUE(sensor.overrides[1].dropped);
    EXPECT_EQ(sensor.errorAtReport.value().report, 8U);
    EXPECT_THAT(sensor.errorAtReport->error, test::IsPlainError("HID", 1, "lost"));
    EXPECT_EQ(sensor.unplugAtReport, 9U);
    EXPECT_EQ(sensor.firstFrameId, 4294967295U);
    EXPECT_EQ(sensor.firstTimestamp, 50U);
    EXPECT_EQ(sensor.startTemperature, 40);
    EXPECT_EQ(sensor.temperaturePerReport, -0.5);
    const auto& scan = sensor.scan;
    EXPECT_THAT((std::vector{scan.amplitude, scan.center, scan.width, scan.frequency, scan.chirp,
                             scan.turn, scan.noise}),
                ElementsAre(1, 2, 3, 4, 5, 6, 7));
    EXPECT_EQ(device.hid.devices[2].product, "Kirra 2");
    EXPECT_EQ(device.hid.devices[2].reportsPerSecond, 20);

    const auto& display = device.display;
    EXPECT_EQ(display.mainDisplayStatus, -1);
    EXPECT_FALSE(display.registryService || display.property || display.powerInfo ||
                 display.powerPanel);
    EXPECT_EQ(display.powered, platform::Value(0));
}

}  // namespace
