#include "host/report/json_report.h"

#include <gmock/gmock.h>
#include <nlohmann/json.hpp>

#include "tests/host/report/sample_sessions.h"

namespace {

using Json = nlohmann::json;

// What stands at that place of the session's report.
Json at(const host::SessionRecord& session, const char* pointer) {
    return Json::parse(host::jsonReport(session)).at(Json::json_pointer(pointer));
}

TEST(JsonReport, HoldsWhatEachRepetitionFound) {
    const host::SessionRecord session = test::repeatedSession();
    const Json limit =
        Json::parse(R"({"name": "Max Reports", "lower": {"value": 0.0, "open": false},
                                       "upper": {"value": 0.0, "open": false}})");
    EXPECT_EQ(at(session, "/repeats/0/results/17"), Json({{"name", "Number of Channel 17"},
                                                          {"unit", "events"},
                                                          {"runs", 19},
                                                          {"outside", 2},
                                                          {"minimum", 0.0},
                                                          {"median", 0.5},
                                                          {"maximum", 3.0},
                                                          {"limit", limit}}));
    EXPECT_EQ(at(session, "/repeats/0/notPassed/0"),
              Json({{"run", 7},
                    {"verdict", "FAIL"},
                    {"seconds", 3.25},
                    {"why", "Number of Channel 17 is 3 events"},
                    {"failures", Json::array()},
                    {"outside", Json::array({{{"name", "Number of Channel 17"},
                                              {"value", 3.0},
                                              {"unit", "events"},
                                              {"judgement", "outside"},
                                              {"limit", limit}}})},
                    {"bench", Json::array()}}));
    EXPECT_EQ(at(session, "/repeats/0/notPassed/1/failures/0"), Json::parse(R"({
        "part": "experiment", "step": "run", "message": "Failed to start streaming.",
        "error": {"domain": "PlugInErrorDomain", "code": 204,
                  "description": "Failed to start streaming.",
                  "underlying": {"domain": "Capture", "code": 7, "description": "Start was refused",
                                 "underlying": {"domain": "Service", "code": -3,
                                                "description": "Stream is busy"}}}})"));
    EXPECT_EQ(at(session, "/repeats/0/outcomes/9"), Json({{"verdict", "FAIL"}, {"seconds", 3.75}}));
    EXPECT_EQ(at(session, "/runs/0/run"), 7);
}

TEST(JsonReport, HoldsFramesLateLinesAndWhatWasNotStarted) {
    const host::SessionRecord session = test::interruptedSession();
    EXPECT_EQ(at(session, "/verdict"), "INTERRUPTED");
    EXPECT_EQ(at(session, "/notStarted"), Json::array({"ImageExperiment"}));
    EXPECT_EQ(at(session, "/runs/0/framesLost"), 1);
    EXPECT_EQ(at(session, "/runs/1/framesDelivered"), 37);
    EXPECT_EQ(at(session, "/runs/0/frames/40/number"), 41);
    EXPECT_EQ(at(session, "/runs/0/frames/40/sensorNumber"), 42);
    EXPECT_EQ(at(test::brokenSession(), "/runs/0/framesLost"), Json());
    const Json log = at(test::judgedSession(), "/runs/0/log");
    EXPECT_FALSE(log[0].contains("late"));
    EXPECT_EQ(log[1]["late"], true);
}

TEST(JsonReport, HoldsWhatTheLimitsOfTheBenchFound) {
    EXPECT_EQ(at(test::benchSession(), "/runs/0/benchResults/2"), Json::parse(R"({
        "name": "Flood active, greatest", "value": null, "unit": "", "judgement": "not measured",
        "limit": {"name": "Desk", "lower": null, "upper": {"value": 40.0, "open": true}},
        "partOfVerdict": true, "note": "no frame has it"})"));
    EXPECT_EQ(at(test::benchSession(), "/runs/0/benchResults/3/partOfVerdict"), false);
}

}  // namespace
