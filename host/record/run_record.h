// The record of a run: everything that a report shows, whatever its form.
//
// The host fills a record while it drives an experiment or a diagnostic; reports only read it. Plain
// data with one owner, used by one thread at a time.
#ifndef ZR_HOST_RECORD_RUN_RECORD_H
#define ZR_HOST_RECORD_RUN_RECORD_H

#include <algorithm>
#include <array>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "host/record/identity.h"
#include "host/record/plugin_data.h"
#include "host/record/run_plan.h"
#include "platform/error.h"
#include "platform/log.h"
#include "platform/run_tag.h"
#include "platform/value.h"
#include "platform/wall_clock.h"

namespace host {

// The outcome of a run, from best to worst.
enum class Verdict {
    Passed,  // a diagnostic whose every limited result is within its limit; an experiment that ran
    Failed,  // a result is outside its limit: one of the module, or of the bench that is part of it
    Error,   // something did not complete, so there is no verdict
    // The program was asked to stop during the run. It says nothing about the unit; what the run had
    // found until then is in its record.
    Interrupted,
};

// Where a result stands with respect to its limit.
enum class Judgement {
    Information,  // it has no limit
    Within,
    Outside,
    NotMeasured,  // only under a limit of the bench: the run does not have what the limit is on
};

struct BoundRecord {
    double value;
    bool open;  // the bound's own value is outside the limit
};

struct LimitRecord {
    std::string name;
    std::optional<BoundRecord> lower;
    std::optional<BoundRecord> upper;
};

// A measured result of the analysis, judged.
struct ResultRecord {
    std::string name;
    double value;
    std::string unit;
    std::optional<LimitRecord> limit;
    Judgement judgement;
};

// What a limit of the bench found: one that the bench's user put on something that the module records and does
// not judge. When it was not measured the value is NaN and the unit empty.
struct BenchResult : ResultRecord {
    bool partOfVerdict = false;
    std::string note;  // why it was not measured; else empty
};

// A measurement of the experiment, under the experiment's name for it.
struct MeasurementRecord {
    std::string name;
    double value;
    std::string unit;
};

// A failure of one step of a part.
struct FailureRecord {
    Part part;  // of a misused device the experiment
    std::string_view
        step;  // "create", "setup", "run", "teardown", "analyze" or "device": see kStep…
    // What the part reported; null when it failed without an error object.
    platform::ErrorRef error;
    // What happened when there is no error object, such as an exception's message.
    std::string message;
};

inline constexpr std::string_view kStepCreate = "create";  // the factory gave no instance
inline constexpr std::string_view kStepSetup = "setup";
inline constexpr std::string_view kStepRun = "run";
inline constexpr std::string_view kStepTeardown = "teardown";
inline constexpr std::string_view kStepAnalyze = "analyze";
inline constexpr std::string_view kStepDevice = "device";  // the device was misused

struct LogRecord {
    platform::Date time;
    platform::LogLevel level;
    std::string message;
    bool late = false;  // it came when its run had ended
};

// A frame that the device delivered, with what a report draws of it.
struct FrameRecord {
    std::uint64_t number;  // as received: 1 for the first, frames lost on the way not counted
    // The sensor's own count, which a lost frame advances too; absent when the metadata has none.
    std::optional<std::int64_t> sensorNumber;
    double presentation;  // seconds on the device's clock
    double delivered;     // seconds of real time since the run began
    std::optional<double> lightSource;
    // As the metadata carries them, in the order of kTemperatures.
    std::array<std::optional<double>, kTemperatureCount> temperatures;
};

// An event that a stream reported while it delivered frames.
struct EventRecord {
    std::int32_t code;
    std::int64_t info;
    double presentation;  // these two as those of a frame
    double delivered;
    std::size_t framesBefore;  // in its batch
};

// What a stream has delivered since the batch before.
struct FrameBatch {
    std::vector<FrameRecord> frames;
    // All metadata of each frame, and the events: only when a listener asks for them.
    std::vector<platform::Dictionary> metadata;
    std::vector<EventRecord> events;
};

// One run of a diagnostic, or of an experiment on its own.
struct RunRecord {
    std::string uuid;          // names the run everywhere, see newUuid()
    RunPlan plan;              // what was run
    std::uint64_t number = 1;  // which repetition, from 1
    platform::RunTag tag = 0;  // under which its log lines come
    platform::Date started = platform::Date::now();
    double seconds = 0;

    double experimentSeconds = 0;           // setup, run and teardown together
    std::optional<double> analysisSeconds;  // nothing when the analysis was not reached

    std::vector<MeasurementRecord> measurements;  // of the experiment, by name
    platform::Dictionary auxiliaryData;           // of the experiment
    std::vector<ResultRecord> results;            // of the analysis, in its order
    std::vector<BenchResult> benchResults;        // of the bench's limits, in their order
    std::vector<FailureRecord> failures;          // empty when the verdict is about results
    std::vector<LogRecord> log;                   // lines of the run, in the order they came
    std::uint64_t framesDelivered = 0;
    // By the sensor's numbers; absent when no frame had one.
    std::optional<std::uint64_t> framesLost;
    std::uint64_t imagesDelivered = 0;
    std::vector<FrameRecord> frames;  // kept only when a report draws them
    Verdict verdict = Verdict::Error;
};

// One measured result over the repetitions of a run.
struct ResultStatistics {
    std::string name;
    std::string unit;
    std::optional<LimitRecord> limit;
    std::uint64_t runs = 0;
    std::uint64_t outside = 0;  // how often it was outside its limit
    double minimum = 0;         // these three: NaN when no value was a number
    double median = 0;
    double maximum = 0;
    std::uint64_t notMeasured = 0;  // runs beside `runs` that did not have it; see BenchResult
};

// A repetition that did not pass.
struct Repetition {
    std::uint64_t number;  // from 1
    Verdict verdict;
    double seconds;
    std::string why;                      // in one line
    std::vector<ResultRecord> outside;    // its results outside their limits
    std::vector<FailureRecord> failures;  // its failed steps
    std::vector<BenchResult> bench{};     // what of the bench's limits kept it from passing
};

// What is kept of every repetition, also of one that passed.
struct RepetitionOutcome {
    Verdict verdict;
    double seconds;
};

// The repetitions of one diagnostic or experiment.
struct RepeatRecord {
    std::string name;
    std::uint64_t runs = 0;
    std::uint64_t passed = 0;
    std::uint64_t failed = 0;
    std::uint64_t errors = 0;
    std::uint64_t interrupted = 0;  // the last one, when the program was asked to stop during it
    double seconds = 0;             // of all runs
    std::vector<ResultStatistics> results;
    std::vector<ResultStatistics> benchResults;  // of the bench's limits
    std::vector<Repetition> notPassed;           // the first kMostRepetitions of them
    // The first kMostOutcomes repetitions, in their order. With the bound on those that did not pass,
    // a series of any length takes a few megabytes at most.
    std::vector<RepetitionOutcome> outcomes;

    std::uint64_t notPassedCount() const { return runs - passed; }
};
inline constexpr std::size_t kMostRepetitions = 100;
inline constexpr std::size_t kMostOutcomes = 1000;

// Everything that one call of the program did.
struct SessionRecord {
    std::string version;      // of the program
    std::string commandLine;  // as it was given
    Identity identity;        // of the unit, and of the place
    std::string deviceName;
    std::string deviceSummary;
    // What the device says of itself: names and texts, in its order.
    std::vector<std::pair<std::string, std::string>> deviceFacts;
    platform::Date started = platform::Date::now();
    double seconds = 0;
    // One entry per name asked for; known when the session starts.
    std::vector<RunPlan> planned;
    // One record per name, in the order of `planned`; of a repeated run the first that did not pass, else
    // the last. An interrupted session has fewer than it planned: the last of these, if any, was in
    // progress, and the names behind it were not started.
    std::vector<RunRecord> runs;
    // One entry per name when runs were repeated; empty otherwise.
    std::vector<RepeatRecord> repeats;
    Verdict verdict = Verdict::Passed;  // the worst of all runs, repetitions included

    // The names that were planned and not started.
    std::span<const RunPlan> notStarted() const {
        return std::span(planned).subspan(std::min(runs.size(), planned.size()));
    }
    // The figures of the run at that place; null when it was not repeated.
    const RepeatRecord* repeatOf(std::size_t at) const {
        return at < repeats.size() ? &repeats[at] : nullptr;
    }
};

}  // namespace host

#endif
