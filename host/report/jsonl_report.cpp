#include "host/report/jsonl_report.h"

#include <algorithm>
#include <chrono>
#include <functional>
#include <iterator>
#include <optional>
#include <vector>

#include <fmt/compile.h>
#include <fmt/format.h>
#include <nlohmann/json.hpp>

#include "host/record/run_text.h"
#include "host/report/json_value.h"
#include "platform/wall_clock.h"

namespace host {

namespace {

using Json = nlohmann::ordered_json;
using host::jsonOf;

// The source of errors: the bench, the only software that the run start names.
constexpr const char* kSoftwareId = "zrlab";
constexpr const char* kHardwareId = "device";
constexpr std::string_view kPlatformFact = "platform";

Json parametersOf(const PartPlan& part) {
    Json parameters = Json::object();
    for (const auto& [name, value] : part.parameters) {
        parameters[name] = jsonOf(value);
    }
    return parameters;
}

Json parametersOf(const SessionRecord& session) {
    Json parameters = Json::object();
    for (const RunPlan& planned : session.planned) {
        Json& entry = parameters[planned.name];
        entry["experiment"] = parametersOf(planned.experiment);
        if (planned.analysis.has_value()) {
            entry["analysis"] = parametersOf(*planned.analysis);
        }
    }
    return parameters;
}

// The fact "platform" has an entry of its own in the standard; the others are metadata.
Json platformsOf(const SessionRecord& session) {
    Json platforms = Json::array();
    for (const auto& [name, text] : session.deviceFacts) {
        if (name == kPlatformFact) {
            platforms.push_back({{"info", text}});
        }
    }
    return platforms;
}

// The unit, where the standard has a place for it: the numbers of the hardware.
Json hardwareOf(const SessionRecord& session) {
    Json hardware{{"hardwareInfoId", kHardwareId}, {"name", session.deviceName}};
    if (!session.identity.unit.empty()) {
        hardware["serialNumber"] = session.identity.unit;
    }
    if (!session.identity.part.empty()) {
        hardware["partNumber"] = session.identity.part;
    }
    return hardware;
}

// What belongs to the session and not to the device.
Json metadataOf(const Identity& identity) {
    Json metadata = Json::object();
    for (const auto& [name, text] : kIdentityEntries) {
        if (!(identity.*text).empty()) {
            metadata[name] = identity.*text;
        }
    }
    for (const auto& [name, text] : identity.metadata) {
        metadata["meta." + name] = text;
    }
    return metadata;
}

Json dutInfoOf(const SessionRecord& session) {
    Json metadata{{"summary", session.deviceSummary}};
    for (const auto& [name, text] : session.deviceFacts) {
        if (name != kPlatformFact) {
            metadata[name] = text;
        }
    }
    const std::string& unit = session.identity.unit;
    return {{"dutInfoId", unit.empty() ? session.deviceName : unit},
            {"name", session.deviceName},
            {"platformInfos", platformsOf(session)},
            {"softwareInfos", Json::array({{{"softwareInfoId", kSoftwareId},
                                            {"name", "zrlab"},
                                            {"version", session.version},
                                            {"softwareType", "APPLICATION"}}})},
            {"hardwareInfos", Json::array({hardwareOf(session)})},
            {"metadata", std::move(metadata)}};
}

Json measurementOf(const std::string& name, double value, const std::string& unit) {
    Json measurement{{"name", name}, {"value", jsonOf(value)}};
    if (!unit.empty()) {
        measurement["unit"] = unit;
    }
    measurement["hardwareInfoId"] = kHardwareId;
    return measurement;
}

Json validatorsOf(const LimitRecord& limit) {
    Json validators = Json::array();
    const auto add = [&](const std::optional<BoundRecord>& bound, const char* open,
                         const char* closed) {
        if (bound.has_value()) {
            validators.push_back({{"name", limit.name},
                                  {"type", bound->open ? open : closed},
                                  {"value", jsonOf(bound->value)}});
        }
    };
    add(limit.lower, "GREATER_THAN", "GREATER_THAN_OR_EQUAL");
    add(limit.upper, "LESS_THAN", "LESS_THAN_OR_EQUAL");
    return validators;
}

// The limit of the bench as a measurement of its own, marked as the bench's.
Json benchMeasurementOf(const BenchResult& result) {
    Json measurement = measurementOf(result.name, result.value, result.unit);
    measurement["validators"] = validatorsOf(*result.limit);
    measurement["metadata"] = {{"judgedBy", "bench"}, {"partOfVerdict", result.partOfVerdict}};
    return measurement;
}

Json diagnosisOf(const RunRecord& run) {
    static constexpr std::string_view kTypes[] = {"PASS", "FAIL", "UNKNOWN", "UNKNOWN"};
    return {{"verdict", fmt::format("{}-{}", run.plan.name, verdictName(run.verdict))},
            {"type", kTypes[static_cast<std::size_t>(run.verdict)]},
            {"message", headline(run)},
            {"hardwareInfoId", kHardwareId}};
}

std::string_view severityText(platform::LogLevel level) {
    static constexpr std::string_view kTexts[] = {"DEBUG", "INFO", "ERROR"};
    return kTexts[static_cast<std::size_t>(level)];
}

std::string_view statusText(bool failed) {
    return failed ? "ERROR" : "COMPLETE";
}

Json errorOf(const std::string& symptom, const std::string& message) {
    return {{"symptom", symptom},
            {"message", message},
            {"softwareInfoIds", Json::array({kSoftwareId})}};
}

// Text that is not UTF-8 (it may come from a device) must not stop the report.
std::string textOf(const Json& value) {
    return value.dump(-1, ' ', false, Json::error_handler_t::replace);
}

// A quantity of the frames that is written as a series; `value` is absent where a frame lacks it.
struct FrameSeries {
    std::string name;
    std::string unit;  // empty when nothing specifies it
    std::function<std::optional<double>(const FrameRecord& frame, const FrameRecord* before)> value;
};

const std::vector<FrameSeries>& frameSeries() {
    const auto interval = [](double FrameRecord::*clock) {
        return [clock](const FrameRecord& frame, const FrameRecord* before) {
            return before != nullptr ? std::optional((frame.*clock - before->*clock) * 1000)
                                     : std::nullopt;
        };
    };
    static const std::vector<FrameSeries> kAll = [&interval] {
        std::vector<FrameSeries> all = {
            {"frame interval, device's clock", "ms", interval(&FrameRecord::presentation)},
            {"frame interval, arrival", "ms", interval(&FrameRecord::delivered)},
            {"light source", "",
             [](const FrameRecord& frame, const FrameRecord*) { return frame.lightSource; }}};
        for (std::size_t at = 0; at < kTemperatureCount; ++at) {
            all.push_back({std::string(kTemperatures[at].key), "",
                           [at](const FrameRecord& frame, const FrameRecord*) {
                               return frame.temperatures[at];
                           }});
        }
        return all;
    }();
    return kAll;
}

platform::Date after(const platform::Date& date, double seconds) {
    return platform::Date(date.moment() +
                          std::chrono::duration_cast<std::chrono::system_clock::duration>(
                              std::chrono::duration<double>(seconds)));
}

}  // namespace

platform::Date JsonlReport::_time() const {
    return _past.has_value() ? *_past : platform::Date::now();
}

void JsonlReport::_passTo(const platform::Date& time) {
    if (_past.has_value() && time.moment() > _past->moment()) {
        _past = time;
    }
}

void JsonlReport::sessionStarted(const SessionRecord& session) {
    const platform::MutexLock lock(_mutex);
    if (!session.runs.empty()) {
        _past = session.started;
    }
    _writeRun("testRunStart", {{"name", "zrlab"},
                               {"version", session.version},
                               {"commandLine", session.commandLine},
                               {"parameters", parametersOf(session)},
                               {"dutInfo", dutInfoOf(session)},
                               {"metadata", metadataOf(session.identity)}});
}

void JsonlReport::runStarted(const RunRecord& run) {
    const platform::MutexLock lock(_mutex);
    _runStarted = run.started;
    _passTo(run.started);
    _failuresWritten = 0;
}

void JsonlReport::partStarted(const RunRecord& run, Part part) {
    const platform::MutexLock lock(_mutex);
    _closeStep();
    _part = part;
    _step = fmt::format("{}-{}-{}-{}", _steps++, run.plan.name, run.number, partText(part));
    if (part == Part::Experiment) {
        _stepText = textOf(_step);
        _firstSeries += _seriesLengths.size();
        _seriesLengths.assign(frameSeries().size(), 0);
        _lastFrame.reset();
    }
    _writeStep("testStepStart", {{"name", partOf(run, part).name}});
    if (part == Part::Experiment) {
        _writeStep("extension",
                   {{"name", "run"}, {"content", {{"uuid", run.uuid}, {"number", run.number}}}});
    }
}

void JsonlReport::logged(const LogRecord& line) {
    const platform::MutexLock lock(_mutex);
    if (_ended) {
        return;
    }
    _passTo(line.time);
    Json content{{"severity", severityText(line.level)}, {"message", line.message}};
    if (line.late) {
        // Not into the step that is open, which belongs to another run.
        content["message"] = "late: " + line.message;
        _writeRun("log", std::move(content));
    } else {
        _writeHere("log", std::move(content));
    }
}

void JsonlReport::partEnded(const RunRecord& run, Part part) {
    const platform::MutexLock lock(_mutex);
    _passTo(after(run.started, run.experimentSeconds +
                                   (part == Part::Analysis ? run.analysisSeconds.value_or(0) : 0)));
    _writePart(run, part);
}

void JsonlReport::_writePart(const RunRecord& run, Part part) {
    _part.reset();
    if (part == Part::Experiment) {
        for (const MeasurementRecord& one : run.measurements) {
            _writeStep("measurement", measurementOf(one.name, one.value, one.unit));
        }
        for (const auto& [name, value] : run.auxiliaryData.entries()) {
            const platform::List elements =
                value.list() != nullptr ? *value.list() : platform::List{value};
            for (const platform::Value& element : elements) {
                Json content = jsonOf(element);
                _writeStep("extension",
                           {{"name", name},
                            {"content",
                             content.is_object() ? std::move(content) : Json{{"value", content}}}});
            }
        }
        _endFrames(run);
    } else {
        for (const ResultRecord& one : run.results) {
            Json measurement = measurementOf(one.name, one.value, one.unit);
            if (one.limit.has_value()) {
                measurement["validators"] = validatorsOf(*one.limit);
            }
            _writeStep("measurement", std::move(measurement));
        }
    }
    _stepFailed = run.failures.size() > _failuresWritten;
    _writeFailures(run);
}

void JsonlReport::runEnded(const RunRecord& run) {
    const platform::MutexLock lock(_mutex);
    _passTo(after(run.started, run.seconds));
    // A part that was given up has not ended; what it had found until then is in the record.
    if (_part.has_value()) {
        _writePart(run, *_part);
    }
    _stepFailed = _stepFailed || run.verdict == Verdict::Interrupted;
    _writeBenchResults(run);
    const bool isJudged =
        run.plan.isDiagnostic() ||
        std::any_of(run.benchResults.begin(), run.benchResults.end(),
                    [](const BenchResult& result) { return result.partOfVerdict; });
    if (isJudged && !_step.empty()) {
        _writeStep("diagnosis", diagnosisOf(run));
    }
    _closeStep();
    // What is only known now, a broken rule of the device, is not a failure of a step.
    _writeFailures(run);
}

void JsonlReport::sessionEnded(const SessionRecord& session) {
    static constexpr std::string_view kResults[] = {"PASS", "FAIL", "NOT_APPLICABLE",
                                                    "NOT_APPLICABLE"};
    const platform::MutexLock lock(_mutex);
    for (const RunPlan& plan : session.notStarted()) {
        _step = fmt::format("{}-{}-not-started", _steps++, plan.name);
        _writeStep("testStepStart", {{"name", plan.experiment.name}});
        _writeStep("log", {{"severity", "INFO"}, {"message", "not started"}});
        _writeStep("testStepEnd", {{"status", "SKIP"}});
        _step.clear();
    }
    if (session.verdict == Verdict::Interrupted) {
        _writeRun("error", errorOf("interrupted", interruptionText(session)));
    }
    _writeRun("testRunEnd", {{"status", statusText(session.verdict >= Verdict::Error)},
                             {"result", kResults[static_cast<std::size_t>(session.verdict)]}});
    _ended = true;
}

void JsonlReport::_write(std::string_view kind, Json artifact) {
    if (_sequenceNumber == 0 && kind != "schemaVersion") {
        _write("schemaVersion", {{"major", 2}, {"minor", 0}});
    }
    Json line{{"sequenceNumber", _sequenceNumber++}, {"timestamp", _time().timestamp()}};
    line[kind] = std::move(artifact);
    _unwritten += textOf(line) + "\n";
    _flush();
}

void JsonlReport::_writeRun(std::string_view kind, Json content) {
    Json artifact = Json::object();
    artifact[kind] = std::move(content);
    _write("testRunArtifact", std::move(artifact));
}

void JsonlReport::_writeStep(std::string_view kind, Json content) {
    Json artifact{{"testStepId", _step}};
    artifact[kind] = std::move(content);
    _write("testStepArtifact", std::move(artifact));
}

void JsonlReport::_writeHere(std::string_view kind, Json content) {
    if (_step.empty()) {
        _writeRun(kind, std::move(content));
    } else {
        _writeStep(kind, std::move(content));
    }
}

void JsonlReport::_writeFailures(const RunRecord& run) {
    for (; _failuresWritten < run.failures.size(); ++_failuresWritten) {
        const FailureRecord& failure = run.failures[_failuresWritten];
        _writeHere("error", errorOf(symptomText(failure, "-"),
                                    placeText(failure, run) + ": " + causeText(failure, "; ")));
    }
}

void JsonlReport::_writeBenchResults(const RunRecord& run) {
    for (const BenchResult& result : run.benchResults) {
        const std::string text = fmt::format("{}: {}", result.name, benchLine(result, true));
        if (result.judgement != Judgement::NotMeasured) {
            _writeStep("measurement", benchMeasurementOf(result));
        } else if (result.partOfVerdict) {
            _writeStep("error", errorOf("bench-limit-not-measured", text));
        } else {
            _writeStep("log", {{"severity", "INFO"}, {"message", text}});
        }
    }
}

void JsonlReport::_endFrames(const RunRecord& run) {
    if (run.framesDelivered > 0) {
        Json content{{"delivered", run.framesDelivered}};
        if (run.framesLost.has_value()) {
            content["lost"] = *run.framesLost;
        }
        _writeStep("extension", {{"name", "frames"}, {"content", std::move(content)}});
    }
    for (std::size_t at = 0; at < _seriesLengths.size(); ++at) {
        if (_seriesLengths[at] > 0) {
            _writeStep("measurementSeriesEnd", {{"measurementSeriesId", _seriesId(at)},
                                                {"totalCount", _seriesLengths[at]}});
        }
    }
}

void JsonlReport::framesDelivered(const FrameBatch& batch) {
    const platform::MutexLock lock(_mutex);
    if (_part != Part::Experiment) {
        return;
    }
    for (const FrameRecord& frame : batch.frames) {
        _writeFrame(frame);
        _flush();
        _lastFrame = frame;
    }
}

// There are ten lines per frame, so they are made without a tree of values, and written together.
void JsonlReport::_writeFrame(const FrameRecord& frame) {
    const std::string now = _time().timestamp();
    const std::string delivered = after(_runStarted, frame.delivered).timestamp();
    std::string metadata = fmt::format(R"({{"frame":{})", frame.number);
    if (isNumberedApart(frame)) {
        metadata += fmt::format(R"(,"sensorFrame":{})", *frame.sensorNumber);
    }
    const std::vector<FrameSeries>& all = frameSeries();
    for (std::size_t at = 0; at < all.size(); ++at) {
        const FrameSeries& one = all[at];
        const std::optional<double> value =
            one.value(frame, _lastFrame.has_value() ? &*_lastFrame : nullptr);
        if (!value.has_value()) {
            continue;
        }
        if (_seriesLengths[at] == 0) {
            Json start{{"name", one.name}, {"measurementSeriesId", _seriesId(at)}};
            if (!one.unit.empty()) {
                start["unit"] = one.unit;
            }
            start["hardwareInfoId"] = kHardwareId;
            _writeStep("measurementSeriesStart", std::move(start));
        }
        fmt::format_to(
            std::back_inserter(_unwritten),
            FMT_COMPILE(
                R"({{"sequenceNumber":{},"timestamp":"{}","testStepArtifact":{{"testStepId":{},)"
                R"("measurementSeriesElement":{{"index":{},"value":{},"timestamp":"{}",)"
                R"("measurementSeriesId":"{}","metadata":{}}}}}}}}}{})"),
            _sequenceNumber++, now, _stepText, _seriesLengths[at]++, textOf(jsonOf(*value)),
            delivered, _seriesId(at), metadata, '\n');
    }
}

std::string JsonlReport::_seriesId(std::size_t at) const {
    return fmt::format("series-{}", _firstSeries + at);
}

void JsonlReport::_flush() {
    _sink(_unwritten);
    _unwritten.clear();
}

void JsonlReport::_closeStep() {
    if (!_step.empty()) {
        _writeStep("testStepEnd", {{"status", statusText(_stepFailed)}});
        _step.clear();
        _stepFailed = false;
    }
}

std::shared_ptr<RunListener> openJsonlReport(ReportSink sink, const TextStyle& /*style*/) {
    return std::make_shared<JsonlReport>(std::move(sink));
}

}  // namespace host
