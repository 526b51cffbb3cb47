#include "host/report/jsonl_report.h"

#include <optional>

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

Json deviceOf(const SessionRecord& session) {
    Json metadata{{"summary", session.deviceSummary}};
    for (const auto& [name, text] : session.deviceFacts) {
        if (name != kPlatformFact) {
            metadata[name] = text;
        }
    }
    return {{"dutInfoId", session.deviceName},
            {"name", session.deviceName},
            {"platformInfos", platformsOf(session)},
            {"softwareInfos", Json::array({{{"softwareInfoId", kSoftwareId},
                                            {"name", "zrlab"},
                                            {"version", session.version},
                                            {"softwareType", "APPLICATION"}}})},
            {"hardwareInfos",
             Json::array({{{"hardwareInfoId", kHardwareId}, {"name", session.deviceName}}})},
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

Json diagnosisOf(const RunRecord& run) {
    struct Row {
        const char* suffix;
        const char* type;
    };
    static constexpr Row kRows[] = {{"pass", "PASS"}, {"fail", "FAIL"}, {"error", "UNKNOWN"}};
    const Row& row = kRows[static_cast<std::size_t>(run.verdict)];
    return {{"verdict", run.plan.name + "-" + row.suffix},
            {"type", row.type},
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

}  // namespace

void JsonlReport::sessionStarted(const SessionRecord& session) {
    const platform::MutexLock lock(_mutex);
    _writeRun("testRunStart", {{"name", "zrlab"},
                               {"version", session.version},
                               {"commandLine", session.commandLine},
                               {"parameters", parametersOf(session)},
                               {"dutInfo", deviceOf(session)}});
}

void JsonlReport::runStarted(const RunRecord& /*run*/) {
    const platform::MutexLock lock(_mutex);
    _failuresWritten = 0;
}

void JsonlReport::partStarted(const RunRecord& run, Part part) {
    const platform::MutexLock lock(_mutex);
    _closeStep();
    _step = fmt::format("{}-{}-{}-{}", _steps++, run.plan.name, run.number, partText(part));
    _writeStep("testStepStart", {{"name", partOf(run, part).name}});
}

void JsonlReport::logged(const LogRecord& line) {
    const platform::MutexLock lock(_mutex);
    if (!_ended) {
        _writeHere("log", {{"severity", severityText(line.level)}, {"message", line.message}});
    }
}

void JsonlReport::partEnded(const RunRecord& run, Part part) {
    const platform::MutexLock lock(_mutex);
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
    if (run.plan.isDiagnostic()) {
        _writeStep("diagnosis", diagnosisOf(run));
    }
    _closeStep();
    // What is only known now, a broken rule of the device, is not a failure of a step.
    _writeFailures(run);
}

void JsonlReport::sessionEnded(const SessionRecord& session) {
    static constexpr std::string_view kResults[] = {"PASS", "FAIL", "NOT_APPLICABLE"};
    const platform::MutexLock lock(_mutex);
    _writeRun("testRunEnd", {{"status", statusText(session.verdict == Verdict::Error)},
                             {"result", kResults[static_cast<std::size_t>(session.verdict)]}});
    _ended = true;
}

void JsonlReport::_write(std::string_view kind, Json artifact) {
    if (_sequenceNumber == 0 && kind != "schemaVersion") {
        _write("schemaVersion", {{"major", 2}, {"minor", 0}});
    }
    Json line{{"sequenceNumber", _sequenceNumber++},
              {"timestamp", platform::Date::now().timestamp()}};
    line[kind] = std::move(artifact);
    // Text that is not UTF-8 (it may come from a device) must not stop the report.
    _sink(line.dump(-1, ' ', false, Json::error_handler_t::replace) + "\n");
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
        _writeHere("error", {{"symptom", symptomText(failure, "-")},
                             {"message", placeText(failure, run) + ": " + causeText(failure, "; ")},
                             {"softwareInfoIds", Json::array({kSoftwareId})}});
    }
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
