#include <cmath>
#include <sstream>
#include <string>

#include <gmock/gmock.h>

#include "host/report/html/axis.h"
#include "host/report/html/page.h"
#include "host/report/html/plot.h"
#include "tests/host/report/sample_sessions.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;
using testing::Pair;

// The pieces, which bars separate, stand in the page in this order.
void expectInOrder(const std::string& page, const std::string& pieces) {
    std::size_t at = page.find("<body>");
    std::istringstream in(pieces);
    for (std::string piece; std::getline(in, piece, '|');) {
        const std::size_t found = page.find(piece, at);
        ASSERT_NE(found, std::string::npos) << piece;
        at = found + piece.size();
    }
}

TEST(HtmlReport, TellsTheVerdictFirstThenWhatFailed) {
    expectInOrder(
        host::htmlReport(test::judgedSession()),
        "<h1>|FAIL|3 of 4 limits not met|What failed|above|3</strong> events|0 … 0.5 events|"
        "2.5 above|open|&gt; 30 events|on the open bound|nan|not a number|Results and limits|"
        "closed|within|above|outside|no limit|Parameters|80.5|Log|error, late|time-out|"
        "zrlab run Diagnostic");
    expectInOrder(host::htmlReport(test::brokenSession()),
                  "ERROR|did not complete|experiment Experiment, run|Failed to start streaming.|"
                  "PlugInErrorDomain 204|caused by|Start was refused|Capture 7|caused by|"
                  "Stream is busy|Service -3|No manager available?!|property written too early");
    expectInOrder(
        host::htmlReport(test::repeatedSession()),
        "17 of 20 runs passed|Number of Channel 17|Repetitions|"
        "20 runs: 17 passed, 2 failed, 1 in error|show run 7|Runs that did not pass|7|3.25 s|"
        "Number of Channel 17|3 events|9|1.50 s|Failed to start streaming.|"
        "PlugInErrorDomain 204|10|71 frames|Number of Channel 17|>0<|>0.5<|>3<|2 of 19|"
        "59 results alike in every run|Results and limits");
    expectInOrder(host::htmlReport(test::interruptedSession()),
                  "INTERRUPTED|FaultDiagnostic stopped after 37 of 90 frames|PASS|ImageExperiment|"
                  "not started|FaultDiagnostic (1 of 2)|FaultDiagnostic (2 of 2)|"
                  "stopped after 37 of 90 frames|As measured by the experiment|Channel 59");
}

TEST(HtmlReport, ShowsTheLimitsOfTheBenchApart) {
    expectInOrder(host::htmlReport(test::benchSession()),
                  "FAIL|What failed|Limits of the bench not met|frame interval, greatest|133.5|"
                  "93.5 above|Flood active, greatest|not measured|no frame has it|"
                  "Limits of the bench, which the module does not judge|LPDP|within|yes|"
                  "NTC active, greatest|71|outside|no|Results and limits");
}

TEST(HtmlReport, DrawsWhatThereIsAndNothingElse) {
    const std::string page = host::htmlReport(test::streamedSession(90));
    expectInOrder(
        page,
        "90 frames delivered, 1 lost.|"
        "1 frame lost between the received frames 40 and 41 (the sensor&#39;s 40 and 42)|"
        "device&#39;s clock|greatest 66.67 ms at frame 41 (the sensor&#39;s 42)|"
        "<line class=\"gap\"|1 frame lost|arrival|Temperatures|Flood active|Light source");
    // A line is broken where a frame was lost. The flood temperature lacks the first ten of thirty frames as
    // well, and there was a loss just then.
    for (const auto& [style, stretches] : {std::pair("hue-a dotted", 2), std::pair("hue-c", 3)}) {
        const std::size_t line = page.find("class=\"line " + std::string(style) + "\" d=\"",
                                           page.find("Temperatures</h4>"));
        const std::string path = page.substr(line, page.find('>', line) - line);
        EXPECT_EQ(std::count(path.begin(), path.end(), 'M'), stretches) << style;
    }
    EXPECT_THAT(page, Not(HasSubstr("Images")));

    const std::string images = host::htmlReport(test::imagesSession(25));
    expectInOrder(
        images,
        "frame ID 124|all 25 images|I samples over the images|Q samples over the images|°C");
    EXPECT_THAT(images, Not(HasSubstr("Frame interval")));
    for (const std::string& empty :
         {host::htmlReport(test::imagesSession(0)), host::htmlReport(test::judgedSession())}) {
        EXPECT_THAT(empty, Not(HasSubstr("<figure>")));
    }
}

TEST(HtmlReport, EscapesEveryText) {
    host::SessionRecord session = test::judgedSession(test::kHostile);
    session.commandLine = session.deviceName = session.deviceSummary = test::kHostile;
    host::RunRecord& run = session.runs.front();
    run.plan.experiment.name = run.plan.summary = test::kHostile;
    run.plan.experiment.parameters.front().first = test::kHostile;
    run.failures = test::brokenSession().runs.front().failures;
    run.failures.front().error =
        std::make_shared<const platform::Error>(test::kHostile, 1, test::kHostile);
    run.frames = test::streamedSession(3).runs.front().frames;
    const std::string page = host::htmlReport(session);
    EXPECT_THAT(page, HasSubstr("a&lt;b&gt;&amp;&quot;c&#39;\uFFFD\n\uFFFD"
                                "end"));
    EXPECT_THAT(page, Not(HasSubstr("a<b")));
    EXPECT_THAT(page, Not(HasSubstr("\x01")));
}

TEST(HtmlReport, StaysSmallHoweverLongTheRun) {
    EXPECT_LT(host::htmlReport(test::streamedSession(20000)).size(), 1'000'000U);
    EXPECT_LT(host::htmlReport(test::imagesSession(3000)).size(), 1'000'000U);
    host::SessionRecord lossy = test::streamedSession(20000);
    for (host::FrameRecord& frame : lossy.runs.front().frames) {
        frame.sensorNumber = static_cast<std::int64_t>(2 * frame.number);
    }
    const std::string page = host::htmlReport(lossy);
    EXPECT_LT(page.size(), 1'000'000U);
    EXPECT_THAT(page, HasSubstr("and 19994 more gaps"));
}

TEST(HtmlPlot, DecimationKeepsPeaksOrderAndGaps) {
    std::vector<host::Point> points;
    for (int at = 0; at < 10000; ++at) {
        const bool gap = at >= 4000 && at < 6000;
        points.push_back({double(at), gap ? std::nan("") : at == 1234 ? 9.0 : at == 8765 ? -9 : 0});
    }
    const auto kept = host::decimated(points, 100);
    EXPECT_LE(kept.size(), 100U);
    double last = -1;
    double greatest = 0;
    double least = 0;
    std::size_t gaps = 0;
    for (const host::Point& point : kept) {
        EXPECT_GT(point.x, last);
        last = point.x;
        gaps += std::isnan(point.y) ? 1 : 0;
        greatest = std::fmax(greatest, point.y);
        least = std::fmin(least, point.y);
    }
    EXPECT_EQ(greatest, 9);
    EXPECT_EQ(least, -9);
    EXPECT_EQ(gaps, 10U);
}

TEST(HtmlPlot, AHeatMapLeavesAbsentCellsOutAndMergesColumns) {
    host::HeatMap map;
    map.columns = {{1, std::nan("")}, {1}, {5, 5}};
    const std::string small = host::heatMap(map);
    EXPECT_THAT(small, HasSubstr("class=\"level-0\" d=\"M0 1h2v1h-2z\""));
    EXPECT_THAT(small, HasSubstr("class=\"level-15\" d=\"M2 1h1v1h-1zM2 0h1v1h-1z\""));
    map.columns.assign(3 * host::kMostColumns, {1.0, 2.0});
    EXPECT_THAT(host::heatMap(map), HasSubstr("A column is the mean of 3 neighbours."));
    map.columns = {{std::nan("")}, {HUGE_VAL}};
    EXPECT_EQ(host::heatMap(map), "");
}

TEST(HtmlAxis, MarksRoundValues) {
    EXPECT_THAT(host::Axis(1, 90, true).marks(),
                ElementsAre(Pair(20, "20"), Pair(40, "40"), Pair(60, "60"), Pair(80, "80")));
    EXPECT_THAT(host::Axis(1, 2, true).marks(), ElementsAre(Pair(1, "1"), Pair(2, "2")));
    EXPECT_THAT(host::Axis(-0.3, 0.3, false).marks(),
                ElementsAre(Pair(testing::DoubleNear(-0.2, 1e-9), "\u22120.2"), Pair(0, "0.0"),
                            Pair(testing::DoubleNear(0.2, 1e-9), "0.2")));
    EXPECT_THAT(host::Axis(-3e9, 3e9, false).marks().front(), Pair(-2e9, "\u22122 G"));
    // No axis is without extent, and values that hardly differ look alike.
    for (const double value : {0.0, 1e-300, -7.5, 1e99}) {
        EXPECT_NEAR(host::Axis::around(value, value).at(value), 0.5, 0.01);
        EXPECT_LE(host::Axis::around(value, value).marks().size(), 11U);
    }
    const host::Axis steady = host::Axis::around(33.333333, 33.333334);
    EXPECT_NEAR(steady.at(33.333333), steady.at(33.333334), 0.001);
}

// For the browser check, and for whoever wants to look at them.
TEST(HtmlReport, WritesSamplePages) {
    for (const auto& [name, session] : test::sampleSessions()) {
        test::writeSample(name + ".html", host::htmlReport(session));
    }
}

}  // namespace
