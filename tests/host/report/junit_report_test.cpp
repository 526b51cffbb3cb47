#include "host/report/junit_report.h"

#include <string>

#include <gmock/gmock.h>
#include <pugixml.hpp>

#include "tests/host/report/sample_sessions.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;

class JunitReport : public testing::Test {
  protected:
    // The one suite of the session's report.
    pugi::xml_node suiteOf(const host::SessionRecord& session) {
        const std::string xml = host::junitReport(session);
        EXPECT_TRUE(_document.load_string(xml.c_str())) << xml;
        return _document.child("testsuites").child("testsuite");
    }
    pugi::xml_node caseOf(const host::SessionRecord& session, const char* name) {
        return suiteOf(session).find_child_by_attribute("testcase", "name", name);
    }
    static std::string property(pugi::xml_node suite, const char* name) {
        return suite.child("properties")
            .find_child_by_attribute("name", name)
            .attribute("value")
            .value();
    }
    static std::vector<int> counts(pugi::xml_node node) {
        return {node.attribute("tests").as_int(-1), node.attribute("failures").as_int(-1),
                node.attribute("errors").as_int(-1), node.attribute("skipped").as_int(-1)};
    }
    pugi::xml_document _document;
};

TEST_F(JunitReport, HasACaseForEachResult) {
    const pugi::xml_node suite = suiteOf(test::judgedSession());
    EXPECT_STREQ(suite.attribute("name").value(), "Diagnostic");
    EXPECT_STREQ(suite.attribute("timestamp").value(), "2026-11-24T17:34:07.001Z");
    EXPECT_STREQ(suite.attribute("time").value(), "3.250");
    EXPECT_THAT(counts(suite), ElementsAre(5, 3, 0, 0));
    EXPECT_THAT(counts(suite.parent()), ElementsAre(5, 3, 0, -1));  // "skipped" is a suite's
    EXPECT_EQ(property(suite, "experiment.frameCount"), "90");
    EXPECT_EQ(property(suite, "analysis.frameCount"), "80.5");
    EXPECT_THAT(suite.child("system-out").text().get(),
                HasSubstr("2026-11-24T17:34:07.020Z error, late: time-out\n"));

    const struct {
        const char* name;
        const char* kind;
        const char* finding;
    } kCases[] = {
        {"closed", "system-out", "0 events, Diagnostic: 0 … 0 events"},
        {"above", "failure", "3 events, Diagnostic: 0 … 0.5 events"},
        {"open", "failure", "30 events, Diagnostic: > 30 events"},
        {"nan", "failure", "nan events, Diagnostic: < inf events"},
        {"Diagnostic", "system-out", "1.25 frames, no limit"},
    };
    for (const auto& [name, kind, finding] : kCases) {
        const pugi::xml_node node = suite.find_child_by_attribute("testcase", "name", name);
        EXPECT_STREQ(node.attribute("classname").value(), "healthy.Diagnostic");
        EXPECT_STREQ(node.first_child().name(), kind) << name;
        EXPECT_STREQ(node.child(kind).text().get(), finding);
    }
}

TEST_F(JunitReport, HasAnErrorForEachFailedStep) {
    const pugi::xml_node suite = suiteOf(test::brokenSession());
    EXPECT_THAT(counts(suite), ElementsAre(3, 0, 3, 0));
    const pugi::xml_node error =
        suite.find_child_by_attribute("testcase", "name", "experiment run").child("error");
    EXPECT_STREQ(error.attribute("type").value(), "PlugInErrorDomain 204");
    EXPECT_STREQ(error.attribute("message").value(), "Failed to start streaming.");
    EXPECT_STREQ(error.text().get(),
                 "experiment Experiment, run\n"
                 "Failed to start streaming. (PlugInErrorDomain 204)\n"
                 "caused by: Start was refused (Capture 7)\n"
                 "caused by: Stream is busy (Service -3)");
    EXPECT_STREQ(suite.find_child_by_attribute("testcase", "name", "experiment device")
                     .child("error")
                     .attribute("message")
                     .value(),
                 "property written too early");
}

TEST_F(JunitReport, TheLimitsOfTheBenchHaveCasesOfTheirOwn) {
    const pugi::xml_node suite = suiteOf(test::benchSession());
    EXPECT_THAT(counts(suite), ElementsAre(65, 1, 1, 0));
    const std::tuple<const char*, const char*> kCases[] = {{"LPDP", "system-out"},
                                                           {"frame interval, greatest", "failure"},
                                                           {"Flood active, greatest", "error"},
                                                           {"NTC active, greatest", "system-out"}};
    for (const auto& [name, kind] : kCases) {
        const pugi::xml_node node = suite.find_child_by_attribute("testcase", "name", name);
        EXPECT_STREQ(node.attribute("classname").value(), "healthy.FaultDiagnostic.bench");
        EXPECT_STREQ(node.first_child().name(), kind) << name;
    }
}

TEST_F(JunitReport, AnExperimentThatRanIsOnePassedCase) {
    const pugi::xml_node suite = suiteOf(test::imagesSession(2));
    EXPECT_THAT(counts(suite), ElementsAre(1, 0, 0, 0));
    EXPECT_STREQ(suite.child("testcase").attribute("name").value(), "run");
    EXPECT_FALSE(suite.child("testcase").first_child());
}

TEST_F(JunitReport, JudgesAllRepetitions) {
    const host::SessionRecord session = test::repeatedSession();
    const pugi::xml_node suite = suiteOf(session);
    // Sixty-one results, two of them outside at times, and the run that was in error.
    EXPECT_THAT(counts(suite), ElementsAre(62, 2, 1, 0));
    EXPECT_STREQ(suite.attribute("time").value(), "61.500");
    EXPECT_EQ(property(suite, "passed"), "17");
    EXPECT_STREQ(caseOf(session, "Number of Channel 17").child("failure").text().get(),
                 "outside 2 of 19 times: least 0, median 0.5, greatest 3 events, "
                 "Max Reports: 0 … 0 events");
}

// What the first of two runs had and the second did not come to is skipped, and so is what did not start.
TEST_F(JunitReport, AnInterruptedRunIsAnErrorAndSkipsWhatItDidNotComeTo) {
    host::SessionRecord session = test::interruptedSession();
    session.deviceName = "a device.json";
    session.runs[1].results = {session.runs[0].results[0]};
    const pugi::xml_node first = suiteOf(session);
    EXPECT_EQ(property(first, "frames"), "90 frames delivered, 1 lost");
    const pugi::xml_node second = first.next_sibling();
    EXPECT_THAT(counts(second), ElementsAre(62, 0, 1, 60));
    EXPECT_EQ(property(second, "verdict"), "INTERRUPTED");
    const pugi::xml_node error = second.find_child_by_attribute("testcase", "name", "run");
    EXPECT_STREQ(error.attribute("classname").value(), "a_device_json.FaultDiagnostic");
    EXPECT_STREQ(error.child("error").attribute("type").value(), "interrupted");
    EXPECT_STREQ(second.find_child_by_attribute("testcase", "name", "Frame Count")
                     .child("skipped")
                     .attribute("message")
                     .value(),
                 "not known: the run stopped after 37 of 90 frames");
    const pugi::xml_node third = second.next_sibling();
    EXPECT_THAT(counts(third), ElementsAre(1, 0, 0, 1));
    EXPECT_STREQ(third.child("testcase").child("skipped").attribute("message").value(),
                 "not started");
    EXPECT_THAT(counts(first.parent()), ElementsAre(124, 0, 1, -1));

    // Between two runs: the session has the error.
    session.runs.pop_back();
    EXPECT_THAT(counts(suiteOf(session).parent()), ElementsAre(64, 0, 1, -1));
}

// Names and messages arrive, with what XML cannot carry replaced; the parser accepts the document.
TEST_F(JunitReport, CarriesHostileNames) {
    const pugi::xml_node suite = suiteOf(test::judgedSession(test::kHostile));
    EXPECT_STREQ(suite.attribute("name").value(),
                 "a<b>&\"c'\uFFFD\n\uFFFD"
                 "end");
    EXPECT_EQ(host::junitReport(test::judgedSession(test::kHostile)).find('\x01'),
              std::string::npos);
    EXPECT_EQ(host::junitReport(test::judgedSession(test::kHostile)).find("&#1;"),
              std::string::npos);
}

// For the check against the schema of JUnit reports.
TEST_F(JunitReport, WritesSampleReports) {
    for (const auto& [name, session] : test::sampleSessions()) {
        test::writeSample(name + ".xml", host::junitReport(session));
    }
}

}  // namespace
