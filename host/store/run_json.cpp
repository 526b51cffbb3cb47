#include "host/store/run_json.h"

#include <array>
#include <cmath>
#include <cstdlib>
#include <memory>
#include <optional>
#include <set>
#include <stdexcept>

#include <nlohmann/json.hpp>

#include "host/record/run_text.h"

namespace host {

namespace {

using Json = nlohmann::ordered_json;
using platform::Number;

constexpr int kFormat = 1;

// Text that is not UTF-8 (it may come from a device) must not lose the run.
std::string dump(const Json& json) {
    return json.dump(-1, ' ', false, Json::error_handler_t::replace);
}

Json jsonOf(double value) {
    return std::isfinite(value) ? Json(value) : Json(numberText(value));
}

double doubleOf(const Json& json) {
    if (!json.is_string()) {
        return json.get<double>();
    }
    for (const double value : {std::nan(""), HUGE_VAL, -HUGE_VAL}) {
        if (json == numberText(value)) {
            return value;
        }
    }
    throw std::runtime_error("not a number: " + dump(json));
}

Json jsonOf(std::uint64_t value) {
    return value;
}
Json jsonOf(std::int64_t value) {
    return value;
}

template <class T>
Json jsonOf(const std::optional<T>& value) {
    return value.has_value() ? jsonOf(*value) : Json();
}

template <class T>
std::optional<T> optionalOf(const Json& json) {
    if (json.is_null()) {
        return std::nullopt;
    }
    if constexpr (std::same_as<T, double>) {
        return doubleOf(json);
    } else {
        return json.get<T>();
    }
}

template <class T>
Number numberAs(const Json& json) {
    if constexpr (std::floating_point<T>) {
        return static_cast<T>(doubleOf(json));
    } else {
        return json.get<T>();
    }
}

// In the order of Number::Kind.
struct Kind {
    std::string_view name;
    Number (*read)(const Json& json);
};
constexpr Kind kKinds[] = {
    {"absent", [](const Json&) { return Number(); }},
    {"boolean", numberAs<bool>},
    {"int8", numberAs<std::int8_t>},
    {"int16", numberAs<std::int16_t>},
    {"int32", numberAs<std::int32_t>},
    {"int64", numberAs<std::int64_t>},
    {"uint8", numberAs<std::uint8_t>},
    {"uint16", numberAs<std::uint16_t>},
    {"uint32", numberAs<std::uint32_t>},
    {"uint64", numberAs<std::uint64_t>},
    {"float", numberAs<float>},
    {"double", numberAs<double>},
};

const Kind& kindOf(const Number& number) {
    return kKinds[static_cast<std::size_t>(number.kind())];
}
const Kind& kindOf(std::string_view name) {
    for (const Kind& kind : kKinds) {
        if (kind.name == name) {
            return kind;
        }
    }
    throw std::runtime_error("unknown kind of number: " + std::string(name));
}

Json jsonOf(const Number& number) {
    if (number.kind() == Number::Kind::Boolean) {
        return number.isTrue();
    }
    if (number.isFloating()) {
        return jsonOf(number.asDouble());
    }
    return number.isSigned() ? Json(number.as<std::int64_t>()) : Json(number.as<std::uint64_t>());
}

// The kind that all entries of the list have as numbers; absent when there is none.
Number::Kind commonKind(const platform::List& list) {
    Number::Kind kind = Number::Kind::Absent;
    for (const platform::Value& entry : list) {
        const Number::Kind own = entry.asNumber().kind();
        if (own == Number::Kind::Absent || (kind != Number::Kind::Absent && own != kind)) {
            return Number::Kind::Absent;
        }
        kind = own;
    }
    return kind;
}

Json jsonOf(const platform::Value& value) {
    if (const Number* number = value.number()) {
        return Json::array({kindOf(*number).name, jsonOf(*number)});
    }
    if (const std::string* text = value.string()) {
        return *text;
    }
    if (const platform::List* list = value.list()) {
        const Number::Kind kind = commonKind(*list);
        Json array = Json::array({"list"});
        if (kind != Number::Kind::Absent) {
            array[0] = std::string(kKinds[static_cast<std::size_t>(kind)].name) + "s";
        }
        for (const platform::Value& entry : *list) {
            array.push_back(kind != Number::Kind::Absent ? jsonOf(entry.asNumber())
                                                         : jsonOf(entry));
        }
        return array;
    }
    if (const platform::Dictionary* dictionary = value.dictionary()) {
        Json object = Json::object();
        for (const auto& [key, entry] : *dictionary) {
            object[std::string(key)] = jsonOf(entry);
        }
        return object;
    }
    return nullptr;
}

platform::Value valueOf(const Json& json) {
    if (json.is_string()) {
        return json.get<std::string>();
    }
    if (json.is_object()) {
        platform::MutableDictionary dictionary;
        for (const auto& [key, entry] : json.items()) {
            dictionary.set(key, valueOf(entry));
        }
        return platform::Dictionary(std::move(dictionary));
    }
    if (!json.is_array()) {
        return {};
    }
    const auto tag = json.at(0).get<std::string>();
    const bool isPacked = tag.ends_with('s');
    if (tag != "list" && !isPacked) {
        return kindOf(tag).read(json.at(1));
    }
    const Kind* kind = isPacked ? &kindOf(tag.substr(0, tag.size() - 1)) : nullptr;
    platform::MutableList list;
    for (std::size_t at = 1; at < json.size(); ++at) {
        list.push_back(kind != nullptr ? platform::Value(kind->read(json[at])) : valueOf(json[at]));
    }
    return platform::List(std::move(list));
}

template <class Records, class Convert>
Json arrayOf(const Records& records, const Convert& convert) {
    Json array = Json::array();
    for (const auto& record : records) {
        array.push_back(convert(record));
    }
    return array;
}

template <class Record, class Convert>
std::vector<Record> recordsOf(const Json& array, const Convert& convert) {
    if (!array.is_array()) {
        throw std::runtime_error("not a list: " + dump(array).substr(0, 40));
    }
    std::vector<Record> records;
    records.reserve(array.size());
    for (const Json& entry : array) {
        records.push_back(convert(entry));
    }
    return records;
}

Json jsonOf(const Pairs& pairs) {
    return arrayOf(pairs, [](const auto& pair) { return Json::array({pair.first, pair.second}); });
}

Pairs pairsOf(const Json& json) {
    return recordsOf<Pairs::value_type>(json, [](const Json& pair) {
        return std::pair(pair.at(0).get<std::string>(), pair.at(1).get<std::string>());
    });
}

Json jsonOf(const Parameters& parameters) {
    return arrayOf(parameters, [](const auto& parameter) {
        return Json{{"name", parameter.first},
                    {"kind", kindOf(parameter.second).name},
                    {"value", jsonOf(parameter.second)}};
    });
}

Parameters parametersOf(const Json& json) {
    return recordsOf<Parameters::value_type>(json, [](const Json& parameter) {
        return std::pair(
            parameter.at("name").get<std::string>(),
            kindOf(parameter.at("kind").get<std::string>()).read(parameter.at("value")));
    });
}

Json jsonOf(const FrameRecord& frame) {
    Json temperatures =
        arrayOf(frame.temperatures, [](const auto& celsius) { return jsonOf(celsius); });
    return {{"number", frame.number},
            {"sensorNumber", jsonOf(frame.sensorNumber)},
            {"presentation", jsonOf(frame.presentation)},
            {"delivered", jsonOf(frame.delivered)},
            {"lightSource", jsonOf(frame.lightSource)},
            {"temperatures", std::move(temperatures)}};
}

FrameRecord frameOf(const Json& json) {
    FrameRecord frame{.number = json.at("number").get<std::uint64_t>(),
                      .sensorNumber = optionalOf<std::int64_t>(json.at("sensorNumber")),
                      .presentation = doubleOf(json.at("presentation")),
                      .delivered = doubleOf(json.at("delivered")),
                      .lightSource = optionalOf<double>(json.at("lightSource")),
                      .temperatures = {}};
    for (std::size_t at = 0; at < frame.temperatures.size(); ++at) {
        frame.temperatures[at] = optionalOf<double>(json.at("temperatures").at(at));
    }
    return frame;
}

Json jsonOf(const std::optional<BoundRecord>& bound) {
    return bound.has_value() ? Json{{"value", jsonOf(bound->value)}, {"open", bound->open}}
                             : Json();
}

std::optional<BoundRecord> boundOf(const Json& json) {
    return json.is_null() ? std::nullopt
                          : std::optional(BoundRecord{doubleOf(json.at("value")),
                                                      json.at("open").get<bool>()});
}

Json jsonOf(const ResultRecord& result) {
    Json object{{"name", result.name},
                {"value", jsonOf(result.value)},
                {"unit", result.unit},
                {"judgement", static_cast<int>(result.judgement)}};
    if (result.limit.has_value()) {
        object["limit"] = {{"name", result.limit->name},
                           {"lower", jsonOf(result.limit->lower)},
                           {"upper", jsonOf(result.limit->upper)}};
    }
    return object;
}

ResultRecord resultOf(const Json& json) {
    ResultRecord result{.name = json.at("name").get<std::string>(),
                        .value = doubleOf(json.at("value")),
                        .unit = json.at("unit").get<std::string>(),
                        .limit = std::nullopt,
                        .judgement = judgementOf(json.at("judgement").get<std::int64_t>())};
    if (json.contains("limit")) {
        const Json& limit = json["limit"];
        result.limit = LimitRecord{limit.at("name").get<std::string>(), boundOf(limit.at("lower")),
                                   boundOf(limit.at("upper"))};
    }
    return result;
}

Json jsonOf(const BenchResult& result) {
    Json object = jsonOf(static_cast<const ResultRecord&>(result));
    object["partOfVerdict"] = result.partOfVerdict;
    object["note"] = result.note;
    return object;
}

BenchResult benchResultOf(const Json& json) {
    return {resultOf(json), json.at("partOfVerdict").get<bool>(),
            json.at("note").get<std::string>()};
}

Json jsonOf(const platform::ErrorRef& error) {
    return error == nullptr ? Json()
                            : Json{{"domain", error->domain()},
                                   {"code", error->code()},
                                   {"description", error->localizedDescription()},
                                   {"underlying", jsonOf(error->underlyingError())}};
}

platform::ErrorRef errorOf(const Json& json) {
    return json.is_null()
               ? nullptr
               : std::make_shared<const platform::Error>(
                     json.at("domain").get<std::string>(), json.at("code").get<std::int64_t>(),
                     json.at("description").get<std::string>(), errorOf(json.at("underlying")));
}

Json jsonOf(const FailureRecord& failure) {
    return {{"part", partText(failure.part)},
            {"step", failure.step},
            {"error", jsonOf(failure.error)},
            {"message", failure.message}};
}

FailureRecord failureOf(const Json& json) {
    return {partOf(json.at("part").get<std::string>()), stepOf(json.at("step").get<std::string>()),
            errorOf(json.at("error")), json.at("message").get<std::string>()};
}

Json jsonOf(const LogRecord& line) {
    return {{"time", microsecondsOf(line.time)},
            {"level", levelText(line.level)},
            {"message", line.message},
            {"late", line.late}};
}

LogRecord lineOf(const Json& json) {
    return {dateOf(json.at("time").get<std::int64_t>()),
            levelOf(json.at("level").get<std::string>()), json.at("message").get<std::string>(),
            json.at("late").get<bool>()};
}

Json jsonOf(const PartPlan& part) {
    return {
        {"name", part.name}, {"summary", part.summary}, {"parameters", jsonOf(part.parameters)}};
}

PartPlan partPlanOf(const Json& json) {
    return {json.at("name").get<std::string>(), json.at("summary").get<std::string>(),
            parametersOf(json.at("parameters"))};
}

Json sessionJson(const SessionRecord& session) {
    const Identity& identity = session.identity;
    return {{"version", session.version},
            {"commandLine", session.commandLine},
            {"started", microsecondsOf(session.started)},
            {"unit", identity.unit},
            {"part", identity.part},
            {"lot", identity.lot},
            {"station", identity.station},
            {"operator", identity.operatorName},
            {"metadata", jsonOf(identity.metadata)},
            {"deviceName", session.deviceName},
            {"deviceSummary", session.deviceSummary},
            {"deviceFacts", jsonOf(session.deviceFacts)}};
}

SessionRecord sessionOf(const Json& json) {
    const auto text = [&json](const char* key) { return json.at(key).get<std::string>(); };
    SessionRecord session;
    session.version = text("version");
    session.commandLine = text("commandLine");
    session.started = dateOf(json.at("started").get<std::int64_t>());
    session.identity = {.unit = text("unit"),
                        .part = text("part"),
                        .lot = text("lot"),
                        .station = text("station"),
                        .operatorName = text("operator"),
                        .metadata = pairsOf(json.at("metadata"))};
    session.deviceName = text("deviceName");
    session.deviceSummary = text("deviceSummary");
    session.deviceFacts = pairsOf(json.at("deviceFacts"));
    return session;
}

Json runJson(const RunRecord& run, Attachments attachments) {
    const auto each = [](const auto& record) { return jsonOf(record); };
    return {
        {"uuid", run.uuid},
        {"name", run.plan.name},
        {"summary", run.plan.summary},
        {"experiment", jsonOf(run.plan.experiment)},
        {"analysis", run.plan.analysis.has_value() ? jsonOf(*run.plan.analysis) : Json()},
        {"number", run.number},
        {"started", microsecondsOf(run.started)},
        {"seconds", jsonOf(run.seconds)},
        {"experimentSeconds", jsonOf(run.experimentSeconds)},
        {"analysisSeconds", jsonOf(run.analysisSeconds)},
        {"measurements", arrayOf(run.measurements,
                                 [](const MeasurementRecord& one) {
                                     return Json::array({one.name, jsonOf(one.value), one.unit});
                                 })},
        {"auxiliaryData",
         jsonOf(platform::Value(attachments.images ? run.auxiliaryData
                                                   : withoutImages(run.auxiliaryData)))},
        {"results", arrayOf(run.results, each)},
        {"benchResults", arrayOf(run.benchResults, each)},
        {"failures", arrayOf(run.failures, each)},
        {"log", arrayOf(run.log, each)},
        {"framesDelivered", run.framesDelivered},
        {"framesLost", jsonOf(run.framesLost)},
        {"imagesDelivered", run.imagesDelivered},
        {"frames", attachments.frames ? arrayOf(run.frames, each) : Json::array()},
        {"verdict", verdictName(run.verdict)}};
}

RunRecord runOf(const Json& json) {
    RunRecord run;
    run.uuid = json.at("uuid").get<std::string>();
    run.plan.name = json.at("name").get<std::string>();
    run.plan.summary = json.at("summary").get<std::string>();
    run.plan.experiment = partPlanOf(json.at("experiment"));
    if (!json.at("analysis").is_null()) {
        run.plan.analysis = partPlanOf(json["analysis"]);
    }
    run.number = json.at("number").get<std::uint64_t>();
    run.started = dateOf(json.at("started").get<std::int64_t>());
    run.seconds = doubleOf(json.at("seconds"));
    run.experimentSeconds = doubleOf(json.at("experimentSeconds"));
    run.analysisSeconds = optionalOf<double>(json.at("analysisSeconds"));
    run.measurements = recordsOf<MeasurementRecord>(json.at("measurements"), [](const Json& one) {
        return MeasurementRecord{one.at(0).get<std::string>(), doubleOf(one.at(1)),
                                 one.at(2).get<std::string>()};
    });
    const platform::Value auxiliary = valueOf(json.at("auxiliaryData"));
    if (const platform::Dictionary* dictionary = auxiliary.dictionary()) {
        run.auxiliaryData = *dictionary;
    }
    run.results = recordsOf<ResultRecord>(json.at("results"), resultOf);
    run.benchResults = recordsOf<BenchResult>(json.at("benchResults"), benchResultOf);
    run.failures = recordsOf<FailureRecord>(json.at("failures"), failureOf);
    run.log = recordsOf<LogRecord>(json.at("log"), lineOf);
    run.framesDelivered = json.at("framesDelivered").get<std::uint64_t>();
    run.framesLost = optionalOf<std::uint64_t>(json.at("framesLost"));
    run.imagesDelivered = json.at("imagesDelivered").get<std::uint64_t>();
    run.frames = recordsOf<FrameRecord>(json.at("frames"), frameOf);
    run.verdict = verdictOf(json.at("verdict").get<std::string>());
    return run;
}

// The value whose text is the given one.
template <class T, std::size_t N, class TextOf>
T fromText(const std::array<T, N>& values, std::string_view text, const TextOf& textOf) {
    for (const T value : values) {
        if (textOf(value) == text) {
            return value;
        }
    }
    throw std::runtime_error("unknown word: " + std::string(text));
}

}  // namespace

std::string pairsToJson(const Pairs& pairs) {
    return dump(jsonOf(pairs));
}
Pairs pairsFromJson(std::string_view text) {
    return pairsOf(Json::parse(text));
}

std::string parametersToJson(const Parameters& parameters) {
    return dump(jsonOf(parameters));
}
Parameters parametersFromJson(std::string_view text) {
    return parametersOf(Json::parse(text));
}

std::string valueToJson(const platform::Value& value) {
    return dump(jsonOf(value));
}
platform::Value valueFromJson(std::string_view text) {
    return valueOf(Json::parse(text));
}

std::string framesToJson(const std::vector<FrameRecord>& frames) {
    return dump(arrayOf(frames, [](const FrameRecord& frame) { return jsonOf(frame); }));
}
std::vector<FrameRecord> framesFromJson(std::string_view text) {
    return recordsOf<FrameRecord>(Json::parse(text), frameOf);
}

platform::Dictionary withoutImages(const platform::Dictionary& auxiliaryData) {
    platform::MutableDictionary entries = auxiliaryData.entries();
    entries.remove(kImages);
    return entries;
}

platform::Dictionary withImages(const platform::Dictionary& auxiliaryData, platform::Value images) {
    platform::MutableDictionary entries = auxiliaryData.entries();
    entries.set(kImages, std::move(images));
    return entries;
}

std::string runToJson(const SessionRecord& session, const RunRecord& run, Attachments attachments) {
    return dump({{"zrlabRun", kFormat},
                 {"session", sessionJson(session)},
                 {"run", runJson(run, attachments)}});
}

SessionRecord runFromJson(std::string_view text) {
    const Json json = Json::parse(text);
    if (json.at("zrlabRun") != kFormat) {
        throw std::runtime_error("its format is of another program");
    }
    SessionRecord session = sessionOf(json.at("session"));
    setOnlyRun(session, runOf(json.at("run")));
    return session;
}

void setOnlyRun(SessionRecord& session, RunRecord run) {
    session.planned = {run.plan};
    session.seconds = run.seconds;
    session.verdict = run.verdict;
    session.runs.clear();
    session.runs.push_back(std::move(run));
}

Verdict verdictOf(std::string_view name) {
    return fromText(
        std::array{Verdict::Passed, Verdict::Failed, Verdict::Error, Verdict::Interrupted}, name,
        verdictName);
}

Judgement judgementOf(std::int64_t number) {
    if (number < 0 || number > static_cast<std::int64_t>(Judgement::NotMeasured)) {
        throw std::runtime_error("unknown judgement: " + std::to_string(number));
    }
    return static_cast<Judgement>(number);
}

Part partOf(std::string_view text) {
    return fromText(std::array{Part::Experiment, Part::Analysis}, text, partText);
}

platform::LogLevel levelOf(std::string_view text) {
    using platform::LogLevel;
    return fromText(std::array{LogLevel::Debug, LogLevel::Default, LogLevel::Error}, text,
                    [](LogLevel level) { return levelText(level); });
}

std::string_view stepOf(std::string_view text) {
    return fromText(
        std::array{kStepCreate, kStepSetup, kStepRun, kStepTeardown, kStepAnalyze, kStepDevice},
        text, [](std::string_view step) { return step; });
}

std::int64_t microsecondsOf(const platform::Date& date) {
    return std::chrono::floor<std::chrono::microseconds>(date.moment().time_since_epoch()).count();
}

platform::Date dateOf(std::int64_t microseconds) {
    return platform::Date(
        std::chrono::system_clock::time_point(std::chrono::microseconds(microseconds)));
}

}  // namespace host
