// Store: runs in a database: a file (SQLite) or one of a server (PostgreSQL).
#ifndef ZR_HOST_STORE_STORE_H
#define ZR_HOST_STORE_STORE_H

#include <chrono>
#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "host/record/run_record.h"
#include "host/store/database.h"

namespace host {

// What is kept of a run beside its facts, results, failures and log.
struct Attachments {
    bool frames = false;  // needs the record's frames, which are there when a report draws them
    bool images = false;
};

// A store of runs. The schema is in host/store/schema/.
//
// One thread at a time uses a store: a session's. Any number of processes may use the same database.
// Connects when it is first used. A database without a schema gets one, an older schema is brought up to date.
//
// A run comes back from a store as it was, except:
//   - texts hold U+FFFD where they were not UTF-8 or held control characters;
//   - times are cut to microseconds; a NaN loses its payload, a zero may lose its sign;
//   - the run's tag, and opaque objects in the auxiliary data;
//   - frames, and the entry "images" of the auxiliary data, unless they are attached;
//   - log lines that came after the run was written;
//   - of its session: the other runs, the figures of repetitions, and its duration (that of the run stands
//     for it).
class Store {
  public:
    // `where` is the path of a file, postgresql://... or postgres://... With Access::Existing a database without
    // runs' tables is Unusable. Throws a Problem (kExitUsage) when `where` is neither or cannot be used as a store
    // (a file on a network file system, an address whose engine is not installed), and (kExitError) when the
    // engine's module cannot be loaded.
    explicit Store(const std::string& where, Access access = Access::Make);

    // As messages show it, without a password.
    const std::string& name() const { return _database->name(); }

    // For how long an operation waits for a store that does not answer; see Database.
    void setPatience(std::chrono::milliseconds patience) { _database->setPatience(patience); }

    // Everything below throws a StoreProblem.

    // Connects and makes the schema ready, if that is not done yet.
    void connect();

    // Writes the run in one transaction, which is durable when this returns. False when the store has a run of
    // that uuid: then nothing changes.
    bool write(const SessionRecord& session, const RunRecord& run, Attachments attachments = {});

    // The run, as the only one of its session. Nothing when the store has none of that uuid.
    std::optional<SessionRecord> load(std::string_view uuid);

    // The rows that SQL for both engines (see Statement) selects. PostgreSQL's whole numbers, booleans and
    // integral numerics are integers, other numbers are floating point, everything else but bytes is text.
    Rows query(std::string_view sql, Row parameters = {});

  private:
    // Rows that runs share, by the statement that finds one and its parameters; and what makes those that are
    // not known yet.
    using Ids = std::map<std::pair<std::string_view, Row>, std::int64_t>;
    using MissingRows = std::map<Ids::key_type, Statement>;

    Ids _find(const MissingRows& missing);

    std::unique_ptr<Database> _database;
    bool _isReady = false;  // the connection's schema is this program's
    Ids _ids;               // those that are committed
};

}  // namespace host

#endif
