// Database: what a store needs of a database engine. An engine is a module that is loaded when an address asks
// for it; it is built against this header only.
#ifndef ZR_HOST_STORE_DATABASE_H
#define ZR_HOST_STORE_DATABASE_H

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

namespace host {

// Why a store does not do what it was asked. The text is one line that names the store, without a password.
class StoreProblem : public std::runtime_error {
  public:
    enum class Cause {
        Away,      // it cannot be reached, or the connection broke
        Silent,    // it did not answer in time
        Locked,    // somebody else held it too long
        Full,      // no space
        ReadOnly,  // it cannot be written
        Newer,     // its schema is of a newer program
        Unusable,  // it is damaged, or not a store
        Refused,   // it does not take this data, and will not
    };

    StoreProblem(Cause cause, const std::string& text) : std::runtime_error(text), _cause(cause) {}

    Cause cause() const { return _cause; }

  private:
    Cause _cause;
};

using Bytes = std::vector<std::byte>;

// A value in a row, or a parameter of a statement: NULL, integer, floating point, text (UTF-8 without a zero
// character) or bytes. A NaN as a parameter is NULL.
using Cell = std::variant<std::monostate, std::int64_t, double, std::string, Bytes>;
using Row = std::vector<Cell>;
using Rows = std::vector<Row>;

// A statement in the SQL that both engines share, with parameters $1, $2, ...
//
// What they do not share, and SQL for any store must avoid: functions of date, time, JSON, random numbers and
// mathematics; group_concat and string_agg; stddev, variance and percentiles (use sums); round() with two
// arguments; a comparison as a number (count(*) FILTER (WHERE ...) works on both); min() and max() of several
// columns; LIKE, which is case-sensitive in PostgreSQL only; the place of NULLs in ORDER BY, unless it says
// NULLS FIRST or NULLS LAST. An average or a quotient needs CAST(... AS DOUBLE PRECISION).
struct Statement {
    std::string_view sql;
    Row parameters = {};
};

// A connection to a database.
//
// One thread at a time. Every operation throws a StoreProblem when it fails, and waits no longer than the
// patience. A connection that broke is closed; connect() makes another.
class Database {
  public:
    virtual ~Database() = default;

    // The store as messages name it, without a password.
    virtual const std::string& name() const = 0;

    // For how long an operation waits for a connection, for another's lock and for an answer. At first two
    // seconds.
    virtual void setPatience(std::chrono::milliseconds patience) = 0;

    // Connects unless there is a connection. Returns whether it made one: whatever is known of the database is
    // then to be read again. Everything below needs a connection.
    virtual bool connect() = 0;

    // Whether a table of that name is in the store.
    virtual bool hasTable(std::string_view table) = 0;

    // Runs several statements without parameters: `text` with the engine's own words for {id}, {bytes} and
    // {clustered}.
    virtual void runScript(std::string_view text) = 0;

    // Runs the statements one after the other and returns the rows of each. On a server they take one round
    // trip together. A statement is prepared once and kept, so texts with values in them are not for it.
    virtual std::vector<Rows> run(std::span<const Statement> statements) = 0;

    // A transaction that writes. commit() returns when the data would survive a loss of power.
    virtual void begin() = 0;
    virtual void commit() = 0;
    virtual void rollback() noexcept = 0;  // does nothing without a transaction

    // Called first in a transaction: until its end no other process looks at the schema or changes it.
    virtual void lockSchema() = 0;
};

// Whether a database is made when there is none.
enum class Access { Existing, Make };

// `text` with every word on the left replaced by the one beside it.
inline std::string withWords(std::string_view text,
                             std::span<const std::pair<std::string_view, std::string_view>> words) {
    std::string result(text);
    for (const auto& [word, replacement] : words) {
        for (std::size_t at = 0; (at = result.find(word, at)) != std::string::npos;) {
            result.replace(at, word.size(), replacement);
        }
    }
    return result;
}

// What an engine's module exports under the name kEngineSymbol. Everything behind the version may be looked at
// only when the version is kEngineVersion.
struct Engine {
    int version;
    // The database at the address. Does not connect. Throws a std::exception, whose text is one line, when
    // the address is wrong.
    std::unique_ptr<Database> (*open)(const std::string& address, Access access);
};
inline constexpr int kEngineVersion = 1;
inline constexpr char kEngineSymbol[] = "kZrStoreEngine";

}  // namespace host

#endif
