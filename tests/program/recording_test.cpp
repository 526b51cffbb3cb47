// Recordings as the program makes, shows and replays them.
#include <csignal>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include <unistd.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "tests/program/program.h"
#include "tests/support/eventually.h"

namespace {

namespace fs = std::filesystem;
using nlohmann::json;
using test::Outcome;
using test::zrlab;
using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::StartsWith;

class RecordingProgram : public ::testing::Test {
  protected:
    RecordingProgram() { fs::create_directories(_folder); }
    ~RecordingProgram() override { fs::remove_all(_folder); }

    std::string path(const std::string& name) const { return (_folder / name).string(); }

    // A run of a gallery's device, or of a replay, as fast as can be.
    static Outcome run(const std::string& name,
                       const std::string& device,
                       const std::vector<std::string>& more = {}) {
        std::vector<std::string> arguments = {"run", name,    "--device", device,     "--speed",
                                              "max", "--log", "off",      "--format", "json"};
        arguments.insert(arguments.end(), more.begin(), more.end());
        return zrlab(arguments);
    }
    static json runOf(const Outcome& outcome) {
        return json::parse(outcome.output).at("runs").at(0);
    }

    const fs::path _folder =
        fs::path(::testing::TempDir()) / ("recording_program_" + std::to_string(getpid()));
};

TEST_F(RecordingProgram, AReplayHasTheRecordedParametersAndOutcome) {
    const std::string file = path("a.zrr");
    const Outcome recorded = run("VantorFaultDiagnostic", "mipi-errors",
                                 {"--set", "frameCount=3", "--set", "analysis:frameCount=2",
                                  "--set", "timeout=30", "--record", file});
    ASSERT_EQ(recorded.status, 1) << recorded.errors;
    EXPECT_FALSE(fs::exists(file + ".part"));
    const Outcome replayed = run("VantorFaultDiagnostic", "replay:" + file);
    EXPECT_EQ(replayed.status, 1) << replayed.errors;
    EXPECT_THAT(replayed.errors, IsEmpty());
    for (const char* part : {"verdict", "experiment", "analysis"}) {
        json one = runOf(recorded).at(part);
        json other = runOf(replayed).at(part);
        for (json* json : {&one, &other}) {
            if (json->is_object()) {
                json->erase("seconds");
            }
        }
        EXPECT_EQ(one, other) << part;
    }
    // By name: one that is given replaces all that were recorded.
    const auto analysis =
        runOf(run("VantorFaultDiagnostic", "replay:" + file, {"--set", "frameCount=1"}));
    EXPECT_THAT(analysis.at("analysis").dump(), HasSubstr("\"frameCount\":1"));

    const Outcome shown = zrlab({"recording", "show", file});
    EXPECT_EQ(shown.status, 0);
    EXPECT_THAT(
        shown.output,
        AllOf(StartsWith("recording   " + file), HasSubstr("\ndevice      mipi-errors: "),
              HasSubstr("\nparameters  frameCount=3, analysis:frameCount=2, timeout=30\n"),
              HasSubstr("\nrun         VantorFaultDiagnostic 1\n"), HasSubstr("\nframes      "),
              Not(HasSubstr("missing")), Not(HasSubstr("silence"))));
}

TEST_F(RecordingProgram, OtherNamesThanTheRecordedAreRefused) {
    const std::string file = path("two.zrr");
    ASSERT_EQ(
        zrlab({"run", "VantorMeterixDiagnostic", "KirraImageExperiment", "--repeat", "2", "--set",
               "images=1", "--set", "timeout=30", "--speed", "max", "--record", file})
            .status,
        0);
    const auto replay = [&](std::vector<std::string> names) {
        names.insert(names.begin(), "run");
        names.insert(names.end(), {"--speed", "max", "--device", "replay:" + file});
        return zrlab(names);
    };
    EXPECT_EQ(replay({"VantorMeterixDiagnostic", "KirraImageExperiment"}).status, 0);
    EXPECT_EQ(replay({"VantorMeterixDiagnostic"}).status, 0);
    const Outcome refused = replay({"KirraImageExperiment"});
    EXPECT_EQ(refused.status, 64);
    EXPECT_EQ(refused.errors, "zrlab: replay:" + file +
                                  ": this recording is of VantorMeterixDiagnostic, "
                                  "KirraImageExperiment; run the same, in this order\n");
    // A third repetition has no answers left.
    const Outcome third = replay({"VantorMeterixDiagnostic", "--repeat", "3"});
    EXPECT_EQ(third.status, 2);
    EXPECT_THAT(third.output + third.errors,
                HasSubstr("simpleChannels() was not recorded more often than 2 times"));
}

TEST_F(RecordingProgram, BadFilesAreNamedAndNothingIsLost) {
    const std::string file = path("a.zrr");
    ASSERT_EQ(run("VantorMeterixDiagnostic", "healthy", {"--record", file}).status, 0);
    const auto size = fs::file_size(file);
    EXPECT_THAT(run("VantorMeterixDiagnostic", "replay:" + file, {"--record", file}).errors,
                HasSubstr("already used for the device"));
    EXPECT_EQ(fs::file_size(file), size);
    std::ofstream(path("text.zrr")) << "text\n";
    for (const std::vector<std::string>& arguments : std::vector<std::vector<std::string>>{
             {"run", "VantorMeterixDiagnostic", "--device", "replay:" + path("text.zrr")},
             {"recording", "show", path("text.zrr")},
             {"recording", "profile", path("text.zrr")}}) {
        const Outcome outcome = zrlab(arguments);
        EXPECT_EQ(outcome.status, 64);
        EXPECT_EQ(outcome.errors, "zrlab: " + path("text.zrr") + ": not a recording\n");
    }
    EXPECT_EQ(run("VantorMeterixDiagnostic", "healthy", {"--record", path("no/a.zrr")}).status, 64);
}

TEST_F(RecordingProgram, WhatAKilledProgramLeftIsReplayed) {
    const std::string file = path("long.zrr");
    {
        test::Program program({ZR_PROGRAM, "run", "VantorFaultDiagnostic", "--set",
                               "frameCount=100000", "--set", "timeout=3600", "--log", "debug",
                               "--record", file});
        EXPECT_TRUE(program.waitForError("Received frame 5."));
        EXPECT_TRUE(test::eventually([&] {
            return zrlab({"recording", "show", file + ".part"}).output.find("frames") !=
                   std::string::npos;
        }));
        program.signal(SIGKILL);
        program.finish();
    }
    EXPECT_THAT(zrlab({"recording", "show", file + ".part"}).output,
                HasSubstr("\nmissing     the recording is cut: it ends at byte "));
    const Outcome replayed = run("VantorFaultDiagnostic", "replay:" + file + ".part",
                                 {"--set", "frameCount=2", "--set", "timeout=30"});
    EXPECT_EQ(replayed.status, 2);  // the recording has no stop
    EXPECT_THAT(replayed.errors, HasSubstr("warning: the recording is cut"));
    EXPECT_THAT(runOf(replayed).at("failures").dump(), HasSubstr("Failed to stop stream!"));
}

// Written by an earlier program: what it wrote is still read.
TEST_F(RecordingProgram, TheShippedRecordingShowsItsFailure) {
    const std::string file = std::string(ZR_RECORDINGS) + "/board-14.zrr";
    EXPECT_LE(fs::file_size(file), 200'000U);
    const Outcome outcome = RecordingProgram::run("VantorFaultDiagnostic", "replay:" + file);
    ASSERT_EQ(outcome.status, 1) << outcome.errors;
    const json run = runOf(outcome);
    std::vector<std::string> outside;
    for (const json& result : run.at("results")) {
        if (result.at("judgement") == "outside") {
            outside.push_back(result.at("name"));
        }
    }
    EXPECT_THAT(outside,
                ::testing::ElementsAre("Number Xel INT_FAULT_SHORTANODE_LATCH", "MIPI Errors"));
    EXPECT_EQ(run.at("framesLost"), 3);
}

// The profile fails as the recorded device did.
TEST_F(RecordingProgram, AProfileOfARecordingHasItsOutcome) {
    const struct {
        const char* device;
        const char* name;
        std::vector<std::string> parameters;
    } cases[] = {
        {"counter-stuck", "VantorMeterixDiagnostic", {}},
        {"counter-without-count", "VantorMeterixDiagnostic", {}},
        {"unlit-frame", "VantorFaultDiagnostic", {"--set", "frameCount=30", "--set", "timeout=30"}},
        {"mipi-errors", "VantorFaultDiagnostic", {"--set", "frameCount=3", "--set", "timeout=30"}},
        {"frames-stall", "VantorFaultDiagnostic", {"--set", "frameCount=30", "--set", "timeout=1"}},
        {"light-source-refused",
         "VantorFaultDiagnostic",
         {"--set", "frameCount=3", "--set", "timeout=30"}},
        {"sensor-unplugged", "KirraImageExperiment", {"--set", "images=5", "--set", "timeout=30"}},
        {"sensor-error-midstream",
         "KirraImageExperiment",
         {"--set", "images=5", "--set", "timeout=30"}},
        {"display-off", "KirraImageExperiment", {"--set", "images=5", "--set", "timeout=30"}},
    };
    for (const auto& one : cases) {
        SCOPED_TRACE(one.device);
        auto parameters = one.parameters;
        parameters.insert(parameters.end(), {"--record", path("a.zrr")});
        const Outcome recorded = run(one.name, one.device, parameters);
        const Outcome profile = zrlab({"recording", "profile", path("a.zrr")});
        ASSERT_EQ(profile.status, 0) << profile.errors;
        std::ofstream(path("a.json")) << profile.output;
        EXPECT_EQ(zrlab({"device", "check", path("a.json")}).status, 0);
        const Outcome again = run(one.name, path("a.json"), one.parameters);
        ASSERT_EQ(again.status, recorded.status) << again.errors;
        EXPECT_EQ(runOf(again).at("failures"), runOf(recorded).at("failures"));
        EXPECT_EQ(runOf(again).at("imagesDelivered"), runOf(recorded).at("imagesDelivered"));
    }
}

}  // namespace
