#include "host/report/jsonl_report.h"

#include <latch>
#include <map>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include <gmock/gmock.h>
#include <nlohmann/json.hpp>

#include "host/report/replay.h"
#include "tests/host/report/sample_sessions.h"

namespace {

using Json = nlohmann::json;

// Every artifact of the session, after a check that lines are whole and numbered without gaps; without
// number and time.
std::vector<Json> artifactsOf(const host::SessionRecord& session) {
    std::vector<Json> artifacts;
    host::JsonlReport report([&artifacts](std::string_view lines) {
        EXPECT_EQ(lines.back(), '\n');
        std::istringstream whole{std::string(lines)};
        for (std::string line; std::getline(whole, line);) {
            Json artifact = Json::parse(line);
            EXPECT_EQ(artifact["sequenceNumber"], artifacts.size());
            EXPECT_EQ(artifact["timestamp"].get<std::string>().back(), 'Z');
            artifact.erase("sequenceNumber");
            artifact.erase("timestamp");
            artifacts.push_back(std::move(artifact));
        }
    });
    host::replay(session, report);
    return artifacts;
}

void expectArtifacts(const std::vector<Json>& artifacts, const std::vector<std::string>& expected) {
    ASSERT_EQ(artifacts.size(), expected.size());
    for (std::size_t at = 0; at < expected.size(); ++at) {
        EXPECT_EQ(artifacts[at], Json::parse(expected[at])) << "artifact " << at;
    }
}

std::string step(const std::string& id, const std::string& content) {
    return R"({"testStepArtifact": {"testStepId": ")" + id + "\", " + content + "}}";
}

// Of a first run; those of the samples have no UUID unless a test gives them one.
constexpr const char* kRunExtension =
    R"("extension": {"name": "run", "content": {"uuid": "", "number": 1}})";

TEST(JsonlReport, WritesAJudgedDiagnostic) {
    const std::string e = "0-Diagnostic-1-experiment";
    const std::string a = "1-Diagnostic-1-analysis";
    expectArtifacts(
        artifactsOf(test::judgedSession()),
        {R"({"schemaVersion": {"major": 2, "minor": 0}})",
         R"({"testRunArtifact": {"testRunStart": {
             "name": "zrlab", "version": "1.0.0",
             "commandLine": "zrlab run Diagnostic --set frameCount=90",
             "parameters": {"Diagnostic": {"experiment": {"frameCount": 90},
                                           "analysis": {"frameCount": 80.5}}},
             "dutInfo": {
               "dutInfoId": "healthy", "name": "healthy",
               "platformInfos": [{"info": "simulated device"}],
               "softwareInfos": [{"softwareInfoId": "zrlab", "name": "zrlab", "version": "1.0.0",
                                  "softwareType": "APPLICATION"}],
               "hardwareInfos": [{"hardwareInfoId": "device", "name": "healthy"}],
               "metadata": {"summary": "A device without faults"}},
             "metadata": {"station": "desk"}}}})",
         step(e, R"("testStepStart": {"name": "Experiment"})"), step(e, kRunExtension),
         step(e, R"("log": {"severity": "INFO", "message": "Diagnostic"})"),
         R"({"testRunArtifact": {"log": {"severity": "ERROR", "message": "late: time-out"}}})",
         step(e, R"("measurement": {"name": "Diagnostic", "value": 3.0, "unit": "events",
                                    "hardwareInfoId": "device"})"),
         step(e, R"("measurement": {"name": "Infinite", "value": "inf",
                                    "hardwareInfoId": "device"})"),
         step(e, R"("testStepEnd": {"status": "COMPLETE"})"),
         step(a, R"("testStepStart": {"name": "Analysis"})"),
         step(a, R"("measurement": {"name": "closed", "value": 0.0, "unit": "events",
             "hardwareInfoId": "device", "validators": [
               {"name": "Diagnostic", "type": "GREATER_THAN_OR_EQUAL", "value": 0.0},
               {"name": "Diagnostic", "type": "LESS_THAN_OR_EQUAL", "value": 0.0}]})"),
         step(a, R"("measurement": {"name": "above", "value": 3.0, "unit": "events",
             "hardwareInfoId": "device", "validators": [
               {"name": "Diagnostic", "type": "GREATER_THAN_OR_EQUAL", "value": 0.0},
               {"name": "Diagnostic", "type": "LESS_THAN_OR_EQUAL", "value": 0.5}]})"),
         step(a, R"("measurement": {"name": "open", "value": 30.0, "unit": "events",
             "hardwareInfoId": "device", "validators": [
               {"name": "Diagnostic", "type": "GREATER_THAN", "value": 30.0}]})"),
         step(a, R"("measurement": {"name": "nan", "value": "nan", "unit": "events",
             "hardwareInfoId": "device", "validators": [
               {"name": "Diagnostic", "type": "LESS_THAN", "value": "inf"}]})"),
         step(a, R"("measurement": {"name": "Diagnostic", "value": 1.25, "unit": "frames",
                                    "hardwareInfoId": "device"})"),
         step(a, R"("diagnosis": {"verdict": "Diagnostic-fail", "type": "FAIL",
             "message": "3 of 4 limits not met", "hardwareInfoId": "device"})"),
         step(a, R"("testStepEnd": {"status": "COMPLETE"})"),
         R"({"testRunArtifact": {"testRunEnd": {"status": "COMPLETE", "result": "FAIL"}}})"});
}

TEST(JsonlReport, WritesErrorsWhereTheyBelong) {
    std::vector<Json> artifacts = artifactsOf(test::brokenSession());
    artifacts.erase(artifacts.begin(), artifacts.begin() + 2);  // version and start
    const std::string e = "0-Broken-1-experiment";
    expectArtifacts(
        artifacts,
        {step(e, R"("testStepStart": {"name": "Experiment"})"), step(e, kRunExtension),
         step(e, R"x("error": {"symptom": "PlugInErrorDomain-204", "softwareInfoIds": ["zrlab"],
             "message": "experiment Experiment, run: Failed to start streaming. (PlugInErrorDomain 204))x"
                 "; caused by: Start was refused (Capture 7); caused by: Stream is busy (Service "
                 "-3)\"}"),
         step(e, R"("error": {"symptom": "experiment-teardown", "softwareInfoIds": ["zrlab"],
             "message": "experiment Experiment, teardown: No manager available?!"})"),
         step(e, R"("diagnosis": {"verdict": "Broken-error", "type": "UNKNOWN",
             "message": "did not complete", "hardwareInfoId": "device"})"),
         step(e, R"("testStepEnd": {"status": "ERROR"})"),
         R"({"testRunArtifact": {"error": {"symptom": "experiment-device",
             "softwareInfoIds": ["zrlab"],
             "message": "experiment Experiment, device: property written too early"}}})",
         R"({"testRunArtifact": {"testRunEnd": {"status": "ERROR", "result": "NOT_APPLICABLE"}}})"});
}

TEST(JsonlReport, WritesEachImageAndNoDiagnosisOfAnExperiment) {
    const std::vector<Json> artifacts = artifactsOf(test::imagesSession(10));
    ASSERT_EQ(artifacts.size(), 16U);
    const Json& image = artifacts[11]["testStepArtifact"]["extension"];
    EXPECT_EQ(image["name"], "images");
    EXPECT_EQ(image["content"]["frameID"], 107);
    EXPECT_EQ(image["content"]["dScanI"].size(), 48U);
    EXPECT_EQ(image["content"]["tmonDataInC"], "nan");
}

TEST(JsonlReport, WritesEachQuantityOfTheFramesAsASeries) {
    host::SessionRecord session = test::streamedSession(42);
    session.runs.front().log.clear();
    std::map<std::string, std::vector<Json>> series;
    std::map<std::string, std::string> idOf;
    for (const Json& artifact : artifactsOf(session)) {
        const Json content = artifact.value("testStepArtifact", Json::object());
        if (content.contains("measurementSeriesStart")) {
            const Json& start = content["measurementSeriesStart"];
            idOf[start["name"]] = start["measurementSeriesId"];
        } else if (content.contains("measurementSeriesElement")) {
            const Json& element = content["measurementSeriesElement"];
            series[element["measurementSeriesId"]].push_back(element);
        }
    }
    EXPECT_EQ(series.size(), 2U + 1 + host::kTemperatureCount);
    const auto& intervals = series[idOf["frame interval, device's clock"]];
    ASSERT_EQ(intervals.size(), 41U);
    EXPECT_EQ(intervals[0]["metadata"], Json({{"frame", 2}}));
    EXPECT_NEAR(intervals[39]["value"], 66.67, 0.01);
    EXPECT_EQ(intervals[39]["metadata"], Json({{"frame", 41}, {"sensorFrame", 42}}));
    const auto& light = series[idOf["light source"]];
    EXPECT_EQ(light[1]["value"], 2.0);
    EXPECT_EQ(light[0]["timestamp"], "2026-11-24T17:34:07.201Z");  // 0.2 s after the run's start
    EXPECT_EQ(series[idOf["RylFloodActiveTemperature"]].size(), 22U);
}

TEST(JsonlReport, ClosesWhatWasInterruptedAndSkipsWhatWasNotStarted) {
    const std::vector<Json> artifacts = artifactsOf(test::interruptedSession());
    const std::string given = "2-FaultDiagnostic-1-experiment";
    const std::string skipped = "3-ImageExperiment-not-started";
    expectArtifacts(
        {artifacts.end() - 8, artifacts.end()},
        {step(given, R"("measurementSeriesEnd": {"measurementSeriesId": "series-19",
                                                 "totalCount": 20})"),
         step(given, R"("diagnosis": {"verdict": "FaultDiagnostic-interrupted", "type": "UNKNOWN",
             "message": "stopped after 37 of 90 frames", "hardwareInfoId": "device"})"),
         step(given, R"("testStepEnd": {"status": "ERROR"})"),
         step(skipped, R"("testStepStart": {"name": "Experiment"})"),
         step(skipped, R"("log": {"severity": "INFO", "message": "not started"})"),
         step(skipped, R"("testStepEnd": {"status": "SKIP"})"),
         R"({"testRunArtifact": {"error": {"symptom": "interrupted", "softwareInfoIds": ["zrlab"],
             "message": "FaultDiagnostic stopped after 37 of 90 frames"}}})",
         R"({"testRunArtifact": {"testRunEnd": {"status": "ERROR", "result": "NOT_APPLICABLE"}}})"});
}

TEST(JsonlReport, CarriesHostileNames) {
    const std::vector<Json> artifacts = artifactsOf(test::judgedSession(test::kHostile));
    const std::string readBack =
        "a<b>&\"c'\x01\n\xEF\xBF\xBD"
        "end";
    EXPECT_EQ(artifacts[4]["testStepArtifact"]["log"]["message"], readBack);
    EXPECT_EQ(artifacts[6]["testStepArtifact"]["measurement"]["name"], readBack);
}

// Lines from many threads, before, inside, between and after the steps of two runs.
TEST(JsonlReport, KeepsLinesWholeWhateverThreadLogs) {
    constexpr int kThreads = 4;
    constexpr int kLines = 500;
    std::vector<std::string> lines;
    host::JsonlReport report([&lines](std::string_view some) {
        std::istringstream whole{std::string(some)};
        for (std::string line; std::getline(whole, line);) {
            lines.push_back(std::move(line));
        }
    });
    const host::LogRecord line{platform::Date::now(), platform::LogLevel::Default, "line"};
    report.logged(line);
    {
        std::latch start(kThreads + 1);
        std::vector<std::jthread> threads;
        threads.reserve(kThreads);
        for (int thread = 0; thread < kThreads; ++thread) {
            threads.emplace_back([&] {
                start.arrive_and_wait();
                for (int at = 0; at < kLines; ++at) {
                    report.logged(line);
                }
            });
        }
        start.arrive_and_wait();
        host::replay(test::mixedSession(), report);
        const std::size_t atTheEnd = lines.size();
        threads.clear();
        EXPECT_EQ(lines.size(), atTheEnd);
    }
    report.logged(line);

    std::string open;
    for (std::size_t at = 0; at < lines.size(); ++at) {
        const Json artifact = Json::parse(lines[at]);
        ASSERT_EQ(artifact["sequenceNumber"], at);
        if (artifact.contains("testStepArtifact")) {
            const Json& content = artifact["testStepArtifact"];
            if (content.contains("testStepStart")) {
                open = content["testStepId"];
            }
            ASSERT_EQ(content["testStepId"], open) << lines[at];
            if (content.contains("testStepEnd")) {
                open.clear();
            }
        }
    }
    EXPECT_EQ(Json::parse(lines[1])["testRunArtifact"]["log"]["message"], "line");
    EXPECT_TRUE(Json::parse(lines.back())["testRunArtifact"].contains("testRunEnd"));
}

// For the check against the standard's schemas.
TEST(JsonlReport, WritesSampleOutputs) {
    for (const auto& [name, session] : test::sampleSessions()) {
        if (name.starts_with("long")) {
            continue;  // more of the same lines
        }
        std::string output;
        host::JsonlReport report([&output](std::string_view line) { output += line; });
        host::replay(session, report);
        test::writeSample(name + ".jsonl", output);
    }
}

// In the last step, before its diagnosis.
TEST(JsonlReport, MarksWhatTheLimitsOfTheBenchFound) {
    std::vector<Json> artifacts = artifactsOf(test::benchSession());
    const std::string a = "1-FaultDiagnostic-1-analysis";
    const std::vector<Json> last(artifacts.end() - 6, artifacts.end() - 2);
    expectArtifacts(
        last,
        {step(a,
              R"("measurement": {"name": "frame interval, greatest", "value": 133.5, "unit": "ms",
             "hardwareInfoId": "device",
             "validators": [{"name": "Desk", "type": "LESS_THAN", "value": 40.0}],
             "metadata": {"judgedBy": "bench", "partOfVerdict": true}})"),
         step(a, R"("error": {"symptom": "bench-limit-not-measured", "message":
             "Flood active, greatest: not measured, Desk: < 40; no frame has it",
             "softwareInfoIds": ["zrlab"]})"),
         step(a, R"("measurement": {"name": "NTC active, greatest", "value": 71.0,
             "hardwareInfoId": "device",
             "validators": [{"name": "Desk", "type": "LESS_THAN", "value": 40.0}],
             "metadata": {"judgedBy": "bench", "partOfVerdict": false}})"),
         step(a, R"("diagnosis": {"verdict": "FaultDiagnostic-fail", "type": "FAIL", "message":
             "all 61 limits met; 2 of 4 bench limits not met, 1 not measured",
             "hardwareInfoId": "device"})")});
}

}  // namespace
