#include "tests/host/report/sample_sessions.h"

#include <chrono>
#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <limits>
#include <memory>
#include <optional>

#include <gtest/gtest.h>

namespace test {

namespace {

using host::BoundRecord;
using host::Judgement;
using host::LimitRecord;
using host::RunRecord;
using host::SessionRecord;
using host::Verdict;

platform::Date timeOf(int milliseconds) {
    using namespace std::chrono;
    return platform::Date(sys_days(year(2026) / 11 / 24) + 17h + 34min + 7s +
                          std::chrono::milliseconds(milliseconds));
}

SessionRecord sessionOf(RunRecord run) {
    SessionRecord session;
    session.version = "1.0.0";
    session.commandLine = "zrlab run " + run.plan.name + " --set frameCount=90";
    session.identity.station = "desk";
    session.deviceName = "healthy";
    session.deviceSummary = "A device without faults";
    session.started = timeOf(0);
    session.seconds = run.seconds + 0.01;
    session.deviceFacts = {{"platform", "simulated device"}};
    session.planned = {run.plan};
    session.verdict = run.verdict;
    session.runs.push_back(std::move(run));
    return session;
}

RunRecord runOf(const std::string& name, Verdict verdict) {
    RunRecord run;
    run.plan.name = name;
    run.plan.summary = "Streams the camera and judges what it counted.";
    run.started = timeOf(1);
    run.seconds = 3.25;
    run.plan.experiment = {"Experiment", "Streams.", {{"frameCount", std::int64_t{90}}}};
    run.experimentSeconds = 3.0;
    run.verdict = verdict;
    return run;
}

RunRecord diagnosticOf(const std::string& name, Verdict verdict) {
    RunRecord run = runOf(name, verdict);
    run.plan.analysis = {"Analysis", "Judges.", {{"frameCount", 80.5}}};
    run.analysisSeconds = 0.25;
    return run;
}

// The sixty-four results of a healthy or faulty stream.
void addResults(RunRecord& run, bool faulty) {
    for (int at = 0; at < 60; ++at) {
        const bool outside = faulty && at == 17;
        run.results.push_back(
            {"Number of Channel " + std::to_string(at), outside ? 3.0 : 0.0, "events",
             LimitRecord{"Max Reports", BoundRecord{0, false}, BoundRecord{0, false}},
             outside ? Judgement::Outside : Judgement::Within});
        run.measurements.push_back(
            {"Channel " + std::to_string(at), outside ? 3.0 : 0.0, "events"});
    }
    run.results.push_back({"Frame Count", faulty ? 71.0 : 90.0, "frames",
                           LimitRecord{"Min Frames", BoundRecord{80, false}, std::nullopt},
                           faulty ? Judgement::Outside : Judgement::Within});
}

host::FrameRecord frameOf(std::size_t at) {
    const double warm = 1 - std::exp(-static_cast<double>(at) / 90);
    const double noise = std::sin(static_cast<double>(at) * 12.9898) * 0.0004;
    const double late = at >= 40 ? 1.0 / 30 : 0;  // one frame was dropped on the way
    host::FrameRecord frame;
    frame.number = at + 1;
    frame.sensorNumber = static_cast<std::int64_t>(at + (at >= 40 ? 2 : 1));
    frame.presentation = 1000 + static_cast<double>(at) / 30 + late;
    frame.delivered = 0.2 + static_cast<double>(at) / 30 + late + noise;
    frame.lightSource = at % 2 == 0 ? 1 : 2;
    for (std::size_t key = 0; key < frame.temperatures.size(); ++key) {
        if (key != 6 || at % 30 >= 10) {
            frame.temperatures[key] =
                31.0 + 1.6 * static_cast<double>(key) + warm * static_cast<double>(4 + key);
        }
    }
    return frame;
}

platform::Value imageOf(std::size_t at) {
    platform::MutableList scanI;
    platform::MutableList scanQ;
    for (int sample = 0; sample < 48; ++sample) {
        const double near = std::exp(-std::pow((sample - 20.0) / 5, 2));
        const double swing = std::cos(static_cast<double>(at) / 9);
        const double ripple = 900 * std::sin(sample * 0.9 + static_cast<double>(at));
        scanI.emplace_back(static_cast<std::int32_t>(52000 * near * swing + ripple));
        scanQ.emplace_back(static_cast<std::int32_t>(-31000 * near + 4000 * swing - ripple));
    }
    const float celsius =
        at == 7 ? std::numeric_limits<float>::quiet_NaN() : 36.5F + 0.02F * static_cast<float>(at);
    return platform::Dictionary{
        {"frameID", static_cast<std::uint32_t>(100 + at)},
        {"timestampInMilliseconds", static_cast<std::uint32_t>(5000 + 40 * at)},
        {"tmonDataInC", celsius},
        {"dScanI", platform::List(std::move(scanI))},
        {"dScanQ", platform::List(std::move(scanQ))}};
}

}  // namespace

SessionRecord judgedSession(const std::string& name) {
    RunRecord run = diagnosticOf(name, Verdict::Failed);
    run.measurements = {{name, 3, "events"}, {"Infinite", HUGE_VAL, ""}};
    const auto result = [&](const std::string& of, double value, std::optional<BoundRecord> lower,
                            std::optional<BoundRecord> upper, Judgement judgement) {
        run.results.push_back({of, value, "events", LimitRecord{name, lower, upper}, judgement});
    };
    result("closed", 0, BoundRecord{0, false}, BoundRecord{0, false}, Judgement::Within);
    result("above", 3, BoundRecord{0, false}, BoundRecord{0.5, false}, Judgement::Outside);
    result("open", 30, BoundRecord{30, true}, std::nullopt, Judgement::Outside);
    result("nan", std::nan(""), std::nullopt, BoundRecord{HUGE_VAL, true}, Judgement::Outside);
    run.results.push_back({name, 1.25, "frames", std::nullopt, Judgement::Information});
    run.log = {{timeOf(10), platform::LogLevel::Default, name},
               {timeOf(20), platform::LogLevel::Error, "time-out", true}};
    return sessionOf(std::move(run));
}

SessionRecord brokenSession() {
    RunRecord run = diagnosticOf("Broken", Verdict::Error);
    run.analysisSeconds.reset();  // never reached
    const auto busy = std::make_shared<const platform::Error>("Service", -3, "Stream is busy");
    const auto refused =
        std::make_shared<const platform::Error>("Capture", 7, "Start was refused", busy);
    run.failures = {
        {host::Part::Experiment, host::kStepRun,
         std::make_shared<const platform::Error>("PlugInErrorDomain", 204,
                                                 "Failed to start streaming.", refused),
         ""},
        {host::Part::Experiment, host::kStepTeardown, nullptr, "No manager available?!"},
        {host::Part::Experiment, host::kStepDevice, nullptr, "property written too early"}};
    return sessionOf(std::move(run));
}

SessionRecord streamedSession(std::size_t frames) {
    RunRecord run = diagnosticOf("FaultDiagnostic", Verdict::Passed);
    addResults(run, false);
    run.framesDelivered = frames;
    run.framesLost = frames > 40 ? 1 : 0;
    for (std::size_t at = 0; at < frames; ++at) {
        run.frames.push_back(frameOf(at));
        run.log.push_back({timeOf(static_cast<int>(at) * 33),
                           at % 50 == 49 ? platform::LogLevel::Error : platform::LogLevel::Debug,
                           "Received frame " + std::to_string(at + 1) + "."});
    }
    return sessionOf(std::move(run));
}

SessionRecord imagesSession(std::size_t images) {
    RunRecord run = runOf("ImageExperiment", Verdict::Passed);
    platform::MutableList list;
    for (std::size_t at = 0; at < images; ++at) {
        list.push_back(imageOf(at));
    }
    run.imagesDelivered = images;
    run.auxiliaryData = {{"images", platform::List(std::move(list))}};
    return sessionOf(std::move(run));
}

SessionRecord repeatedSession() {
    RunRecord run = diagnosticOf("FaultDiagnostic", Verdict::Failed);
    addResults(run, true);
    run.number = 7;
    host::RepeatRecord repeat;
    repeat.name = run.plan.name;
    repeat.runs = 20;
    repeat.passed = 17;
    repeat.failed = 2;
    repeat.errors = 1;
    repeat.seconds = 61.5;
    repeat.outcomes.resize(20, {Verdict::Passed, 3.0});
    repeat.outcomes[6] = {Verdict::Failed, 3.25};
    repeat.outcomes[8] = {Verdict::Error, 1.5};
    repeat.outcomes[9] = {Verdict::Failed, 3.75};
    repeat.notPassed = {
        {7, Verdict::Failed, 3.25, "Number of Channel 17 is 3 events", {run.results[17]}, {}},
        {9, Verdict::Error, 1.5, kHostile, {}, {brokenSession().runs.front().failures[0]}},
        {10, Verdict::Failed, 3.75, "Frame Count is 71 frames", {run.results[60]}, {}}};
    for (const host::ResultRecord& result : run.results) {
        const bool outside = result.judgement == Judgement::Outside;
        repeat.results.push_back({result.name, result.unit, result.limit, 19, outside ? 2U : 0U,
                                  outside ? 0 : result.value, outside ? 0.5 : result.value,
                                  result.value});
    }
    SessionRecord session = sessionOf(std::move(run));
    session.repeats = {std::move(repeat)};
    session.verdict = Verdict::Error;
    return session;
}

SessionRecord interruptedSession() {
    SessionRecord session = streamedSession(90);
    session.planned = {session.planned.front(), session.planned.front(),
                       imagesSession(0).planned.front()};
    RunRecord run = streamedSession(37).runs.front();
    run.verdict = Verdict::Interrupted;
    run.analysisSeconds.reset();
    run.results.clear();
    session.runs.push_back(std::move(run));
    session.verdict = Verdict::Interrupted;
    return session;
}

SessionRecord benchSession() {
    RunRecord run = diagnosticOf("FaultDiagnostic", Verdict::Failed);
    addResults(run, false);
    const auto add = [&run](const std::string& name, double value, const std::string& unit,
                            Judgement judgement, bool partOfVerdict) {
        host::BenchResult result;
        result.name = name;
        result.value = value;
        result.unit = unit;
        result.limit = LimitRecord{"Desk", std::nullopt, BoundRecord{40, true}};
        result.judgement = judgement;
        result.partOfVerdict = partOfVerdict;
        result.note = judgement == Judgement::NotMeasured ? "no frame has it" : "";
        run.benchResults.push_back(std::move(result));
    };
    add("LPDP", 4, "errors", Judgement::Within, true);
    add("frame interval, greatest", 133.5, "ms", Judgement::Outside, true);
    add("Flood active, greatest", std::nan(""), "", Judgement::NotMeasured, true);
    add("NTC active, greatest", 71, "", Judgement::Outside, false);
    return sessionOf(std::move(run));
}

SessionRecord mixedSession() {
    SessionRecord session = streamedSession(90);
    for (SessionRecord other : {judgedSession(kHostile), brokenSession(), imagesSession(25)}) {
        session.planned.push_back(std::move(other.planned.front()));
        session.runs.push_back(std::move(other.runs.front()));
    }
    session.verdict = Verdict::Error;
    return session;
}

SessionRecord identifiedSession() {
    SessionRecord session = judgedSession();
    session.identity = {
        .unit = "SN-7",
        .part = "P-1",
        .lot = "L<2>",
        .station = "bench-3",
        .operatorName = "Ann",
        .metadata = {{"fixture", "7"}, {"unit", "of measure"}, {"note", ""}, {kHostile, kHostile}}};
    session.runs.front().uuid = "6f0c1c1e-58a9-4c53-9e0e-3f3f4c0a7d11";
    return session;
}

std::vector<std::pair<std::string, SessionRecord>> sampleSessions() {
    return {{"pass", streamedSession(90)},         {"fail", judgedSession()},
            {"hostile", judgedSession(kHostile)},  {"error", brokenSession()},
            {"images", imagesSession(25)},         {"long", streamedSession(20000)},
            {"long-images", imagesSession(3000)},  {"repeated", repeatedSession()},
            {"interrupted", interruptedSession()}, {"mixed", mixedSession()},
            {"empty-images", imagesSession(0)},    {"bench", benchSession()},
            {"identified", identifiedSession()}};
}

void writeSample(const std::string& file, const std::string& content) {
    const char* given = std::getenv("ZR_SAMPLES");
    const std::filesystem::path folder =
        given != nullptr ? given : std::filesystem::path(testing::TempDir()) / "zrlab-samples";
    std::filesystem::create_directories(folder);
    EXPECT_TRUE(std::ofstream(folder / file) << content << std::flush) << folder / file;
}

}  // namespace test
