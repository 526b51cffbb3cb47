// The words that reports have in common, so that every form uses the same ones.
#ifndef ZR_HOST_RECORD_RUN_TEXT_H
#define ZR_HOST_RECORD_RUN_TEXT_H

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "host/record/run_record.h"

namespace host {

// "PASS", "FAIL", "ERROR", "INTERRUPTED".
std::string_view verdictText(Verdict verdict);

// The verdict as part of a name: "pass", "fail", "error", "interrupted".
std::string_view verdictName(Verdict verdict);

// How many runs ended how, and how many names were not started. Counts that are seldom needed are left
// out when zero: "3 passed, 1 failed, 0 in error, 1 interrupted, 2 not started".
std::string countsText(const RepeatRecord& repeat);
std::string countsText(const SessionRecord& session);

// "experiment", "analysis".
std::string_view partText(Part part);

// The failure in one line: the error's description, or what happened instead.
std::string failureText(const FailureRecord& failure);

// A number as people and parsers read it: the shortest decimal text that reads back to the same value;
// nan, inf, -inf.
std::string numberText(double value);

// The limit as a range: "0 … 0 events", "≥ 30 frames", "> 0 and < 5 errors", "no bounds"; without a
// unit the numbers alone.
std::string limitText(const LimitRecord& limit, std::string_view unit);

// "1 frame", "2 frames".
std::string plural(std::uint64_t count, std::string_view one, std::string_view many);

// "3 events", "1 event"; the number alone when there is no unit.
std::string valueText(double value, std::string_view unit);

// "Max Reports: 0 … 0 events", "no limit".
std::string limitLine(const std::optional<LimitRecord>& limit, std::string_view unit);

// Whether a limit of the bench kept the run from passing: it is part of the verdict, and what it is on was
// outside or not measured.
bool isBenchFinding(const BenchResult& result);

// What a limit of the bench found, in one line: "4 errors, desk 7: 0 … 0 errors"; "not measured, no frame has
// it". With `verdict` one that is not part of the verdict says so.
std::string benchLine(const BenchResult& result, bool verdict);

// "all 3 bench limits met", "1 of 3 bench limits not met, 1 not measured"; empty when there are none.
std::string benchHeadline(const RunRecord& run);

// The outcome of the run in a few words: "2 of 64 limits not met", "stopped after 37 of 90 frames".
std::string headline(const RunRecord& run);

// What an interrupted session was stopped in: "NAME stopped after 37 of 90 frames", "NAME stopped in run
// 8", "stopped between two runs".
std::string interruptionText(const SessionRecord& session);

// Why the run did not pass, in one line that cannot control a terminal: its first failure, or its first
// result outside its limit, or that it was stopped. Empty when it passed.
std::string whyText(const RunRecord& run);

// The part of the run's plan; an experiment on its own has no analysis.
const PartPlan& partOf(const RunRecord& run, Part part);

// Where it failed: "experiment VantorFaultExperiment, run".
std::string placeText(const FailureRecord& failure, const RunRecord& run);

// What an error is known by: its domain and code joined by `separator`; a failure without an error
// object by its part and step.
std::string symptomText(const FailureRecord& failure, std::string_view separator);

// The failure and what caused it, outermost first, joined by `separator`; each with its domain and
// code: "Failed to start streaming. (Domain 204)" "caused by: Busy (Service -3)".
std::string causeText(const FailureRecord& failure, std::string_view separator);

// "debug", "default", "error".
std::string_view levelText(platform::LogLevel level);

// The line's level, and whether it came late: "error", "error, late".
std::string levelText(const LogRecord& line);

// What was given about the unit and the place: names and texts, "unit" "SN-7", in the order of Identity;
// metadata as it is named. Empty when nobody named more than a station: a station alone, which every session
// has, says nothing about this one.
std::vector<std::pair<std::string, std::string>> identityTexts(const Identity& identity);

// "90 frames delivered, 3 lost"; without the second when the sensor's numbers are not known.
// Empty when the run delivered no frames.
std::string framesText(const RunRecord& run);

// Whether the sensor's number of the frame is another than the received one.
bool isNumberedApart(const FrameRecord& frame);

// The frame by its received number, and by the sensor's where that differs: "frame 41 (the sensor's
// 44)".
std::string frameText(const FrameRecord& frame);

}  // namespace host

#endif
