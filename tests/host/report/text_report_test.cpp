#include "host/report/text_report.h"

#include <string>

#include <gmock/gmock.h>

#include "tests/host/report/sample_sessions.h"

namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

// The whole report of a session whose names end one by one.
std::string textOf(const host::SessionRecord& whole, const host::TextStyle& style = {}) {
    std::string text;
    const auto report =
        host::openTextReport([&text](std::string_view piece) { text += piece; }, style);
    host::SessionRecord session = whole;
    session.runs.clear();
    report->sessionStarted(session);
    for (const host::RunRecord& run : whole.runs) {
        session.runs.push_back(run);
        report->nameEnded(session);
    }
    report->sessionEnded(whole);
    return text;
}

TEST(TextReport, SaysWhatWasInterruptedAndWhatWasNotStarted) {
    EXPECT_THAT(
        textOf(test::interruptedSession()),
        AllOf(
            HasSubstr("\n  ! 90 frames delivered, 1 lost\n"),
            HasSubstr("\n\nINTERRUPTED  FaultDiagnostic  stopped after 37 of 90 frames  3.25 s\n"),
            HasSubstr("\n    60 measurements of the experiment, --verbose lists them\n"),
            HasSubstr("\nINTERRUPTED  2 runs: 1 passed, 0 failed, 0 in error, 1 interrupted, 1 not "
                      "started\n      not started: ImageExperiment\n")));
    host::SessionRecord early = test::interruptedSession();
    early.runs.clear();
    EXPECT_THAT(textOf(early), StartsWith("INTERRUPTED  0 runs: "));
}

TEST(TextReport, ARepeatedNameBeginsWithItsFigures) {
    EXPECT_THAT(textOf(test::repeatedSession()),
                AllOf(StartsWith("FaultDiagnostic  20 runs: 17 passed, 2 failed, 1 in error\n"
                                 "       7  FAIL  Number of Channel 17 is 3 events\n"),
                      HasSubstr("\n\nrun 7:\nFAIL")));
}

TEST(TextReport, ShowsTheLimitsOfTheBenchApart) {
    EXPECT_THAT(
        textOf(test::benchSession()),
        AllOf(
            StartsWith(
                "FAIL  FaultDiagnostic  all 61 limits met; 2 of 4 bench limits not met, 1 not "
                "measured  3.25 s\n"),
            HasSubstr("\n  2 of 4 bench limits not met, 1 not measured\n"
                      "  ✗ frame interval, greatest        133.5 ms  Desk: < 40 ms\n"
                      "  ? Flood active, greatest      not measured  Desk: < 40; no frame has it\n"
                      "  ✗ NTC active, greatest                  71  Desk: < 40; not part of the "
                      "verdict\n"),
            Not(HasSubstr("LPDP"))));
    // What a run that did not complete could not measure is counted, not listed.
    host::SessionRecord broken = test::benchSession();
    broken.runs[0].failures = test::brokenSession().runs[0].failures;
    EXPECT_THAT(textOf(broken), Not(HasSubstr("no frame has it")));
}

TEST(TextReport, BeginsWithAHeadingWhenItIsKept) {
    const host::SessionRecord session = test::imagesSession(1);
    EXPECT_THAT(textOf(session), StartsWith("PASS  ImageExperiment"));
    EXPECT_THAT(textOf(session, {.heading = true}),
                StartsWith("zrlab 1.0.0, 2026-11-24 17:34:07 +0000\n"
                           "zrlab run ImageExperiment --set frameCount=90\n"
                           "device healthy: A device without faults\n"
                           "  platform: simulated device\n"
                           "station desk\n"
                           "\nPASS  ImageExperiment"));
}

TEST(TextReport, PicturesShowTheLargerOfTwoSamples) {
    host::SessionRecord session = test::imagesSession(0);
    const platform::List samples{0, 70, 70, 0, 0, 0, 40};
    session.runs.front().auxiliaryData = {
        {"images", platform::List{platform::Dictionary{{"dScanI", samples}, {"dScanQ", samples}}}}};
    EXPECT_THAT(textOf(session), AllOf(HasSubstr("██▁▅  ██▁▅"), Not(HasSubstr("lost"))));
}

}  // namespace
