// The engine for a store in a file.
//
// The journal is a write-ahead log, so that readers and one writer do not wait for each other. Every commit is
// synced to the disk (synchronous = FULL): a spooled run is removed once it is committed, so a loss of power
// must not take the commit back. That costs one sync per run.
#include <cerrno>
#include <chrono>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <map>
#include <sqlite3.h>
#include <stdexcept>
#include <string>
#include <thread>
#include <utility>

#include <sys/stat.h>

#include "host/store/database.h"
#include "host/store/sqlite/network_file_system.h"

namespace host {

namespace {

StoreProblem::Cause causeOf(int code, int systemError) {
    using Cause = StoreProblem::Cause;
    if (code == SQLITE_IOERR_SHMSIZE) {
        return Cause::Full;
    }
    switch (code & 0xff) {
        case SQLITE_BUSY:
        case SQLITE_LOCKED:
            return Cause::Locked;
        case SQLITE_FULL:
            return Cause::Full;
        case SQLITE_READONLY:
        case SQLITE_PERM:
            return Cause::ReadOnly;
        case SQLITE_CANTOPEN:
            return systemError == EROFS || systemError == EACCES ? Cause::ReadOnly : Cause::Away;
        case SQLITE_IOERR:
            return systemError == ENOSPC || systemError == EDQUOT || systemError == EFBIG
                       ? Cause::Full
                       : Cause::Away;
        case SQLITE_CONSTRAINT:
        case SQLITE_TOOBIG:
        case SQLITE_MISMATCH:
            return Cause::Refused;
        default:
            return Cause::Unusable;
    }
}

Cell cellOf(sqlite3_stmt* statement, int column) {
    const auto size = static_cast<std::size_t>(sqlite3_column_bytes(statement, column));
    switch (sqlite3_column_type(statement, column)) {
        case SQLITE_INTEGER:
            return std::int64_t{sqlite3_column_int64(statement, column)};
        case SQLITE_FLOAT:
            return sqlite3_column_double(statement, column);
        case SQLITE_TEXT:
            return std::string(
                reinterpret_cast<const char*>(sqlite3_column_text(statement, column)), size);
        case SQLITE_BLOB: {
            const auto* bytes =
                static_cast<const std::byte*>(sqlite3_column_blob(statement, column));
            return Bytes(bytes, bytes + size);
        }
        default:
            return {};
    }
}

// Texts and bytes are not copied: the parameters outlive the step.
int bind(sqlite3_stmt* statement, int index, const Cell& cell) {
    struct Binder {
        sqlite3_stmt* statement;
        int index;
        int operator()(std::monostate) const { return sqlite3_bind_null(statement, index); }
        int operator()(std::int64_t value) const {
            return sqlite3_bind_int64(statement, index, value);
        }
        int operator()(double value) const { return sqlite3_bind_double(statement, index, value); }
        int operator()(const std::string& value) const {
            return sqlite3_bind_text64(statement, index, value.data(), value.size(), SQLITE_STATIC,
                                       SQLITE_UTF8);
        }
        int operator()(const Bytes& value) const {
            return sqlite3_bind_blob64(statement, index,
                                       value.empty() ? "" : static_cast<const void*>(value.data()),
                                       value.size(), SQLITE_STATIC);
        }
    };
    return std::visit(Binder{statement, index}, cell);
}

struct Close {
    void operator()(sqlite3* database) const { sqlite3_close_v2(database); }
};
struct Finalize {
    void operator()(sqlite3_stmt* statement) const { sqlite3_finalize(statement); }
};
// Gives the statement's locks back, and its parameters.
struct Reset {
    void operator()(sqlite3_stmt* statement) const {
        sqlite3_reset(statement);
        sqlite3_clear_bindings(statement);
    }
};

class SqliteDatabase final : public Database {
  public:
    SqliteDatabase(const std::string& path, Access access)
        : _path(std::filesystem::absolute(path)), _name(path), _access(access) {
        std::ifstream mounts("/proc/self/mountinfo");
        if (const std::string network = networkFileSystemOf(_path, mounts); !network.empty()) {
            std::string text("it is on a network file system (");
            text += network;
            text += "), where a database in a file is not safe; use a file on this machine";
            throw std::runtime_error(text);
        }
    }

    const std::string& name() const override { return _name; }

    void setPatience(std::chrono::milliseconds patience) override {
        _patience = patience;
        if (_database != nullptr) {
            sqlite3_busy_timeout(_database.get(), static_cast<int>(_patience.count()));
        }
    }

    bool connect() override {
        // A file that was removed or replaced would take runs that nobody can find again.
        if (_database != nullptr && _fileId() == _openFile) {
            return false;
        }
        _disconnect();
        sqlite3* opened = nullptr;
        const int create = _access == Access::Make ? SQLITE_OPEN_CREATE : 0;
        const int code = sqlite3_open_v2(
            _path.c_str(), &opened, SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX | create, nullptr);
        _database.reset(opened);
        try {
            _check(code);
            sqlite3_extended_result_codes(opened, 1);
            setPatience(_patience);
            const bool isEmpty = _run({"SELECT 1 FROM sqlite_master LIMIT 1"}).empty();
            if (!hasTable("schema_version") && (!isEmpty || _access == Access::Existing)) {
                throw StoreProblem(StoreProblem::Cause::Unusable, _name + ": it is not a store");
            }
            _useWriteAheadLog();
            _execute(
                "PRAGMA synchronous = FULL; PRAGMA foreign_keys = ON; PRAGMA cache_size = -16000");
        } catch (...) {
            _disconnect();
            throw;
        }
        _openFile = _fileId();
        return true;
    }

    bool hasTable(std::string_view table) override {
        const Statement statement{"SELECT 1 FROM sqlite_master WHERE type = 'table' AND name = $1",
                                  {std::string(table)}};
        return !run({&statement, 1}).front().empty();
    }

    void runScript(std::string_view text) override {
        static constexpr std::pair<std::string_view, std::string_view> kWords[] = {
            {"{id}", "INTEGER PRIMARY KEY"}, {"{bytes}", "BLOB"}, {"{clustered}", "WITHOUT ROWID"}};
        _execute(withWords(text, kWords));
    }

    std::vector<Rows> run(std::span<const Statement> statements) override {
        std::vector<Rows> all;
        all.reserve(statements.size());
        for (const Statement& statement : statements) {
            all.push_back(_run(statement));
        }
        return all;
    }

    // A writer from its start: one that began to read could not become a writer after another's commit.
    void begin() override { _execute("BEGIN IMMEDIATE"); }
    void commit() override { _execute("COMMIT"); }
    void rollback() noexcept override {
        if (_database != nullptr && sqlite3_get_autocommit(_database.get()) == 0) {
            sqlite3_exec(_database.get(), "ROLLBACK", nullptr, nullptr, nullptr);
        }
    }
    void lockSchema() override {}  // the one writer has it

  private:
    using FileId = std::pair<dev_t, ino_t>;

    FileId _fileId() const {
        struct stat status {};
        return stat(_path.c_str(), &status) == 0 ? FileId(status.st_dev, status.st_ino) : FileId();
    }

    void _disconnect() {
        _statements.clear();
        _database.reset();
    }

    void _check(int code) const {
        if (code == SQLITE_OK || code == SQLITE_ROW || code == SQLITE_DONE) {
            return;
        }
        // A failed COMMIT leaves it to errno.
        const int failure = sqlite3_system_errno(_database.get());
        const int systemError = failure != 0 ? failure : errno;
        const int exact = sqlite3_extended_errcode(_database.get());
        std::string text = _name + ": " + sqlite3_errmsg(_database.get());
        if (const int kind = code & 0xff;
            systemError != 0 && (kind == SQLITE_CANTOPEN || kind == SQLITE_IOERR)) {
            text += std::string(" (") + std::strerror(systemError) + ")";
        }
        throw StoreProblem(causeOf(exact != SQLITE_OK ? exact : code, systemError), text);
    }

    // When several processes open a new file at once, SQLite does not wait for the other to make its log.
    void _useWriteAheadLog() {
        const auto end = std::chrono::steady_clock::now() + _patience;
        for (;;) {
            try {
                _execute("PRAGMA journal_mode = WAL");
                return;
            } catch (const StoreProblem& problem) {
                if (problem.cause() != StoreProblem::Cause::Locked ||
                    std::chrono::steady_clock::now() >= end) {
                    throw;
                }
            }
            std::this_thread::sleep_for(std::chrono::milliseconds(2));
        }
    }

    void _execute(const std::string& text) {
        errno = 0;
        _check(sqlite3_exec(_database.get(), text.c_str(), nullptr, nullptr, nullptr));
    }

    Rows _run(const Statement& wanted) {
        const std::unique_ptr<sqlite3_stmt, Reset> statement(_prepared(wanted.sql));
        for (std::size_t at = 0; at < wanted.parameters.size(); ++at) {
            std::string parameter("$");
            parameter += std::to_string(at + 1);
            _check(bind(statement.get(),
                        sqlite3_bind_parameter_index(statement.get(), parameter.c_str()),
                        wanted.parameters[at]));
        }
        Rows rows;
        errno = 0;
        int code = SQLITE_OK;
        while ((code = sqlite3_step(statement.get())) == SQLITE_ROW) {
            Row& row = rows.emplace_back();
            const int columns = sqlite3_column_count(statement.get());
            row.reserve(static_cast<std::size_t>(columns));
            for (int column = 0; column < columns; ++column) {
                row.push_back(cellOf(statement.get(), column));
            }
        }
        _check(code);
        return rows;
    }

    sqlite3_stmt* _prepared(std::string_view sql) {
        const auto known = _statements.find(sql);
        if (known != _statements.end()) {
            return known->second.get();
        }
        sqlite3_stmt* statement = nullptr;
        _check(sqlite3_prepare_v3(_database.get(), sql.data(), static_cast<int>(sql.size()),
                                  SQLITE_PREPARE_PERSISTENT, &statement, nullptr));
        return _statements.emplace(sql, statement).first->second.get();
    }

    const std::filesystem::path _path;
    const std::string _name;
    const Access _access;
    std::chrono::milliseconds _patience{2000};
    FileId _openFile;
    std::unique_ptr<sqlite3, Close> _database;
    // By their text. Destroyed before the connection.
    std::map<std::string, std::unique_ptr<sqlite3_stmt, Finalize>, std::less<>> _statements;
};

std::unique_ptr<Database> open(const std::string& address, Access access) {
    return std::make_unique<SqliteDatabase>(address, access);
}

}  // namespace

extern "C" [[gnu::visibility("default")]] const Engine kZrStoreEngine{kEngineVersion, open};

}  // namespace host
