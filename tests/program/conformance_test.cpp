// zrlab conformance: its report and status, a recording, and what it refuses.
#include <filesystem>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <nlohmann/json.hpp>

#include "tests/program/program.h"

namespace {

using Json = nlohmann::json;
using test::zrlab;
using testing::HasSubstr;
using testing::IsEmpty;

TEST(Conformance, ReportsARunForEachServiceOfTheDevice) {
    const auto done = zrlab({"conformance", "--speed", "max", "--format", "json"});
    EXPECT_EQ(done.status, 0) << done.errors;
    std::vector<std::string> runs;
    const Json report = Json::parse(done.output);
    for (const Json& run : report.at("runs")) {
        EXPECT_EQ(run.at("verdict"), "PASS");
        EXPECT_THAT(run.at("results"), testing::Not(IsEmpty()));
        runs.push_back(run.at("name"));
    }
    EXPECT_THAT(runs, testing::ElementsAre("meterix", "display", "hid", "capture"));
}

TEST(Conformance, OfARecordingLeavesOutWhatItDoesNotShow) {
    const std::string file = testing::TempDir() + "conformance.zrr";
    ASSERT_EQ(zrlab({"run", "VantorFaultDiagnostic", "--set", "frameCount=40", "--set",
                     "timeout=60", "--speed", "max", "--record", file})
                  .status,
              0);
    std::vector<std::string> arguments = {
        "conformance", "--device", "replay:" + file, "--speed", "max", "--format", "json"};
    const auto done = zrlab(arguments);
    arguments.insert(arguments.begin() + 1, {"hid", "capture"});
    const auto asked = zrlab(arguments);
    std::filesystem::remove(file);
    ASSERT_EQ(done.status, 0) << done.errors;
    EXPECT_EQ(asked.status, 2) << "hid was asked for";
    for (const auto& each : {done, asked}) {
        EXPECT_THAT(each.errors, HasSubstr("zrlab: hid: not checked: "));
        EXPECT_EQ(Json::parse(each.output).at("runs").back().at("name"), "capture");
    }
    const Json run = Json::parse(done.output).at("runs").back();
    EXPECT_THAT(run.at("results").dump(), HasSubstr("time going backwards"));
    EXPECT_THAT(run.at("benchResults").dump(),
                testing::AllOf(HasSubstr("buffer reused while referenced"),
                               HasSubstr("not checked: a recording does not show it")));
}

TEST(Conformance, RefusesServicesThatThereAreNot) {
    struct Case {
        std::vector<std::string> arguments;
        int status;
        std::string problem;
    };
    const Case cases[] = {
        {{"conformance", "hdi"},
         64,
         "zrlab: conformance: unknown service \"hdi\"; did you mean hid?"},
        {{"conformance", "capture", "--device", "no-capture-plug-in"},
         64,
         "zrlab: conformance: no-capture-plug-in has no service \"capture\""},
        {{"conformance", "--device", "unknown"}, 64, "zrlab: unknown device \"unknown\""},
    };
    for (const Case& one : cases) {
        const auto done = zrlab(one.arguments);
        EXPECT_EQ(done.status, one.status) << one.problem;
        EXPECT_THAT(done.errors, HasSubstr(one.problem));
        EXPECT_THAT(done.output, IsEmpty());
    }
}

}  // namespace
