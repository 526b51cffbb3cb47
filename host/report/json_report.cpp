#include "host/report/json_report.h"

#include <cstddef>

#include "host/record/run_text.h"
#include "host/report/json_value.h"

namespace host {

namespace {

using Json = nlohmann::ordered_json;
using host::jsonOf;
using platform::Number;

std::string_view kindText(Number::Kind kind) {
    static constexpr std::string_view kTexts[] = {"absent", "boolean", "int8",  "int16",
                                                  "int32",  "int64",   "uint8", "uint16",
                                                  "uint32", "uint64",  "float", "double"};
    return kTexts[static_cast<std::size_t>(kind)];
}

Json kindsOf(const platform::Value& value) {
    if (const Number* number = value.number()) {
        return kindText(number->kind());
    }
    if (value.string() != nullptr) {
        return "string";
    }
    if (const platform::List* list = value.list()) {
        Json kinds = Json::array();
        bool alike = true;
        for (const platform::Value& element : *list) {
            kinds.push_back(kindsOf(element));
            alike = alike && kinds.back() == kinds.front();
        }
        return alike && !kinds.empty() ? Json::array({kinds.front()}) : kinds;
    }
    if (const platform::Dictionary* dictionary = value.dictionary()) {
        Json kinds = Json::object();
        for (const auto& [key, entry] : dictionary->entries()) {
            kinds[key] = kindsOf(entry);
        }
        return kinds;
    }
    return nullptr;
}

Json jsonOf(const platform::ErrorRef& error) {
    if (error == nullptr) {
        return nullptr;
    }
    Json object{{"domain", error->domain()},
                {"code", error->code()},
                {"description", error->localizedDescription()}};
    if (error->underlyingError() != nullptr) {
        object["underlying"] = jsonOf(error->underlyingError());
    }
    return object;
}

Json jsonOf(const std::optional<BoundRecord>& bound) {
    return bound.has_value() ? Json{{"value", jsonOf(bound->value)}, {"open", bound->open}}
                             : Json();
}

Json jsonOf(const std::optional<LimitRecord>& limit) {
    return limit.has_value() ? Json{{"name", limit->name},
                                    {"lower", jsonOf(limit->lower)},
                                    {"upper", jsonOf(limit->upper)}}
                             : Json();
}

std::string_view judgementText(Judgement judgement) {
    static constexpr std::string_view kTexts[] = {"information", "within", "outside",
                                                  "not measured"};
    return kTexts[static_cast<std::size_t>(judgement)];
}

Json jsonOf(const PartPlan& part, double seconds) {
    Json parameters = Json::object();
    for (const auto& [name, value] : part.parameters) {
        parameters[name] = jsonOf(value);
    }
    return {{"name", part.name},
            {"summary", part.summary},
            {"parameters", std::move(parameters)},
            {"seconds", seconds}};
}

template <class Records, class Convert>
Json arrayOf(const Records& records, Convert&& convert) {
    Json array = Json::array();
    for (const auto& record : records) {
        array.push_back(convert(record));
    }
    return array;
}

Json failuresOf(const std::vector<FailureRecord>& failures) {
    return arrayOf(failures, [](const FailureRecord& failure) {
        return Json{{"part", partText(failure.part)},
                    {"step", failure.step},
                    {"message", failureText(failure)},
                    {"error", jsonOf(failure.error)}};
    });
}

Json jsonOf(const ResultRecord& result) {
    return {{"name", result.name},
            {"value", jsonOf(result.value)},
            {"unit", result.unit},
            {"judgement", judgementText(result.judgement)},
            {"limit", jsonOf(result.limit)}};
}

Json resultsOf(const std::vector<ResultRecord>& results) {
    return arrayOf(results, [](const ResultRecord& result) { return jsonOf(result); });
}

Json benchResultsOf(const std::vector<BenchResult>& results) {
    return arrayOf(results, [](const BenchResult& result) {
        Json object = jsonOf(static_cast<const ResultRecord&>(result));
        object["partOfVerdict"] = result.partOfVerdict;
        if (result.judgement == Judgement::NotMeasured) {
            object["value"] = nullptr;
            object["note"] = result.note;
        }
        return object;
    });
}

template <class Value>
Json jsonOf(const std::optional<Value>& value) {
    return value.has_value() ? Json(*value) : Json();
}

Json jsonOf(const FrameRecord& frame) {
    Json temperatures = Json::object();
    for (std::size_t at = 0; at < kTemperatureCount; ++at) {
        if (frame.temperatures[at].has_value()) {
            temperatures[std::string(kTemperatures[at].key)] = jsonOf(*frame.temperatures[at]);
        }
    }
    return {{"number", frame.number},
            {"sensorNumber", jsonOf(frame.sensorNumber)},
            {"presentation", jsonOf(frame.presentation)},
            {"delivered", jsonOf(frame.delivered)},
            {"lightSource", frame.lightSource.has_value() ? jsonOf(*frame.lightSource) : Json()},
            {"temperatures", std::move(temperatures)}};
}

Json jsonOf(const LogRecord& line) {
    Json object{{"time", line.time.timestamp()},
                {"level", levelText(line.level)},
                {"message", line.message}};
    if (line.late) {
        object["late"] = true;
    }
    return object;
}

Json jsonOf(const RunRecord& run) {
    Json object{{"uuid", run.uuid},
                {"name", run.plan.name},
                {"summary", run.plan.summary},
                {"verdict", verdictText(run.verdict)},
                {"run", run.number},
                {"started", run.started.timestamp()},
                {"seconds", run.seconds},
                {"experiment", jsonOf(run.plan.experiment, run.experimentSeconds)},
                {"analysis", run.analysisSeconds.has_value()
                                 ? jsonOf(*run.plan.analysis, *run.analysisSeconds)
                                 : Json()}};
    object["failures"] = failuresOf(run.failures);
    object["results"] = resultsOf(run.results);
    object["benchResults"] = benchResultsOf(run.benchResults);
    object["measurements"] = arrayOf(run.measurements, [](const MeasurementRecord& measurement) {
        return Json{{"name", measurement.name},
                    {"value", jsonOf(measurement.value)},
                    {"unit", measurement.unit}};
    });
    const platform::Value auxiliary(run.auxiliaryData);
    object["auxiliaryData"] = jsonOf(auxiliary);
    object["auxiliaryDataKinds"] = kindsOf(auxiliary);
    object["framesDelivered"] = run.framesDelivered;
    object["framesLost"] = jsonOf(run.framesLost);
    object["imagesDelivered"] = run.imagesDelivered;
    object["frames"] = Json::array();  // see withFrames()
    object["log"] = arrayOf(run.log, [](const LogRecord& line) { return jsonOf(line); });
    return object;
}

Json statisticsOf(const std::vector<ResultStatistics>& results) {
    return arrayOf(results, [](const ResultStatistics& result) {
        Json object{{"name", result.name},
                    {"unit", result.unit},
                    {"runs", result.runs},
                    {"outside", result.outside},
                    {"minimum", jsonOf(result.minimum)},
                    {"median", jsonOf(result.median)},
                    {"maximum", jsonOf(result.maximum)},
                    {"limit", jsonOf(result.limit)}};
        if (result.notMeasured > 0) {
            object["notMeasured"] = result.notMeasured;
        }
        return object;
    });
}

Json jsonOf(const RepeatRecord& repeat) {
    Json object{{"name", repeat.name},      {"runs", repeat.runs},
                {"passed", repeat.passed},  {"failed", repeat.failed},
                {"errors", repeat.errors},  {"interrupted", repeat.interrupted},
                {"seconds", repeat.seconds}};
    object["results"] = statisticsOf(repeat.results);
    object["benchResults"] = statisticsOf(repeat.benchResults);
    object["notPassed"] = arrayOf(repeat.notPassed, [](const Repetition& one) {
        return Json{{"run", one.number},
                    {"verdict", verdictText(one.verdict)},
                    {"seconds", one.seconds},
                    {"why", one.why},
                    {"failures", failuresOf(one.failures)},
                    {"outside", resultsOf(one.outside)},
                    {"bench", benchResultsOf(one.bench)}};
    });
    object["outcomes"] = arrayOf(repeat.outcomes, [](const RepetitionOutcome& one) {
        return Json{{"verdict", verdictText(one.verdict)}, {"seconds", one.seconds}};
    });
    return object;
}

Json deviceOf(const SessionRecord& session) {
    Json facts = Json::object();
    for (const auto& [name, text] : session.deviceFacts) {
        facts[name] = text;
    }
    return {{"name", session.deviceName},
            {"summary", session.deviceSummary},
            {"facts", std::move(facts)}};
}

Json identityOf(const Identity& identity) {
    Json object = Json::object();
    for (const auto& [name, text] : kIdentityEntries) {
        object[name] = (identity.*text).empty() ? Json() : Json(identity.*text);
    }
    Json metadata = Json::object();
    for (const auto& [name, text] : identity.metadata) {
        metadata[name] = text;
    }
    object["metadata"] = std::move(metadata);
    return object;
}

// Text that is not UTF-8 (it may come from a device) must not stop the report.
std::string textOf(const Json& json, int indent) {
    return json.dump(indent, ' ', false, Json::error_handler_t::replace);
}

// The document's text with the frames of each run, one per line. As part of the document, those of a long
// run would need many times the memory of their text.
std::string withFrames(const std::string& document, const SessionRecord& session) {
    // Only a member of a run is indented like this, and no text contains a line's end.
    constexpr std::string_view kPlace = "\n      \"frames\": [";
    std::string text;
    std::size_t from = 0;
    for (const RunRecord& run : session.runs) {
        const std::size_t to = document.find(kPlace, from) + kPlace.size();
        text.append(document, from, to - from);
        for (const FrameRecord& frame : run.frames) {
            text += &frame != &run.frames.front() ? "," : "";
            text += "\n        " + textOf(jsonOf(frame), -1);
        }
        text += run.frames.empty() ? "" : "\n      ";
        from = to;
    }
    return text.append(document, from, std::string::npos);
}

}  // namespace

std::string jsonReport(const SessionRecord& session) {
    Json document{{"program", "zrlab"},
                  {"version", session.version},
                  {"commandLine", session.commandLine},
                  {"identity", identityOf(session.identity)},
                  {"device", deviceOf(session)},
                  {"started", session.started.timestamp()},
                  {"seconds", session.seconds},
                  {"verdict", verdictText(session.verdict)}};
    document["runs"] = arrayOf(session.runs, [](const RunRecord& run) { return jsonOf(run); });
    document["notStarted"] =
        arrayOf(session.notStarted(), [](const RunPlan& plan) { return Json(plan.name); });
    document["repeats"] =
        arrayOf(session.repeats, [](const RepeatRecord& repeat) { return jsonOf(repeat); });
    return withFrames(textOf(document, 2), session) + "\n";
}

std::shared_ptr<RunListener> openJsonReport(ReportSink sink, const TextStyle& /*style*/) {
    return wholeReport(std::move(sink), jsonReport);
}

}  // namespace host
