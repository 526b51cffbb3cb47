// Runs that wait: whatever a store does, each is in it once in the end, and the user was told once.
#include "host/store/spool.h"

#include <chrono>
#include <csignal>
#include <fstream>
#include <memory>
#include <sqlite3.h>

#include <sys/resource.h>
#include <unistd.h>

#include <gmock/gmock.h>

#include "host/record/uuid.h"
#include "host/store/engine.h"
#include "host/store/run_json.h"
#include "host/store/store_listener.h"
#include "tests/host/store/store_support.h"
#include "tests/support/postgres_cluster.h"

namespace {

namespace fs = std::filesystem;
using host::Spool;
using host::Store;
using testing::HasSubstr;

constexpr auto kNobodyWrites = static_cast<fs::perms>(0555);

std::string contentOf(const fs::path& file) {
    std::ifstream stream(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(stream), {}};
}

// A store's address, its file if it is in one, and the folder of the runs that wait for it.
struct Place {
    explicit Place(const test::EngineRow& engine = test::kEngines[0]) {
        fs::create_directory(folder);
        fs::create_directory(spool);
        for (const fs::path& path : {home.path(), spool}) {
            fs::permissions(path, fs::perms::all);
        }
        where = engine.address(folder);
    }

    test::Folder home;
    fs::path folder = home.path() / "store";
    fs::path file = folder / "runs.db";
    fs::path spool = home.path() / "spool";
    std::string where;
};

// What a failure lasts as long as; its end mends the store.
using Failure = std::shared_ptr<void>;

template <class Mend>
Failure until(const Mend& mend) {
    return {nullptr, [mend](void*) { mend(); }};
}

Failure moveAway(const Place& place) {
    const fs::path away = place.home.path() / "away";
    fs::rename(place.folder, away);
    return until([=, folder = place.folder] { fs::rename(away, folder); });
}

Failure lock(const Place& place) {
    sqlite3* database = nullptr;
    EXPECT_EQ(sqlite3_open(place.file.c_str(), &database), SQLITE_OK);
    EXPECT_EQ(sqlite3_exec(database, "BEGIN EXCLUSIVE", nullptr, nullptr, nullptr), SQLITE_OK);
    return until([database] { sqlite3_close(database); });
}

// No file may grow beyond the size that the log of the store has, which a reader keeps from being used anew.
Failure fill(const Place& place) {
    sqlite3* reader = nullptr;
    EXPECT_EQ(sqlite3_open(place.file.c_str(), &reader), SQLITE_OK);
    EXPECT_EQ(sqlite3_exec(reader, "BEGIN; SELECT COUNT(*) FROM runs", nullptr, nullptr, nullptr),
              SQLITE_OK);
    Store store(place.where);
    const host::SessionRecord session = test::storedSession(5000);
    store.write(session, session.runs.front());
    test::runSql(place.where,
                 "DELETE FROM results WHERE run_id = (SELECT MAX(id) FROM runs);"
                 "DELETE FROM steps WHERE run_id = (SELECT MAX(id) FROM runs);"
                 "DELETE FROM runs WHERE id = (SELECT MAX(id) FROM runs)");
    rlimit before{};
    getrlimit(RLIMIT_FSIZE, &before);
    rlimit now = before;
    now.rlim_cur = fs::file_size(place.where + "-wal");
    setrlimit(RLIMIT_FSIZE, &now);
    void (*const handler)(int) = std::signal(SIGXFSZ, SIG_IGN);
    return until([=] {
        setrlimit(RLIMIT_FSIZE, &before);
        (void)std::signal(SIGXFSZ, handler);
        sqlite3_close(reader);
    });
}

Failure makeReadOnly(const Place& place) {
    fs::permissions(place.file, kNobodyWrites);
    fs::permissions(place.folder, kNobodyWrites);
    const uid_t user = geteuid();
    if (user == 0) {  // may write everywhere
        EXPECT_EQ(seteuid(65534), 0);
    }
    return until([=, folder = place.folder, file = place.file] {
        EXPECT_EQ(seteuid(user), 0);
        fs::permissions(folder, fs::perms::owner_all);
        fs::permissions(file, fs::perms::owner_read | fs::perms::owner_write);
    });
}

Failure damage(const Place& place) {
    const std::string content = contentOf(place.file);
    std::ofstream(place.file) << "This was a database.";
    return until([=, file = place.file] { std::ofstream(file, std::ios::binary) << content; });
}

// A failure that SQL makes and mends, on the engine of that number.
template <int kEngine, const char* kMake, const char* kMend>
Failure bySql(const Place& place) {
    test::kEngines[kEngine].runSql(place.where, kMake);
    return until([where = place.where] { test::kEngines[kEngine].runSql(where, kMend); });
}

constexpr char kMakeNewer[] = "UPDATE schema_version SET version = version + 1";
constexpr char kMakeOlder[] = "UPDATE schema_version SET version = version - 1";
constexpr char kMakeReadOnly[] = "ALTER ROLE zrlab SET default_transaction_read_only = on";
constexpr char kMakeWritable[] = "ALTER ROLE zrlab RESET default_transaction_read_only";
constexpr char kLoseTable[] = "ALTER TABLE results RENAME TO lost";
constexpr char kFindTable[] = "ALTER TABLE lost RENAME TO results";

using Server = test::PostgresCluster;

// A failure of the whole server.
template <void (Server::*kMake)(), void (Server::*kMend)()>
Failure byServer(const Place& /*place*/) {
    (Server::shared().*kMake)();
    return until([] { (Server::shared().*kMend)(); });
}

Failure lockTable(const Place& place) {
    const std::shared_ptr<host::Database> other =
        host::openDatabase(place.where, host::Access::Existing);
    other->setPatience(test::kLong);
    other->connect();
    other->begin();
    other->runScript("LOCK TABLE results");
    return other;
}

// A store that does not work: its engine, what the user is told, how the failure is made, and how long a session
// waits.
struct FailureRow {
    const char* name;
    int engine;
    const char* complaint;
    Failure (*make)(const Place& place);
    std::chrono::milliseconds patience = std::chrono::seconds(20);
};

// The first rows also show on a connection that is there.
const FailureRow kFailures[] = {
    {"Away", 0, "unable to open database file", moveAway},
    {"Locked", 0, "database is locked", lock, test::kShort},
    {"Full", 0, "disk I/O error (File too large)", fill},
    {"ServerKilled", 1, "server",  // how far its processes have come when it is asked is luck
     byServer<&Server::kill, &Server::start>},
    {"ServerSilent", 1, "the server does not answer", byServer<&Server::pause, &Server::resume>,
     std::chrono::seconds(3)},
    {"ServerFull", 1, "No space left on device", byServer<&Server::fill, &Server::makeRoom>},
    {"ServerLocked", 1, "canceling statement due to lock timeout", lockTable,
     std::chrono::seconds(3)},
    // From here on only on a new one.
    {"ServerStopped", 1, "No such file or directory", byServer<&Server::stop, &Server::start>},
    {"ReadOnly", 0, "attempt to write a readonly database", makeReadOnly},
    {"ServerReadOnly", 1, "cannot execute INSERT in a read-only transaction",
     bySql<1, kMakeReadOnly, kMakeWritable>},
    {"Newer", 0, "its schema has version 2", bySql<0, kMakeNewer, kMakeOlder>},
    {"ServerNewer", 1, "its schema has version 2", bySql<1, kMakeNewer, kMakeOlder>},
    {"Damaged", 0, "not a database", damage},
    {"ServerDamaged", 1, "relation \"results\" does not exist", bySql<1, kLoseTable, kFindTable>},
};

class FailingStore : public testing::TestWithParam<FailureRow> {
  protected:
    FailingStore() {
        for (int at = 0; at < 6; ++at) {
            _runs.push_back(test::storedSession(kResults));
        }
    }

    // A session, and the lines that its user was told.
    struct Session {
        Session(const Place& place, std::chrono::milliseconds patience)
            : listener({.where = place.where,
                        .spoolFolder = place.spool,
                        .attachments = test::kAll,
                        .patience = patience,
                        .deliveryTime = test::kLong},
                       [this](const std::string& line) { told.push_back(line); }) {}

        void play(const std::vector<host::SessionRecord>& runs) {
            for (const host::SessionRecord& session : runs) {
                listener.sessionStarted(session);
                listener.runEnded(session.runs.front());
            }
        }

        std::vector<std::string> told;
        host::StoreListener listener;
    };

    // Three runs that the store does not take.
    void playThree(Session& session) {
        const auto start = std::chrono::steady_clock::now();
        session.play({_runs[2], _runs[3], _runs[4]});
        // A store that is waited for is waited for once.
        EXPECT_LT(std::chrono::steady_clock::now() - start,
                  GetParam().patience + std::chrono::seconds(5));
        ASSERT_EQ(session.told.size(), 1U);
        EXPECT_THAT(session.told.front(), HasSubstr(GetParam().complaint));
        EXPECT_THAT(session.told.front(), HasSubstr(_place.where + ": "));
        EXPECT_THAT(session.told.front(), HasSubstr(_place.spool.string()));
        EXPECT_EQ(Spool(_place.spool).waiting(), 3U);
    }

    void playRest() {
        Session session(_place, test::kLong);
        session.play({_runs[5]});
        EXPECT_THAT(session.told, testing::IsEmpty());
        EXPECT_EQ(Spool(_place.spool).waiting(), 0U);
        Store store(_place.where);
        store.setPatience(test::kLong);
        EXPECT_EQ(test::runsIn(store), 6);
        for (const host::SessionRecord& run : _runs) {
            const auto loaded = store.load(run.runs.front().uuid);
            ASSERT_TRUE(loaded.has_value());
            EXPECT_EQ(loaded->runs.front().results.size(), kResults);
        }
    }

    static constexpr std::size_t kResults = 300;  // so many that the store grows with each run

    const Place _place{test::kEngines[GetParam().engine]};
    std::vector<host::SessionRecord> _runs;
};

class FailingConnection : public FailingStore {};

const auto kName = [](const auto& failure) { return failure.param.name; };
INSTANTIATE_TEST_SUITE_P(Failures, FailingStore, testing::ValuesIn(kFailures), kName);
INSTANTIATE_TEST_SUITE_P(Failures,
                         FailingConnection,
                         testing::ValuesIn(std::begin(kFailures), std::begin(kFailures) + 7),
                         kName);

TEST_P(FailingStore, LosesNothingAndIsToldOfOnce) {
    {
        Session session(_place, test::kLong);
        session.play({_runs[0], _runs[1]});
        EXPECT_THAT(session.told, testing::IsEmpty());
    }
    {
        const Failure failure = GetParam().make(_place);
        Session failing(_place, GetParam().patience);
        playThree(failing);
    }
    playRest();
}

TEST_P(FailingConnection, LosesNothingAndIsToldOfOnce) {
    Session(_place, test::kLong).play({_runs[0]});  // makes the schema
    Session session(_place, GetParam().patience);
    session.play({_runs[1]});
    EXPECT_THAT(session.told, testing::IsEmpty());
    {
        const Failure failure = GetParam().make(_place);
        playThree(session);
    }
    playRest();
}

class SpoolTest : public testing::Test {
  protected:
    host::SessionRecord add() {
        host::SessionRecord session = test::storedSession(3);
        _spool.add(session, session.runs.front(), test::kAll);
        return session;
    }
    fs::path entryOf(const host::SessionRecord& session) const {
        return _place.spool / (session.runs.front().uuid + ".json");
    }

    Place _place;
    Spool _spool{_place.spool};
};

TEST_F(SpoolTest, SeveralProcessesDeliverEachRunOnce) {
    constexpr int kRuns = 40;
    for (int at = 0; at < kRuns; ++at) {
        add();
    }
    const int delivered = test::inProcesses(4, [this](int) {
        Store store(_place.file.string());
        store.setPatience(std::chrono::seconds(60));
        const Spool::Delivery delivery = _spool.deliver(store);
        EXPECT_EQ(delivery.problem, std::nullopt);
        return delivery.problem.has_value() || !delivery.setAside.empty()
                   ? 100
                   : static_cast<int>(delivery.delivered);
    });
    EXPECT_EQ(delivered, kRuns);
    EXPECT_TRUE(fs::is_empty(_place.spool));
    Store store(_place.file.string());
    EXPECT_EQ(test::runsIn(store), kRuns);
}

// While others write entries, none that is not whole is taken for one.
TEST_F(SpoolTest, DeliversWhileOthersAdd) {
    constexpr int kRuns = 40;
    test::inProcesses(4, [this](int process) {
        Store store(_place.file.string());
        store.setPatience(std::chrono::seconds(60));
        bool isWell = true;
        for (int at = 0; at < kRuns; ++at) {
            if (process < 2) {
                add();
            } else {
                const Spool::Delivery delivery = _spool.deliver(store);
                isWell = isWell && !delivery.problem.has_value() && delivery.setAside.empty();
            }
        }
        return isWell ? 0 : 100;
    });
    Store store(_place.file.string());
    const Spool::Delivery rest = _spool.deliver(store);
    EXPECT_EQ(rest.waiting, 0U);
    EXPECT_TRUE(rest.setAside.empty());
    EXPECT_EQ(test::runsIn(store), 2 * kRuns);
    EXPECT_TRUE(fs::is_empty(_place.spool));
}

TEST_F(SpoolTest, SetsAsideWhatIsNoRunAndDeliversTheRest) {
    const host::SessionRecord whole = add();
    const host::SessionRecord half = add();
    const host::SessionRecord otherUuid = add();
    const host::SessionRecord unknownJudgement = add();
    const host::SessionRecord abandoned = add();
    const host::SessionRecord abandonedHalf = add();
    const auto change = [this](const host::SessionRecord& session, const std::string& from,
                               const std::string& to) {
        std::string content = contentOf(entryOf(session));
        content.replace(content.find(from), from.size(), to);
        std::ofstream(entryOf(session)) << content;
    };
    fs::resize_file(entryOf(half), 200);
    change(otherUuid, otherUuid.runs.front().uuid, "../../../../somewhere/else");
    change(unknownJudgement, R"("judgement":1)", R"("judgement":7)");
    fs::resize_file(entryOf(abandonedHalf), 100);
    for (const host::SessionRecord& session : {abandoned, abandonedHalf}) {
        fs::rename(entryOf(session), entryOf(session).string() + ".part");
    }
    const fs::path beingMade = _place.spool / (host::newUuid() + ".json.part");
    std::ofstream(beingMade).flush();

    Store store(_place.file.string());
    const Spool::Delivery delivery = _spool.deliver(store);
    EXPECT_EQ(delivery.problem, std::nullopt);
    EXPECT_EQ(delivery.delivered, 2U);
    EXPECT_EQ(delivery.waiting, 0U);
    EXPECT_EQ(delivery.setAside.size(), 4U);
    for (const host::SessionRecord& session : {half, otherUuid, unknownJudgement, abandonedHalf}) {
        const std::string aside = entryOf(session).string() + ".damaged";
        EXPECT_TRUE(fs::exists(aside));
        EXPECT_THAT(delivery.setAside, testing::Contains(testing::StartsWith(aside + ": ")));
    }
    EXPECT_TRUE(store.load(whole.runs.front().uuid).has_value());
    EXPECT_TRUE(store.load(abandoned.runs.front().uuid).has_value());
    EXPECT_TRUE(fs::exists(beingMade));
    EXPECT_TRUE(_spool.deliver(store).setAside.empty());
}

TEST_F(SpoolTest, SetsAsideWhatTheStoreRefuses) {
    Store store(_place.file.string());
    store.connect();
    test::runSql(_place.file,
                 "CREATE TRIGGER no BEFORE INSERT ON runs WHEN NEW.lot = 'bad' "
                 "BEGIN SELECT RAISE(ABORT, 'bad lot'); END");
    host::SessionRecord session = test::storedSession();
    session.identity.lot = "bad";
    _spool.add(session, session.runs.front(), test::kAll);
    add();
    const Spool::Delivery delivery = _spool.deliver(store);
    EXPECT_EQ(delivery.problem, std::nullopt);
    EXPECT_EQ(delivery.delivered, 1U);
    EXPECT_THAT(delivery.setAside, testing::ElementsAre(HasSubstr(".refused: ")));
}

// A folder that cannot be changed: what is in it stays, nothing is tried over and over.
TEST_F(SpoolTest, SaysOnceThatItsFolderCannotBeChanged) {
    const host::SessionRecord session = add();
    add();
    Store store(_place.file.string());
    store.connect();
    const uid_t user = geteuid();
    fs::permissions(_place.spool, kNobodyWrites);
    if (user == 0) {
        ASSERT_EQ(seteuid(65534), 0);
    }
    const Spool::Delivery delivery = _spool.deliver(store);
    std::vector<std::string> told;
    host::StoreListener listener(
        {.where = (_place.home.path() / "no/store.db").string(), .spoolFolder = _place.spool},
        [&told](const std::string& line) { told.push_back(line); });
    listener.sessionStarted(session);
    host::RunRecord run = session.runs.front();
    run.uuid = host::newUuid();
    listener.runEnded(run);
    ASSERT_EQ(seteuid(user), 0);
    fs::permissions(_place.spool, fs::perms::owner_all);

    ASSERT_TRUE(delivery.problem.has_value());
    EXPECT_THAT(*delivery.problem, HasSubstr("ermission denied"));
    EXPECT_EQ(delivery.waiting, 2U);
    ASSERT_EQ(told.size(), 2U);
    EXPECT_THAT(told.back(), HasSubstr("run " + run.uuid + " is not stored and cannot wait: "));
    EXPECT_EQ(_spool.deliver(store).waiting, 0U);
    EXPECT_EQ(test::runsIn(store), 2);
}

TEST_F(SpoolTest, TakesNoRunWithoutAUuid) {
    host::SessionRecord session = test::storedSession();
    session.runs.front().uuid = "../outside";
    EXPECT_THROW(_spool.add(session, session.runs.front(), test::kAll), std::runtime_error);
    EXPECT_TRUE(fs::is_empty(_place.spool));
}

}  // namespace
