// zrlab campaign: what it finds in runs whose faults are known, and what it refuses.
#include <algorithm>
#include <filesystem>
#include <fstream>
#include <map>
#include <string>
#include <utility>
#include <vector>

#include <gmock/gmock.h>
#include <nlohmann/json.hpp>

#include "tests/program/program.h"

namespace {

using Json = nlohmann::json;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;

test::Outcome campaign(std::vector<std::string> arguments) {
    arguments.insert(arguments.begin(), "campaign");
    // The program waits for signals on a thread when it forks; a process of a run may start threads all the same.
    return test::zrlab(std::move(arguments), {"TSAN_OPTIONS=die_after_fork=0"});
}

// The faults of a campaign by their outcomes.
std::map<std::string, std::vector<Json>> byOutcome(const Json& found) {
    std::map<std::string, std::vector<Json>> faults;
    for (const Json& fault : found.at("faults")) {
        faults[fault.at("outcome")].push_back(fault);
    }
    return faults;
}

TEST(Campaign, FindsWhatADiagnosticCatchesAndWhatItDoesNot) {
    const auto done =
        campaign({"VantorMeterixDiagnostic", "VantorMeterixDiagnostic", "--format", "json"});
    ASSERT_EQ(done.status, 0) << done.errors;
    const Json found = Json::parse(done.output);
    auto faults = byOutcome(found);
    EXPECT_EQ(found["runs"].size(), 1);
    EXPECT_EQ(found["counts"]["caught"], faults["CAUGHT"].size());
    EXPECT_EQ(found["counts"]["notCaught"], faults["NOT CAUGHT"].size());
    EXPECT_EQ(found["counts"]["faults"], found["faults"].size());

    const auto fault = [&](const std::string& kind, const std::string& subject) {
        const Json& all = found["faults"];
        const auto place = std::find_if(all.begin(), all.end(), [&](const Json& one) {
            return one["kind"] == kind && one["subject"] == subject;
        });
        return place == all.end() ? Json() : *place;
    };
    const std::string run = "VantorMeterixDiagnostic";
    const Json counted = fault("one more from the start", "Number YB FAULT_UV");
    EXPECT_EQ(counted["outcome"], "CAUGHT");
    EXPECT_EQ(counted["runs"][run]["why"], "limit: Number YB FAULT_UV");
    const Json refused = fault("fails with an error object", "1st call: simpleChannels");
    EXPECT_THAT(refused["runs"][run]["why"].get<std::string>(),
                HasSubstr("Could not get simple channels."));
    // A counter that nobody asks for, and a camera that this run does not use.
    EXPECT_EQ(fault("missing", "V0P0")["outcome"], "NOT CAUGHT");
    EXPECT_TRUE(fault("at 1", "i2c").is_null());
}

TEST(Campaign, ShowsWhatTheLimitsOfTheBenchAdd) {
    const std::vector<std::string> asked = {
        "KirraImageExperiment", "--set", "images=2", "--set", "timeout=1", "--jobs", "8"};
    std::vector<std::string> limited = asked;
    limited.insert(limited.end(), {"--limits", ZR_LIMITS "/coverage.json"});
    for (const auto& [arguments, outcome] :
         {std::pair(asked, "NOT CAUGHT"), std::pair(limited, "CAUGHT BY THE BENCH")}) {
        const std::string file = testing::TempDir() + "campaign.json";
        std::vector<std::string> all = arguments;
        all.insert(all.end(), {"--output", file});
        const auto done = campaign(all);
        ASSERT_EQ(done.status, 0) << done.errors;
        EXPECT_THAT(done.output, HasSubstr(" faults caught ("));
        std::ifstream input(file);
        const auto faults = byOutcome(Json::parse(input))[outcome];
        EXPECT_TRUE(std::any_of(faults.begin(), faults.end(), [](const Json& fault) {
            return fault["kind"] == "no echo" && fault["group"] == "sensor images";
        })) << outcome;
    }
}

TEST(Campaign, GivesADeviceModuleItsFaultsAndOutlivesACrash) {
    const std::string module = ZR_TEST_MODULES "/fragile.so";
    const auto done = campaign({"VantorMeterixDiagnostic", "--device-module", module, "--device",
                                "fragile:", "--format", "json"});
    ASSERT_EQ(done.status, 1) << done.errors;
    const Json found = Json::parse(done.output);
    EXPECT_EQ(found["counts"]["crashedOrHung"], 1);
    std::map<std::string, std::string> ends;
    for (const Json& fault : found["faults"]) {
        if (fault["group"] == "board") {
            const Json& run = fault["runs"]["VantorMeterixDiagnostic"];
            ends[fault["kind"]] =
                run["outcome"].get<std::string>() + ": " + run["why"].get<std::string>();
        }
    }
    EXPECT_THAT(ends["stuck"], StartsWith("CAUGHT: limit: "));
    EXPECT_EQ(ends["crashes"], "CRASHED: ended by signal 6 (ABRT)");
}

TEST(Campaign, RefusesWhatItCannotLearnFrom) {
    struct Case {
        std::vector<std::string> arguments;
        int status;
        std::string problem;
    };
    const Case cases[] = {
        {{"VantorMeterixDiagnostic", "--device", "counter-stuck"},
         2,
         "zrlab: campaign: VantorMeterixDiagnostic does not pass on counter-stuck, without a "
         "fault: limit: "},
        {{"Nothing"}, 64, "zrlab: unknown "},
        {{"--device", "unknown"}, 64, "zrlab: unknown device \"unknown\""},
        {{"--output", "a.html", "--format", "json"},
         64,
         "zrlab: campaign: --output a.html: its ending asks for html, --format for json"},
        {{"--limits", "/nowhere.json"}, 64, "zrlab: --limits /nowhere.json: "},
        {{"--output", "/nowhere/faults.html"}, 64, "zrlab: "},
        {{"--jobs", "0"}, 64, "zrlab: campaign: --jobs"},
    };
    for (const Case& one : cases) {
        const auto done = campaign(one.arguments);
        EXPECT_EQ(done.status, one.status) << one.problem;
        EXPECT_THAT(done.errors, StartsWith(one.problem));
        EXPECT_THAT(done.output, IsEmpty());
    }
}

}  // namespace
