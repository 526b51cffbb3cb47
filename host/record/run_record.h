// The record of a run: everything that a report shows, whatever its form.
//
// The host fills a record while it drives an experiment or a diagnostic; reports only read it. Plain
// data, owned by whoever made it, used by one thread at a time.
#ifndef ZR_HOST_RECORD_RUN_RECORD_H
#define ZR_HOST_RECORD_RUN_RECORD_H

#include <array>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/error.h"
#include "platform/log.h"
#include "platform/value.h"
#include "platform/wall_clock.h"

namespace host {

// What came of a run, from best to worst.
enum class Verdict {
    Passed,  // a diagnostic whose every limited result is within its limit; an experiment that ran
    Failed,  // a result is outside of its limit
    Error,   // something could not be run to its end, so there is no verdict
};

// Where a result stands with respect to its limit.
enum class Judgement {
    Information,  // it has no limit
    Within,
    Outside,
};

struct BoundRecord {
    double value;
    bool open;  // the bound's own value lies outside of the limit
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

// A measurement of the experiment, under the experiment's name for it.
struct MeasurementRecord {
    std::string name;
    double value;
    std::string unit;
};

// The two parts of a diagnostic; an experiment that runs on its own has the first only.
enum class Part { Experiment, Analysis };

// A failure of one step of a part.
struct FailureRecord {
    Part part;
    std::string_view step;  // "setup", "run", "teardown", "analyze" or "device": see kStep…
    // What the part reported; null when it failed without an error object.
    platform::ErrorRef error;
    // What happened when there is no error object: an exception's message, say.
    std::string message;
};

inline constexpr std::string_view kStepCreate = "create";  // the factory gave no instance
inline constexpr std::string_view kStepSetup = "setup";
inline constexpr std::string_view kStepRun = "run";
inline constexpr std::string_view kStepTeardown = "teardown";
inline constexpr std::string_view kStepAnalyze = "analyze";
inline constexpr std::string_view kStepDevice = "device";  // the device was misused

struct PartRecord {
    std::string name;     // as registered
    std::string summary;  // of its description
    // The parameters that the part declares and was given, in the order of declaration.
    std::vector<std::pair<std::string, platform::Number>> parameters;
    double seconds = 0;  // setup, run and teardown together
};

struct LogRecord {
    platform::Date time;
    platform::LogLevel level;
    std::string message;
};

// A frame that the device delivered, with what a report draws of it.
struct FrameRecord {
    std::uint64_t number;  // 1 for the first
    double presentation;   // seconds on the device's clock
    double delivered;      // seconds of real time since the run began
    std::optional<double> lightSource;
    // Active, standby and idle temperatures as the metadata carries them, in the order of
    // kTemperatureKeys.
    std::array<std::optional<double>, 7> temperatures;
};

inline constexpr std::array<std::string_view, 7> kTemperatureNames = {
    "NTC idle",    "NTC standby", "NTC active",  "DIE idle",
    "DIE standby", "DIE active",  "Flood active"};

// One run of a diagnostic, or of an experiment on its own.
struct RunRecord {
    std::string name;     // as it was asked for
    std::string summary;  // the diagnostic's, or the experiment's
    bool isDiagnostic = false;
    std::uint64_t number = 1;  // which repetition, from 1
    platform::Date started = platform::Date::now();
    double seconds = 0;

    PartRecord experiment;
    std::optional<PartRecord> analysis;

    std::vector<MeasurementRecord> measurements;  // of the experiment, by name
    platform::Dictionary auxiliaryData;           // of the experiment
    std::vector<ResultRecord> results;            // of the analysis, in its order
    std::vector<FailureRecord> failures;          // empty unless the verdict is Error
    std::vector<LogRecord> log;                   // lines of the run, in the order they came
    std::vector<FrameRecord> frames;              // kept only when a report draws them
    Verdict verdict = Verdict::Error;
};

// What became of one measured result over the repetitions of a run.
struct ResultStatistics {
    std::string name;
    std::string unit;
    std::optional<LimitRecord> limit;
    std::uint64_t runs = 0;
    std::uint64_t outside = 0;  // how often it was outside of its limit
    double minimum = 0;
    double median = 0;
    double maximum = 0;
};

// The repetitions of one diagnostic or experiment.
struct RepeatRecord {
    std::string name;
    std::uint64_t runs = 0;
    std::uint64_t passed = 0;
    std::uint64_t failed = 0;
    std::uint64_t errors = 0;
    double seconds = 0;  // of all runs
    std::vector<ResultStatistics> results;
};

// What will be run for a name that was asked for.
struct PlannedRecord {
    std::string name;
    PartRecord experiment;
    std::optional<PartRecord> analysis;
};

// Everything that one call of the program did.
struct SessionRecord {
    std::string version;      // of the program
    std::string commandLine;  // as it was given
    std::string deviceName;
    std::string deviceSummary;
    platform::Date started = platform::Date::now();
    double seconds = 0;
    // One entry a name asked for; known when the session starts.
    std::vector<PlannedRecord> planned;
    // One record a name asked for; of a repeated run the first that did not pass, else the last.
    std::vector<RunRecord> runs;
    // One entry a name when runs were repeated; empty otherwise.
    std::vector<RepeatRecord> repeats;
    Verdict verdict = Verdict::Passed;  // the worst of all runs, repetitions included
};

// "PASS", "FAIL", "ERROR".
std::string_view verdictText(Verdict verdict);

// "experiment", "analysis".
std::string_view partText(Part part);

// The failure in one line: the error's description, or what happened instead.
std::string failureText(const FailureRecord& failure);

// A number as people and parsers read it: the shortest decimal text that reads back to the same
// value; nan, inf, -inf.
std::string numberText(double value);

// The limit as a range: "0 … 0 events", "≥ 30 frames", "> 0 and < 5 errors", "no bounds"; without a
// unit the numbers alone.
std::string limitText(const LimitRecord& limit, std::string_view unit);

}  // namespace host

#endif
