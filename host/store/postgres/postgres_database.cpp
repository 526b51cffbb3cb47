// The engine for a store on a PostgreSQL server.
//
// On libpq itself: an operation must end when the server falls silent, and the statements of a run go out
// together in pipeline mode; the C++ library for it has neither a deadline nor a pipeline with parameters.
// Every wait is a poll() with a deadline, on a connection that never blocks.
#include <algorithm>
#include <cerrno>
#include <charconv>
#include <chrono>
#include <cmath>
#include <cstdlib>
#include <future>
#include <libpq-fe.h>
#include <map>
#include <optional>
#include <stdexcept>
#include <string>
#include <thread>
#include <utility>

#include <poll.h>

#include "host/store/database.h"

namespace host {

namespace {

using Cause = StoreProblem::Cause;
using Clock = std::chrono::steady_clock;

struct Finish {
    void operator()(PGconn* connection) const { PQfinish(connection); }
};
struct Clear {
    void operator()(PGresult* result) const { PQclear(result); }
};
struct FreeOptions {
    void operator()(PQconninfoOption* options) const { PQconninfoFree(options); }
};
struct FreeMemory {
    void operator()(void* memory) const { PQfreemem(memory); }
};
using Connection = std::unique_ptr<PGconn, Finish>;
using Result = std::unique_ptr<PGresult, Clear>;

// Identifiers of types that every server has, from its catalogue pg_type.
enum TypeId : Oid {
    kBoolean = 16,
    kBytes = 17,
    kInt8 = 20,
    kInt2 = 21,
    kInt4 = 23,
    kFloat4 = 700,
    kFloat8 = 701,
    kNumeric = 1700,
};

// The cause by the server's code; see the appendix on error codes in its manual.
Cause causeOf(std::string_view state) {
    struct Known {
        std::string_view begin;
        Cause cause;
    };
    static constexpr Known kKnown[] = {
        {"22", Cause::Refused},      // data exception
        {"23", Cause::Refused},      // integrity constraint
        {"54", Cause::Refused},      // program limit exceeded
        {"53100", Cause::Full},      // disk full
        {"25006", Cause::ReadOnly},  // read-only transaction, of a standby, say
        {"42501", Cause::ReadOnly},  // insufficient privilege
        {"55P03", Cause::Locked},    // lock not available in time
        {"40", Cause::Locked},       // deadlock
        {"42", Cause::Unusable},     // an object is missing or another than expected
        {"XX", Cause::Unusable},     // data corrupted
        {"3F", Cause::Unusable},     // no such schema
    };
    for (const Known& known : kKnown) {
        if (state.starts_with(known.begin)) {
            return known.cause;
        }
    }
    return Cause::Away;
}

// One line of the library's text, which may have several and end with a line's end.
std::string oneLine(std::string text) {
    while (!text.empty() && text.back() == '\n') {
        text.pop_back();
    }
    std::replace(text.begin(), text.end(), '\n', ' ');
    std::replace(text.begin(), text.end(), '\t', ' ');
    return text;
}

// The text of a parameter, which the server reads; null for NULL.
class ParameterText {
  public:
    explicit ParameterText(const Cell& cell) {
        if (const auto* integer = std::get_if<std::int64_t>(&cell)) {
            _put(*integer);
        } else if (const auto* number = std::get_if<double>(&cell);
                   number != nullptr && !std::isnan(*number)) {
            _put(*number);  // the shortest text that reads back to the same value
        } else if (const auto* text = std::get_if<std::string>(&cell)) {
            _text = text->c_str();
        } else if (const auto* bytes = std::get_if<Bytes>(&cell)) {
            _text = bytes->empty() ? "" : reinterpret_cast<const char*>(bytes->data());
            _size = static_cast<int>(bytes->size());
            _isBinary = 1;
        }
    }

    const char* text() const { return _isOwn ? _own : _text; }
    int size() const { return _size; }  // of bytes
    int isBinary() const { return _isBinary; }

  private:
    template <class Value>
    void _put(Value value) {
        *std::to_chars(_own, _own + sizeof _own - 1, value).ptr = '\0';
        _isOwn = true;
    }

    char _own[32];
    bool _isOwn = false;
    const char* _text = nullptr;
    int _size = 0;
    int _isBinary = 0;
};

double doubleOf(std::string_view text) {
    double value = 0;
    std::from_chars(text.data(), text.data() + text.size(), value);
    return value;
}

Cell cellOf(const PGresult* result, int row, int column) {
    if (PQgetisnull(result, row, column) != 0) {
        return {};
    }
    const char* value = PQgetvalue(result, row, column);
    const std::string_view text(value, static_cast<std::size_t>(PQgetlength(result, row, column)));
    switch (PQftype(result, column)) {
        case kBoolean:
            return std::int64_t{text == "t"};
        case kFloat4:
        case kFloat8:
            return doubleOf(text);
        case kInt2:
        case kInt4:
        case kInt8:
        case kNumeric: {
            std::int64_t integer = 0;
            const auto [end, error] =
                std::from_chars(text.data(), text.data() + text.size(), integer);
            // A numeric may have a fraction, or be out of range.
            return error == std::errc() && end == text.data() + text.size() ? Cell(integer)
                                                                            : Cell(doubleOf(text));
        }
        case kBytes: {
            std::size_t size = 0;
            const std::unique_ptr<unsigned char, FreeMemory> bytes(
                PQunescapeBytea(reinterpret_cast<const unsigned char*>(value), &size));
            const auto* begin = reinterpret_cast<const std::byte*>(bytes.get());
            return Bytes(begin, begin + size);
        }
        default:
            return std::string(text);
    }
}

Rows rowsOf(const PGresult* result) {
    Rows rows(static_cast<std::size_t>(PQntuples(result)));
    const int columns = PQnfields(result);
    for (std::size_t row = 0; row < rows.size(); ++row) {
        rows[row].reserve(static_cast<std::size_t>(columns));
        for (int column = 0; column < columns; ++column) {
            rows[row].push_back(cellOf(result, static_cast<int>(row), column));
        }
    }
    return rows;
}

class PostgresDatabase final : public Database {
  public:
    PostgresDatabase(std::string address, Access access)
        : _address(std::move(address)), _access(access) {
        char* problem = nullptr;
        const std::unique_ptr<PQconninfoOption, FreeOptions> options(
            PQconninfoParse(_address.c_str(), &problem));
        if (options == nullptr) {
            const std::unique_ptr<char, FreeMemory> owned(problem);
            // The library's text may hold a part of the address, and so of the password.
            throw std::runtime_error(
                "the address is not well formed; it is postgresql://USER@HOST/DATABASE");
        }
        std::map<std::string_view, std::string> given;
        for (const PQconninfoOption* option = options.get(); option->keyword != nullptr; ++option) {
            given[option->keyword] = option->val != nullptr ? option->val : "";
        }
        _name = "postgresql://" + given["host"] +
                (given["port"].empty() ? "" : ":" + given["port"]) + "/" + given["dbname"];
    }

    const std::string& name() const override { return _name; }

    void setPatience(std::chrono::milliseconds patience) override { _patience = patience; }

    bool connect() override {
        if (_connection != nullptr) {
            return false;
        }
        const auto deadline = _deadline();
        _connection = _startConnection(deadline);
        PostgresPollingStatusType state = PGRES_POLLING_WRITING;
        while (state != PGRES_POLLING_OK) {
            if (state == PGRES_POLLING_FAILED) {
                _lost();
            }
            _await(state == PGRES_POLLING_READING ? POLLIN : POLLOUT, deadline);
            state = PQconnectPoll(_connection.get());
        }
        PQsetnonblocking(_connection.get(), 1);
        PQsetNoticeProcessor(
            _connection.get(), [](void*, const char*) {}, nullptr);
        // The server gives up a little before this side does, and says what it waited for. It undoes what
        // another station began and left, so that nobody waits for that one.
        const auto lockTimeout = std::max<std::int64_t>(1, _patience.count() * 9 / 10);
        runScript(
            "SET search_path = zrlab; SET synchronous_commit = on; SET client_encoding = 'UTF8';"
            "SET idle_in_transaction_session_timeout = 10000; SET lock_timeout = " +
            std::to_string(lockTimeout));
        if (_access == Access::Existing && !hasTable("schema_version")) {
            _connection.reset();
            throw StoreProblem(Cause::Away, _name + ": there is no store");
        }
        return true;
    }

    bool hasTable(std::string_view table) override {
        const Statement statement{
            "SELECT 1 FROM pg_tables WHERE schemaname = 'zrlab' AND tablename = $1",
            {std::string(table)}};
        return !run({&statement, 1}).front().empty();
    }

    void runScript(std::string_view text) override {
        static constexpr std::pair<std::string_view, std::string_view> kWords[] = {
            {"{id}", "BIGINT GENERATED BY DEFAULT AS IDENTITY PRIMARY KEY"},
            {"{bytes}", "BYTEA"},
            {"{clustered}", ""}};
        _sent(PQsendQuery(_connection.get(), withWords(text, kWords).c_str()));
        const auto deadline = _deadline();
        std::optional<StoreProblem> problem;
        while (const Result result = _nextResult(deadline)) {
            _note(result.get(), problem);
        }
        if (problem.has_value()) {
            throw StoreProblem(*problem);
        }
    }

    std::vector<Rows> run(std::span<const Statement> statements) override {
        const auto deadline = _deadline();
        PGconn* connection = _connection.get();
        _sent(PQenterPipelineMode(connection));
        std::vector<std::string_view> fresh;
        // What was sent, in its order: whether its rows are wanted.
        std::vector<bool> wanted;
        for (const Statement& statement : statements) {
            auto [known, isNew] = _prepared.try_emplace(std::string(statement.sql));
            if (isNew) {
                known->second = "s" + std::to_string(++_preparedCount);
                fresh.push_back(known->first);
                _sent(PQsendPrepare(connection, known->second.c_str(), known->first.c_str(), 0,
                                    nullptr));
                wanted.push_back(false);
            }
            _sendPrepared(known->second, statement.parameters);
            wanted.push_back(true);
        }
        _sent(PQpipelineSync(connection));
        std::vector<Rows> all;
        std::optional<StoreProblem> problem;
        for (const bool isWanted : wanted) {
            while (const Result result = _nextResult(deadline)) {
                _note(result.get(), problem);
                if (isWanted && !problem.has_value()) {
                    all.push_back(rowsOf(result.get()));
                }
            }
        }
        _nextResult(deadline);  // of the sync
        _sent(PQexitPipelineMode(connection));
        if (problem.has_value()) {
            // Some of them may not be prepared. Another name does no harm.
            for (const std::string_view sql : fresh) {
                _prepared.erase(_prepared.find(sql));
            }
            throw StoreProblem(*problem);
        }
        return all;
    }

    void begin() override { runScript("BEGIN"); }
    void commit() override { runScript("COMMIT"); }
    void rollback() noexcept override {
        if (_connection != nullptr && PQtransactionStatus(_connection.get()) != PQTRANS_IDLE) {
            try {
                runScript("ROLLBACK");
            } catch (...) {
                _close();  // the server undoes it then
            }
        }
    }

    void lockSchema() override {
        // The number is the program's own choice: "zrlab" in ASCII.
        const Statement statements[] = {{"SELECT pg_advisory_xact_lock(x'7a726c6162'::bigint)"},
                                        {"SELECT 1 FROM pg_namespace WHERE nspname = 'zrlab'"}};
        if (run(statements).back().empty()) {
            runScript("CREATE SCHEMA zrlab");
        }
    }

  private:
    Clock::time_point _deadline() const { return Clock::now() + _patience; }

    // Starting a connection looks up the server's name, which can take longer than anybody waits. So it is done
    // on a thread of its own, which is left alone when it does not end in time.
    Connection _startConnection(Clock::time_point deadline) const {
        std::promise<Connection> promise;
        auto started = promise.get_future();
        std::thread([promise = std::move(promise), address = _address]() mutable {
            promise.set_value(Connection(PQconnectStart(address.c_str())));
        }).detach();
        if (started.wait_until(deadline) != std::future_status::ready) {
            throw StoreProblem(Cause::Silent, _name + ": its address was not found in time");
        }
        return started.get();
    }

    void _close() noexcept {
        _prepared.clear();
        _connection.reset();
    }

    // The connection is of no use any more.
    [[noreturn]] void _lost() {
        const std::string text = oneLine(PQerrorMessage(_connection.get()));
        _close();
        throw StoreProblem(Cause::Away,
                           _name + ": " + (text.empty() ? "the connection broke" : text));
    }

    void _sent(int isSent) {
        if (isSent == 0) {
            _lost();
        }
    }

    void _await(short events, Clock::time_point deadline) {
        for (;;) {
            const auto left =
                std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now()).count();
            pollfd socket{PQsocket(_connection.get()), events, 0};
            const int ready =
                left > 0 ? poll(&socket, 1, static_cast<int>(std::min<std::int64_t>(left, 1 << 30)))
                         : 0;
            if (ready > 0) {
                return;
            }
            if (ready == 0) {
                _close();
                throw StoreProblem(Cause::Silent, _name + ": the server does not answer");
            }
            if (errno != EINTR) {
                _lost();
            }
        }
    }

    // The next result; null at the end of a statement's. Sends meanwhile what waits for being sent.
    Result _nextResult(Clock::time_point deadline) {
        PGconn* connection = _connection.get();
        for (;;) {
            const int unsent = PQflush(connection);
            if (unsent < 0) {
                _lost();
            }
            if (PQisBusy(connection) == 0) {
                return Result(PQgetResult(connection));
            }
            _await(static_cast<short>(unsent > 0 ? POLLIN | POLLOUT : POLLIN), deadline);
            if (PQconsumeInput(connection) == 0) {
                _lost();
            }
        }
    }

    // Keeps the first problem that a result reports.
    void _note(const PGresult* result, std::optional<StoreProblem>& problem) {
        const ExecStatusType status = PQresultStatus(result);
        if (status != PGRES_FATAL_ERROR || problem.has_value()) {
            return;
        }
        const char* state = PQresultErrorField(result, PG_DIAG_SQLSTATE);
        const char* text = PQresultErrorField(result, PG_DIAG_MESSAGE_PRIMARY);
        // Without a code it is the library that reports a broken connection.
        problem.emplace(
            state != nullptr ? causeOf(state) : Cause::Away,
            _name + ": " + oneLine(text != nullptr ? text : PQerrorMessage(_connection.get())));
        if (PQstatus(_connection.get()) != CONNECTION_OK) {
            const StoreProblem last = *problem;
            _close();
            throw StoreProblem(last);
        }
    }

    void _sendPrepared(const std::string& name, const Row& parameters) {
        _texts.clear();
        for (const Cell& cell : parameters) {
            _texts.emplace_back(cell);
        }
        _values.clear();
        _sizes.clear();
        _formats.clear();
        for (const ParameterText& text : _texts) {
            _values.push_back(text.text());
            _sizes.push_back(text.size());
            _formats.push_back(text.isBinary());
        }
        _sent(PQsendQueryPrepared(_connection.get(), name.c_str(),
                                  static_cast<int>(parameters.size()), _values.data(),
                                  _sizes.data(), _formats.data(), 0));
    }

    const std::string _address;
    const Access _access;
    std::string _name;
    std::chrono::milliseconds _patience{2000};
    Connection _connection;
    std::map<std::string, std::string, std::less<>> _prepared;  // names on the server, by the text
    std::uint64_t _preparedCount = 0;
    // Kept from statement to statement for their memory.
    std::vector<ParameterText> _texts;
    std::vector<const char*> _values;
    std::vector<int> _sizes;
    std::vector<int> _formats;
};

std::unique_ptr<Database> open(const std::string& address, Access access) {
    return std::make_unique<PostgresDatabase>(address, access);
}

}  // namespace

extern "C" [[gnu::visibility("default")]] const Engine zrStoreEngine{kEngineVersion, open};

}  // namespace host
