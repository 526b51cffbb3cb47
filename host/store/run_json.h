// Runs, and parts of them, as JSON that reads back to the same: what a spool keeps, and what the columns and
// attachments of a store hold that are not tables.
#ifndef ZR_HOST_STORE_RUN_JSON_H
#define ZR_HOST_STORE_RUN_JSON_H

#include <cstdint>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <nlohmann/json_fwd.hpp>

#include "host/record/run_record.h"
#include "host/store/store.h"

namespace host {

// Reading throws a std::runtime_error or an nlohmann::json::exception when the text is not what writing makes.
// In all of them a number that is not finite is the text "nan", "inf" or "-inf".

using Pairs = std::vector<std::pair<std::string, std::string>>;
std::string pairsToJson(const Pairs& pairs);
Pairs pairsFromJson(std::string_view text);

using Parameters = std::vector<std::pair<std::string, platform::Number>>;
std::string parametersToJson(const Parameters& parameters);
Parameters parametersFromJson(std::string_view text);

// Keeps the kinds of numbers: a number is ["int32", 5], a list ["list", ...] or, of numbers of one kind,
// ["int32s", 5, 6]; an opaque object becomes null.
std::string valueToJson(const platform::Value& value);
platform::Value valueFromJson(std::string_view text);

std::string framesToJson(const std::vector<FrameRecord>& frames);
std::vector<FrameRecord> framesFromJson(std::string_view text);

// The entry of the auxiliary data that is an attachment.
inline constexpr std::string_view kImages = "images";
// The auxiliary data without its images.
platform::Dictionary withoutImages(const platform::Dictionary& auxiliaryData);
// And with them.
platform::Dictionary withImages(const platform::Dictionary& auxiliaryData, platform::Value images);

// A run with the facts of its session; one line.
std::string runToJson(const SessionRecord& session, const RunRecord& run, Attachments attachments);
// The run is the only one of the session.
SessionRecord runFromJson(std::string_view text);

// Makes the run the only one of its session: what it planned, its verdict, and its duration.
void setOnlyRun(SessionRecord& session, RunRecord run);

// The words of the records, in both directions. Reading throws a std::runtime_error for an unknown one.
Verdict verdictOf(std::string_view name);
Judgement judgementOf(std::int64_t number);
Part partOf(std::string_view text);
platform::LogLevel levelOf(std::string_view text);
// One of kStep...
std::string_view stepOf(std::string_view text);

// Microseconds since 1970.
std::int64_t microsecondsOf(const platform::Date& date);
platform::Date dateOf(std::int64_t microseconds);

}  // namespace host

#endif
