#include "devices/simulator/profile/reader.h"

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

#include "devices/simulator/profile/writer.h"
#include "tests/support/is_error.h"

namespace {

namespace fs = std::filesystem;
using Json = nlohmann::ordered_json;
using simulator::DeviceProfile;
using simulator::loadProfile;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
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
    static std::vector<std::string> problemsOf(const std::string& nameOrFile) {
        std::vector<std::string> problems;
        EXPECT_FALSE(loadProfile(nameOrFile, problems).has_value()) << nameOrFile;
        return problems;
    }
    static DeviceProfile load(const std::string& nameOrFile) {
        std::vector<std::string> problems;
        auto device = loadProfile(nameOrFile, problems);
        EXPECT_THAT(problems, IsEmpty());
        return device.value_or(DeviceProfile());
    }
    static std::string fileOfTests(const std::string& name) { return ZR_PROFILE_TESTS "/" + name; }

  private:
    const fs::path _before;
    fs::path _folder;
};

using ProfileWriter = ProfileReader;

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
    const auto broken = Json::parse(file);
    ASSERT_THAT(broken, SizeIs(::testing::Gt(50U)));
    for (const auto& row : broken) {
        write("x.json", row.at("profile").dump());
        std::vector<std::string> expected;
        for (const auto& line : row.at("problems")) {
            expected.push_back("x.json: " + line.get<std::string>());
        }
        EXPECT_EQ(problemsOf("x.json"), expected);
    }
}

TEST_F(ProfileReader, TellsWhatIsNoStrictJson) {
    std::string deep;
    for (int level = 0; level < 64; ++level) {
        deep += "/0";
    }
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
        {R"({"display": {"powered": 1e999}})", "/display/powered: 1e999 is too large for a number"},
        {R"([0, {"a": [{}, -1e400]}])", "/1/a/1: -1e400 is too large for a number"},
        {"1e400", "1e400 is too large for a number"},
        {std::string(100000, '['), deep + ": nested more than 64 deep"},
        {std::string((1U << 20U) + 1, ' '), "longer than 1 MiB"},
    };
    for (const auto& [text, problem] : kCases) {
        write("x.json", text);
        EXPECT_THAT(problemsOf("x.json"), ElementsAre("x.json: " + problem)) << text.substr(0, 60);
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
        EXPECT_THAT(problemsOf(name), ElementsAre(problem));
    }

    for (int level = 0; level < 17; ++level) {
        write(std::to_string(level) + ".json",
              R"({"extends": "./)" + std::to_string(level + 1) + R"(.json"})");
    }
    write("17.json", "{}");
    EXPECT_THAT(problemsOf("0.json"),
                ElementsAre("15.json: /extends: more than 16 profiles in a row"));
    write("healthy", R"({"extends": "healthy"})");
    EXPECT_EQ(load("./healthy").name, "./healthy");
    EXPECT_EQ(load("2.json").display.powered, platform::Value(true));
}

TEST_F(ProfileReader, AnExtensionChangesWhatItNamesAndKeepsTheRest) {
    fs::create_directory("sub");
    write("sub/base.json", R"({"summary": "Base", "extends": "i2c-errors",
        "capture": {"streams": {"front-infrared": {"seed": 5, "metadata": {"+Own": 1, "+Other": 2},
            "overrides": [{"frames": "1"}, {"frames": "2"}], "faults": {"start": true}}}},
        "counters": {"channels": {"New": {"group": "g", "subgroup": "s", "count": 4}}}})");
    write("top.json", R"({"extends": "sub/base.json",
        "capture": {"streams": {"front-infrared": {"metadata": {"+Own": null, "+Other": 3},
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
    EXPECT_EQ(stream.overrides[0].frames, (simulator::NumberRange{3, 3}));
    EXPECT_FALSE(stream.start.fails());
    const auto& channel = device.meterix.channels.back();
    EXPECT_EQ(std::tie(channel.name, channel.group, channel.subgroup, channel.count),
              std::make_tuple("New", "g", "s", std::optional<std::uint64_t>(6)));
}

// What a profile gives is in the document that shows the device; null may have become nothing at all.
void expectShown(const Json& given, const Json& shown, const std::string& where) {
    if (given.is_structured() && shown.type() == given.type()) {
        EXPECT_TRUE(given.is_object() || shown.size() == given.size()) << where;
        for (const auto& [key, value] : given.items()) {
            expectShown(value,
                        given.is_object() ? shown.value(key, Json()) : shown[std::stoul(key)],
                        where + "/" + key);
        }
        return;
    }
    const bool isNothing = given.is_null() && (shown.is_null() || shown == false);
    EXPECT_TRUE(isNothing || shown == given) << where << ": " << given << " became " << shown;
}

TEST_F(ProfileWriter, ShowsAllThatAProfileGivesAndReadsItBackTheSame) {
    std::vector<std::pair<std::string, std::string>> profiles = {
        {fileOfTests("every_key.json"), fileOfTests("every_key.json")}};
    for (const auto& entry : simulator::gallery()) {
        profiles.emplace_back(entry.name, ZR_PROFILES "/" + entry.name + ".json");
    }
    for (const auto& [name, file] : profiles) {
        const std::string text = simulator::profileText(load(name));
        write("shown.json", text);
        EXPECT_EQ(simulator::profileText(load("./shown.json")), text) << name;
        std::ifstream stream(file);
        Json given = Json::parse(stream);
        given.erase("$schema");
        given["extends"] = nullptr;
        expectShown(given, Json::parse(text), name);
    }
}

// Names stay, and so does the order in which a client finds the streams.
TEST_F(ProfileWriter, KeepsStreamsThatWereRemovedRenamedAndAddedAgain) {
    write("base.json", R"({"capture": {"streams": {"rear": null, "front": {"portType": "x"}}}})");
    write("top.json", R"({"extends": "./base.json", "capture": {"streams": {
        "rear": {"portType": "front-infrared", "metadata": {"HardwareEvents": null}},
        "front": {"seed": 4}}}})");
    write("shown.json", simulator::profileText(load("top.json")));
    const auto streams = load("shown.json").capture.streams;
    ASSERT_THAT(streams, SizeIs(3));
    EXPECT_EQ(streams[0].portType, "x");
    EXPECT_EQ(streams[0].seed, 4U);
    EXPECT_EQ(streams[1].name, "front-infrared");
    EXPECT_EQ(streams[2].name, "rear");
    EXPECT_FALSE(streams[2].metadata.contains("HardwareEvents"));
    EXPECT_TRUE(streams[2].metadata.contains("DIETemperatureIdle"));
}

platform::ErrorRef errorOf(const simulator::Fault& fault) {
    platform::ErrorRef error;
    EXPECT_TRUE(fault.strikes(&error));
    return error;
}

// What the gallery does not show: which key becomes which member is seen from its outcomes.
TEST_F(ProfileReader, KeepsTheKindsOfValuesAndTheChainsOfErrors) {
    const auto capture = load(fileOfTests("every_key.json")).capture;
    ASSERT_THAT(capture.streams, SizeIs(3));
    EXPECT_EQ(errorOf(capture.invalidate), nullptr);
    const auto& stream = capture.streams[1];
    const platform::ErrorRef start = errorOf(stream.start);
    EXPECT_THAT(start, test::IsError("Outer", -3, "no start", start->underlyingError()));
    EXPECT_THAT(start->underlyingError(), test::IsPlainError("Inner", 7, "no power"));
    EXPECT_EQ(stream.errorCounters,
              platform::Value(platform::Dictionary{{"ryl.errors.i2c", 1},
                                                   {"ryl.errors.mipi", 2},
                                                   {"LPDPErrorCount", 3},
                                                   {"SIFErrorCount", "five"},
                                                   {"ProjectorErrorCount", 6.0}}));
    const auto metadata = platform::Dictionary(stream.metadata);
    EXPECT_EQ(metadata["RylInfraredLightSource"], platform::Value(std::int32_t{2}));
    EXPECT_FALSE(metadata.contains("RylFloodActiveTemperature"));
    EXPECT_EQ(metadata["HardwareEvents"], platform::Value(kLast));
    EXPECT_EQ(metadata["MetaDataProjectorMode"], platform::Value(std::int64_t{3000000000}));
    EXPECT_EQ(metadata["NTCTemperatureIdle"], platform::Value(30.0));
    EXPECT_EQ(metadata["own"]["list"],
              platform::Value(platform::List{true, platform::Value(), std::int32_t{-1}}));
    ASSERT_THAT(stream.overrides, SizeIs(4));
    EXPECT_EQ(stream.overrides[1].frames, (simulator::NumberRange{4, 6}));
    EXPECT_EQ(stream.overrides[2].frames, (simulator::NumberRange{7, kLast}));
}

}  // namespace
