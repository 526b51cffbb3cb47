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
#include "host/store/run_json.h"
#include "host/store/store_listener.h"
#include "tests/host/store/store_support.h"

namespace {

namespace fs = std::filesystem;
using host::Spool;
using host::Store;
using testing::HasSubstr;

constexpr auto kNobodyWrites = static_cast<fs::perms>(0555);
constexpr host::Attachments kAll{.frames = true, .images = true};

std::string contentOf(const fs::path& file) {
    std::ifstream stream(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(stream), {}};
}

// A store's file in a folder of its own, and the folder of the runs that wait for it.
struct Place {
    Place() {
        fs::create_directory(folder);
        fs::create_directory(spool);
        for (const fs::path& path : {home.path(), spool}) {
            fs::permissions(path, fs::perms::all);
        }
    }

    test::Folder home;
    fs::path folder = home.path() / "store";
    fs::path file = folder / "runs.db";
    fs::path spool = home.path() / "spool";
};

// A failure of a store: it lasts as long as what `make` returns.
struct FailureRow {
    const char* name;
    const char* complaint;
    std::shared_ptr<void> (*make)(const Place& place);
};

template <class Mend>
std::shared_ptr<void> until(const Mend& mend) {
    return {nullptr, [mend](void*) { mend(); }};
}

std::shared_ptr<void> moveAway(const Place& place) {
    const fs::path away = place.home.path() / "away";
    fs::rename(place.folder, away);
    return until([=, folder = place.folder] { fs::rename(away, folder); });
}

std::shared_ptr<void> lock(const Place& place) {
    sqlite3* database = nullptr;
    EXPECT_EQ(sqlite3_open(place.file.c_str(), &database), SQLITE_OK);
    EXPECT_EQ(sqlite3_exec(database, "BEGIN EXCLUSIVE", nullptr, nullptr, nullptr), SQLITE_OK);
    return until([database] { sqlite3_close(database); });
}

// No file may grow beyond the size that the log of the store has, which a reader keeps from being used anew.
std::shared_ptr<void> fill(const Place& place) {
    sqlite3* reader = nullptr;
    EXPECT_EQ(sqlite3_open(place.file.c_str(), &reader), SQLITE_OK);
    EXPECT_EQ(sqlite3_exec(reader, "BEGIN; SELECT COUNT(*) FROM runs", nullptr, nullptr, nullptr),
              SQLITE_OK);
    Store store(place.file.string());
    const host::SessionRecord session = test::storedSession(5000);
    store.write(session, session.runs.front());
    test::runSql(place.file,
                 "DELETE FROM results WHERE run_id = (SELECT MAX(id) FROM runs);"
                 "DELETE FROM steps WHERE run_id = (SELECT MAX(id) FROM runs);"
                 "DELETE FROM runs WHERE id = (SELECT MAX(id) FROM runs)");
    rlimit before{};
    getrlimit(RLIMIT_FSIZE, &before);
    rlimit now = before;
    now.rlim_cur = fs::file_size(place.file.string() + "-wal");
    setrlimit(RLIMIT_FSIZE, &now);
    void (*const handler)(int) = std::signal(SIGXFSZ, SIG_IGN);
    return until([=] {
        setrlimit(RLIMIT_FSIZE, &before);
        (void)std::signal(SIGXFSZ, handler);
        sqlite3_close(reader);
    });
}

std::shared_ptr<void> makeReadOnly(const Place& place) {
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

std::shared_ptr<void> makeNewer(const Place& place) {
    test::runSql(place.file, "UPDATE schema_version SET version = version + 1");
    return until([file = place.file] {
        test::runSql(file, "UPDATE schema_version SET version = version - 1");
    });
}

std::shared_ptr<void> damage(const Place& place) {
    const std::string content = contentOf(place.file);
    std::ofstream(place.file) << "This was a database.";
    return until([=, file = place.file] { std::ofstream(file, std::ios::binary) << content; });
}

const FailureRow kFailures[] = {
    {"Away", "unable to open database file", moveAway},
    {"Locked", "database is locked", lock},
    {"Full", "disk I/O error (File too large)", fill},
    {"ReadOnly", "attempt to write a readonly database", makeReadOnly},
    {"Newer", "its schema has version 2", makeNewer},
    {"Damaged", "not a database", damage},
};

class FailingStore : public testing::TestWithParam<FailureRow> {
  protected:
    // A session with these runs; what it told the user.
    std::vector<std::string> play(const std::vector<host::SessionRecord>& runs) {
        std::vector<std::string> told;
        host::StoreListener listener({.where = _place.file.string(),
                                      .spoolFolder = _place.spool,
                                      .attachments = kAll,
                                      .patience = std::chrono::milliseconds(200)},
                                     [&told](const std::string& line) { told.push_back(line); });
        for (const host::SessionRecord& session : runs) {
            listener.sessionStarted(session);
            listener.runEnded(session.runs.front());
        }
        return told;
    }

    Place _place;
};

INSTANTIATE_TEST_SUITE_P(Failures,
                         FailingStore,
                         testing::ValuesIn(kFailures),
                         [](const auto& failure) { return failure.param.name; });

TEST_P(FailingStore, LosesNothingAndIsToldOfOnce) {
    // 2 in the store, 3 while it fails, 1 when it is back.
    std::vector<host::SessionRecord> runs;
    for (int at = 0; at < 6; ++at) {
        runs.push_back(test::storedSession());
    }
    EXPECT_THAT(play({runs[0], runs[1]}), testing::IsEmpty());
    {
        const std::shared_ptr<void> failure = GetParam().make(_place);
        const auto start = std::chrono::steady_clock::now();
        const auto told = play({runs[2], runs[3], runs[4]});
        EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(30));
        ASSERT_EQ(told.size(), 1U);
        EXPECT_THAT(told.front(), HasSubstr(GetParam().complaint));
        EXPECT_THAT(told.front(), HasSubstr(_place.file.string() + ": "));
        EXPECT_THAT(told.front(), HasSubstr(_place.spool.string()));
        EXPECT_EQ(Spool(_place.spool).waiting(), 3U);
    }
    EXPECT_THAT(play({runs[5]}), testing::IsEmpty());
    EXPECT_EQ(Spool(_place.spool).waiting(), 0U);
    Store store(_place.file.string());
    EXPECT_EQ(test::runsIn(store), 6);
    for (const host::SessionRecord& session : runs) {
        const auto loaded = store.load(session.runs.front().uuid);
        ASSERT_TRUE(loaded.has_value());
        EXPECT_EQ(loaded->runs.front().results.size(), 64U);
    }
}

class SpoolTest : public testing::Test {
  protected:
    host::SessionRecord add() {
        host::SessionRecord session = test::storedSession(3);
        _spool.add(session, session.runs.front(), kAll);
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
    _spool.add(session, session.runs.front(), kAll);
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
    EXPECT_THROW(_spool.add(session, session.runs.front(), kAll), std::runtime_error);
    EXPECT_TRUE(fs::is_empty(_place.spool));
}

}  // namespace
