#include "host/store/store.h"

#include <cstddef>
#include <functional>
#include <limits>
#include <stdexcept>
#include <vector>

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/record/run_text.h"
#include "host/store/engine.h"
#include "host/store/migrations.h"
#include "host/store/run_json.h"

namespace host {

namespace {

constexpr std::string_view kMakeStation =
    "INSERT INTO stations (name) VALUES ($1) ON CONFLICT DO NOTHING";
constexpr std::string_view kFindStation = "SELECT id FROM stations WHERE name = $1";
constexpr std::string_view kMakeUnit =
    "INSERT INTO units (serial, part) VALUES ($1, $2) ON CONFLICT DO NOTHING";
constexpr std::string_view kFindUnit = "SELECT id FROM units WHERE serial = $1 AND part = $2";
constexpr std::string_view kMakeQuantity =
    "INSERT INTO quantities (name, unit) VALUES ($1, $2) ON CONFLICT DO NOTHING";
constexpr std::string_view kFindQuantity =
    "SELECT id FROM quantities WHERE name = $1 AND unit = $2";
constexpr std::string_view kMakeLimit =
    "INSERT INTO limits (name, bounds, lower, lower_open, upper, upper_open) VALUES ($1, $2, $3, "
    "$4, $5, $6) "
    "ON CONFLICT DO NOTHING";
constexpr std::string_view kFindLimit = "SELECT id FROM limits WHERE name = $1 AND bounds = $2";

constexpr std::string_view kAddRun =
    "INSERT INTO runs (uuid, started, day, seconds, diagnostic, summary, verdict, repetition, "
    "station_id, unit_id, "
    "part, lot, operator, metadata, version, command_line, session_started, device, "
    "device_summary, device_facts, "
    "frames_delivered, frames_lost, images_delivered, auxiliary) VALUES ($1, $2, $3, $4, $5, $6, "
    "$7, $8, $9, $10, "
    "$11, $12, $13, $14, $15, $16, $17, $18, $19, $20, $21, $22, $23, $24) ON CONFLICT (uuid) DO "
    "NOTHING RETURNING id";
constexpr std::string_view kAddStep =
    "INSERT INTO steps (run_id, part, name, summary, seconds, parameters) VALUES ($1, $2, $3, $4, "
    "$5, $6)";
constexpr std::string_view kAddResult =
    "INSERT INTO results (run_id, by_bench, of_analysis, place, quantity_id, value, limit_id, "
    "judgement, decides, note) VALUES ($1, $2, $3, $4, $5, $6, $7, $8, $9, $10)";
constexpr std::string_view kAddFailure =
    "INSERT INTO failures (run_id, place, depth, part, step, domain, code, description, message) "
    "VALUES ($1, $2, $3, $4, $5, $6, $7, $8, $9)";
constexpr std::string_view kAddLine =
    "INSERT INTO logs (run_id, place, time, level, late, message) VALUES ($1, $2, $3, $4, $5, $6)";
constexpr std::string_view kAddAttachment =
    "INSERT INTO attachments (run_id, name, type, content) VALUES ($1, $2, 'application/json', $3)";

constexpr std::string_view kLoadRun =
    "SELECT runs.id, runs.started, runs.seconds, diagnostic, summary, verdict, repetition, "
    "stations.name, "
    "units.serial, runs.part, lot, operator, metadata, version, command_line, session_started, "
    "device, "
    "device_summary, device_facts, frames_delivered, frames_lost, images_delivered, auxiliary FROM "
    "runs "
    "JOIN stations ON stations.id = station_id LEFT JOIN units ON units.id = unit_id WHERE uuid = "
    "$1";
constexpr std::string_view kLoadSteps =
    "SELECT part, name, summary, seconds, parameters FROM steps WHERE run_id = $1";
constexpr std::string_view kLoadResults =
    "SELECT by_bench, of_analysis, quantities.name, value, unit, judgement, limits.name, lower, "
    "lower_open, upper, upper_open, decides, note "
    "FROM results JOIN quantities ON quantities.id = quantity_id LEFT JOIN limits ON limits.id = "
    "limit_id "
    "WHERE run_id = $1 ORDER BY by_bench, of_analysis, place";
constexpr std::string_view kLoadFailures =
    "SELECT depth, part, step, domain, code, description, message FROM failures WHERE run_id = $1 "
    "ORDER BY place, depth DESC";
constexpr std::string_view kLoadLog =
    "SELECT time, level, message, late FROM logs WHERE run_id = $1 ORDER BY place";
constexpr std::string_view kLoadAttachments =
    "SELECT name, content FROM attachments WHERE run_id = $1";

constexpr std::string_view kFrames = "frames";

// A kind of rows that runs share: how one is found, and what makes it when there is none. The first parameters
// of both are the same.
struct SharedKind {
    std::string_view find;
    std::string_view make;
    std::ptrdiff_t keys;  // parameters of `find`
};
constexpr SharedKind kStation{kFindStation, kMakeStation, 1};
constexpr SharedKind kUnit{kFindUnit, kMakeUnit, 2};
constexpr SharedKind kQuantity{kFindQuantity, kMakeQuantity, 2};
constexpr SharedKind kLimit{kFindLimit, kMakeLimit, 2};

// Cells of what is written.

Cell cellOf(std::string_view text) {
    return cleanText(text);
}
template <class Integer>
Cell cellOf(const std::optional<Integer>& value) {
    return value.has_value() ? Cell(static_cast<std::int64_t>(*value)) : Cell();
}
Cell cellOf(const std::optional<double>& value) {
    return value.has_value() ? Cell(*value) : Cell();
}
Cell integerCell(std::uint64_t value) {
    return static_cast<std::int64_t>(value);
}
Cell bytesCell(const std::string& text) {
    const auto* begin = reinterpret_cast<const std::byte*>(text.data());
    return Bytes(begin, begin + text.size());
}

Row limitRow(const LimitRecord& limit) {
    Row row{cellOf(limit.name), limitText(limit, "")};
    for (const std::optional<BoundRecord>& bound : {limit.lower, limit.upper}) {
        row.push_back(bound.has_value() ? Cell(bound->value) : Cell());
        row.push_back(bound.has_value() ? Cell(std::int64_t{bound->open}) : Cell());
    }
    return row;
}

// What is read. A column of another type than the schema says is the fault of somebody who wrote by hand.

template <class T>
const T& as(const Cell& cell) {
    const T* value = std::get_if<T>(&cell);
    if (value == nullptr) {
        throw std::runtime_error("a column is not of its type");
    }
    return *value;
}
const std::string& textOf(const Cell& cell) {
    return as<std::string>(cell);
}
std::int64_t integerOf(const Cell& cell) {
    return as<std::int64_t>(cell);
}
std::uint64_t countOf(const Cell& cell) {
    return static_cast<std::uint64_t>(integerOf(cell));
}
bool isNull(const Cell& cell) {
    return std::holds_alternative<std::monostate>(cell);
}
double numberOf(const Cell& cell) {
    return isNull(cell) ? std::numeric_limits<double>::quiet_NaN() : as<double>(cell);
}
std::optional<BoundRecord> boundOf(const Cell& value, const Cell& open) {
    return isNull(open) ? std::nullopt
                        : std::optional(BoundRecord{numberOf(value), integerOf(open) != 0});
}
std::string_view viewOf(const Bytes& bytes) {
    return {reinterpret_cast<const char*>(bytes.data()), bytes.size()};
}

void readSteps(const Rows& rows, RunRecord& run) {
    for (const Row& row : rows) {
        PartPlan plan{textOf(row[1]), textOf(row[2]), parametersFromJson(textOf(row[4]))};
        const std::optional<double> seconds =
            isNull(row[3]) ? std::nullopt : std::optional(as<double>(row[3]));
        if (partOf(textOf(row[0])) == Part::Experiment) {
            run.plan.experiment = std::move(plan);
            run.experimentSeconds = seconds.value_or(0);
        } else {
            run.plan.analysis = std::move(plan);
            run.analysisSeconds = seconds;
        }
    }
}

void readResults(const Rows& rows, RunRecord& run) {
    for (const Row& row : rows) {
        const bool isBench = integerOf(row[0]) != 0;
        if (!isBench && integerOf(row[1]) == 0) {
            run.measurements.push_back({textOf(row[2]), numberOf(row[3]), textOf(row[4])});
            continue;
        }
        ResultRecord result{textOf(row[2]), numberOf(row[3]), textOf(row[4]), std::nullopt,
                            judgementOf(integerOf(row[5]))};
        if (!isNull(row[6])) {
            result.limit =
                LimitRecord{textOf(row[6]), boundOf(row[7], row[8]), boundOf(row[9], row[10])};
        }
        if (isBench) {
            run.benchResults.push_back(
                {std::move(result), integerOf(row[11]) != 0, textOf(row[12])});
        } else {
            run.results.push_back(std::move(result));
        }
    }
}

// The rows come with the innermost cause of a failure first.
void readFailures(const Rows& rows, RunRecord& run) {
    platform::ErrorRef error;
    for (const Row& row : rows) {
        error = isNull(row[3]) ? nullptr
                               : std::make_shared<const platform::Error>(
                                     textOf(row[3]), integerOf(row[4]), textOf(row[5]), error);
        if (integerOf(row[0]) == 0) {
            run.failures.push_back(
                {partOf(textOf(row[1])), stepOf(textOf(row[2])), error, textOf(row[6])});
            error = nullptr;
        }
    }
}

SessionRecord readRun(std::string_view uuid, const Row& row, const std::vector<Rows>& parts) {
    SessionRecord session;
    session.version = textOf(row[13]);
    session.commandLine = textOf(row[14]);
    session.started = dateOf(integerOf(row[15]));
    session.identity = {.unit = isNull(row[8]) ? "" : textOf(row[8]),
                        .part = textOf(row[9]),
                        .lot = textOf(row[10]),
                        .station = textOf(row[7]),
                        .operatorName = textOf(row[11]),
                        .metadata = pairsFromJson(textOf(row[12]))};
    session.deviceName = textOf(row[16]);
    session.deviceSummary = textOf(row[17]);
    session.deviceFacts = pairsFromJson(textOf(row[18]));

    RunRecord run;
    run.uuid = uuid;
    run.started = dateOf(integerOf(row[1]));
    run.seconds = as<double>(row[2]);
    run.plan.name = textOf(row[3]);
    run.plan.summary = textOf(row[4]);
    run.verdict = verdictOf(textOf(row[5]));
    run.number = countOf(row[6]);
    run.framesDelivered = countOf(row[19]);
    run.framesLost = isNull(row[20]) ? std::nullopt : std::optional(countOf(row[20]));
    run.imagesDelivered = countOf(row[21]);
    const platform::Value auxiliary = valueFromJson(textOf(row[22]));
    if (const platform::Dictionary* dictionary = auxiliary.dictionary()) {
        run.auxiliaryData = *dictionary;
    }
    readSteps(parts[0], run);
    readResults(parts[1], run);
    readFailures(parts[2], run);
    for (const Row& line : parts[3]) {
        run.log.push_back({dateOf(integerOf(line[0])), levelOf(textOf(line[1])), textOf(line[2]),
                           integerOf(line[3]) != 0});
    }
    for (const Row& attachment : parts[4]) {
        if (textOf(attachment[0]) == kFrames) {
            run.frames = framesFromJson(viewOf(as<Bytes>(attachment[1])));
        } else if (textOf(attachment[0]) == kImages) {
            run.auxiliaryData =
                withImages(run.auxiliaryData, valueFromJson(viewOf(as<Bytes>(attachment[1]))));
        }
    }
    setOnlyRun(session, std::move(run));
    return session;
}

// Finds the id of a row that runs share; the row holds what makes it when there is none.
using IdOf = std::function<Cell(const SharedKind& kind, Row row)>;

Statement runStatement(const SessionRecord& session, const RunRecord& run, const IdOf& idOf) {
    const Identity& identity = session.identity;
    Row unit{cellOf(identity.unit), cellOf(identity.part)};
    return {kAddRun,
            {cellOf(run.uuid),
             microsecondsOf(run.started),
             run.started.timestamp().substr(0, 10),
             run.seconds,
             cellOf(run.plan.name),
             cellOf(run.plan.summary),
             cellOf(verdictName(run.verdict)),
             integerCell(run.number),
             idOf(kStation, {cellOf(identity.station)}),
             identity.unit.empty() ? Cell() : idOf(kUnit, std::move(unit)),
             cellOf(identity.part),
             cellOf(identity.lot),
             cellOf(identity.operatorName),
             pairsToJson(identity.metadata),
             cellOf(session.version),
             cellOf(session.commandLine),
             microsecondsOf(session.started),
             cellOf(session.deviceName),
             cellOf(session.deviceSummary),
             pairsToJson(session.deviceFacts),
             integerCell(run.framesDelivered),
             cellOf(run.framesLost),
             integerCell(run.imagesDelivered),
             valueToJson(withoutImages(run.auxiliaryData))}};
}

Statement resultStatement(bool byBench,
                          bool ofAnalysis,
                          std::int64_t place,
                          const ResultRecord& result,
                          const IdOf& idOf) {
    Row row(1);
    row.push_back(std::int64_t{byBench});
    row.push_back(std::int64_t{ofAnalysis});
    row.push_back(place);
    row.push_back(idOf(kQuantity, {cellOf(result.name), cellOf(result.unit)}));
    row.push_back(result.value);
    row.push_back({});
    if (result.limit.has_value()) {
        row.back() = idOf(kLimit, limitRow(*result.limit));
    }
    row.push_back(static_cast<std::int64_t>(result.judgement));
    row.push_back(std::int64_t{1});
    row.push_back(std::string());
    return {kAddResult, std::move(row)};
}

void addResults(const RunRecord& run, const IdOf& idOf, std::vector<Statement>& all) {
    std::int64_t place = 0;
    for (const MeasurementRecord& one : run.measurements) {
        const ResultRecord result{one.name, one.value, one.unit, std::nullopt,
                                  Judgement::Information};
        all.push_back(resultStatement(false, false, place++, result, idOf));
    }
    place = 0;
    for (const ResultRecord& one : run.results) {
        all.push_back(resultStatement(false, true, place++, one, idOf));
    }
    place = 0;
    for (const BenchResult& one : run.benchResults) {
        Statement statement = resultStatement(true, false, place++, one, idOf);
        statement.parameters[8] = std::int64_t{one.partOfVerdict};
        statement.parameters[9] = cellOf(one.note);
        all.push_back(std::move(statement));
    }
}

// Everything that belongs to the run. The first parameter of each stays open: the run's id.
std::vector<Statement> partStatements(const RunRecord& run,
                                      Attachments attachments,
                                      const IdOf& idOf) {
    std::vector<Statement> all;
    all.reserve(run.measurements.size() + run.results.size() + run.benchResults.size() +
                run.failures.size() + run.log.size() + 4);
    const auto addStep = [&](Part part, const PartPlan& plan,
                             const std::optional<double>& seconds) {
        all.push_back({kAddStep,
                       {{},
                        cellOf(partText(part)),
                        cellOf(plan.name),
                        cellOf(plan.summary),
                        cellOf(seconds),
                        parametersToJson(plan.parameters)}});
    };
    addStep(Part::Experiment, run.plan.experiment, run.experimentSeconds);
    if (run.plan.analysis.has_value()) {
        addStep(Part::Analysis, *run.plan.analysis, run.analysisSeconds);
    }
    addResults(run, idOf, all);
    std::int64_t place = 0;
    for (const FailureRecord& failure : run.failures) {
        std::int64_t depth = 0;
        const platform::Error* error = failure.error.get();
        do {
            all.push_back({kAddFailure,
                           {{},
                            place,
                            depth++,
                            cellOf(partText(failure.part)),
                            cellOf(failure.step),
                            error != nullptr ? cellOf(error->domain()) : Cell(),
                            error != nullptr ? Cell(error->code()) : Cell(),
                            error != nullptr ? cellOf(error->localizedDescription()) : Cell(),
                            cellOf(failure.message)}});
            error = error != nullptr ? error->underlyingError().get() : nullptr;
        } while (error != nullptr);
        ++place;
    }
    place = 0;
    for (const LogRecord& line : run.log) {
        all.push_back({kAddLine,
                       {{},
                        place++,
                        microsecondsOf(line.time),
                        cellOf(levelText(line.level)),
                        std::int64_t{line.late},
                        cellOf(line.message)}});
    }
    if (attachments.frames && !run.frames.empty()) {
        all.push_back(
            {kAddAttachment, {{}, std::string(kFrames), bytesCell(framesToJson(run.frames))}});
    }
    if (attachments.images && run.auxiliaryData.contains(kImages)) {
        all.push_back(
            {kAddAttachment,
             {{}, std::string(kImages), bytesCell(valueToJson(run.auxiliaryData[kImages]))}});
    }
    return all;
}

}  // namespace

Store::Store(const std::string& where, Access access) : _database(openDatabase(where, access)) {}

void Store::connect() {
    if (_database->connect()) {
        _isReady = false;
        _ids.clear();
    }
    if (!_isReady) {
        migrate(*_database);
        _isReady = true;
    }
}

// Makes and finds the rows, all of one transaction. Every process does so in the order of the keys, so that two
// of them cannot wait for each other.
Store::Ids Store::_find(const MissingRows& missing) {
    std::vector<Statement> statements;
    for (const auto& [key, make] : missing) {
        statements.push_back(make);
        statements.push_back({key.first, key.second});
    }
    const std::vector<Rows> rows = _database->run(statements);
    Ids found;
    std::size_t at = 1;
    for (const auto& [key, make] : missing) {
        found[key] = integerOf(rows.at(at).at(0).at(0));
        at += 2;
    }
    return found;
}

bool Store::write(const SessionRecord& session, const RunRecord& run, Attachments attachments) {
    connect();
    MissingRows missing;
    Ids fresh;
    const IdOf idOf = [&](const SharedKind& kind, Row row) -> Cell {
        Ids::key_type key(kind.find, {row.begin(), row.begin() + kind.keys});
        if (const auto known = _ids.find(key); known != _ids.end()) {
            return known->second;
        }
        if (const auto known = fresh.find(key); known != fresh.end()) {
            return known->second;
        }
        missing.try_emplace(std::move(key), Statement{kind.make, std::move(row)});
        return {};
    };
    Statement head = runStatement(session, run, idOf);
    std::vector<Statement> parts = partStatements(run, attachments, idOf);
    _database->begin();
    try {
        if (!missing.empty()) {
            fresh = _find(missing);
            head = runStatement(session, run, idOf);
            parts = partStatements(run, attachments, idOf);
        }
        const Rows added = _database->run({&head, 1}).front();
        if (added.empty()) {
            _database->rollback();
            return false;
        }
        for (Statement& part : parts) {
            part.parameters.front() = added.front().front();
        }
        _database->run(parts);
        _database->commit();
    } catch (...) {
        _database->rollback();
        throw;
    }
    _ids.merge(fresh);
    return true;
}

std::optional<SessionRecord> Store::load(std::string_view uuid) {
    connect();
    const Statement head{kLoadRun, {std::string(uuid)}};
    const Rows rows = _database->run({&head, 1}).front();
    if (rows.empty()) {
        return std::nullopt;
    }
    const Row id{rows.front().front()};
    const Statement parts[] = {{kLoadSteps, id},
                               {kLoadResults, id},
                               {kLoadFailures, id},
                               {kLoadLog, id},
                               {kLoadAttachments, id}};
    try {
        return readRun(uuid, rows.front(), _database->run(parts));
    } catch (const StoreProblem&) {
        throw;
    } catch (const std::exception& exception) {
        throw StoreProblem(
            StoreProblem::Cause::Unusable,
            fmt::format("{}: run {} cannot be read: {}", name(), uuid, exception.what()));
    }
}

Rows Store::query(std::string_view sql, Row parameters) {
    connect();
    const Statement statement{sql, std::move(parameters)};
    return _database->run({&statement, 1}).front();
}

}  // namespace host
