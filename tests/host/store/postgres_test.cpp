// What only a server does: it dies in the middle, says nothing, loses an answer, and asks who one is.
#include <chrono>
#include <fstream>
#include <limits>
#include <thread>

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <gmock/gmock.h>

#include "host/store/spool.h"
#include "host/store/store.h"
#include "host/store/store_listener.h"
#include "tests/host/store/store_support.h"
#include "tests/support/postgres_cluster.h"

namespace {

using host::Spool;
using host::Store;
using host::StoreProblem;
using testing::HasSubstr;
namespace fs = std::filesystem;

// Plays eight runs to a store that does not answer and is waited for once; delivers them to the real one.
void playToSilence(const std::string& silent, Store& real, std::size_t runsThere) {
    const test::Folder spool;
    std::vector<std::string> told;
    const auto start = std::chrono::steady_clock::now();
    {
        host::StoreListener listener(
            {.where = silent, .spoolFolder = spool.path(), .patience = std::chrono::seconds(1)},
            [&told](const std::string& line) { told.push_back(line); });
        for (int at = 0; at < 8; ++at) {
            const host::SessionRecord session = test::storedSession();
            listener.sessionStarted(session);
            listener.runEnded(session.runs.front());
        }
    }
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(6));
    EXPECT_THAT(told, testing::ElementsAre(HasSubstr("the server does not answer")));
    const Spool::Delivery delivery = Spool(spool.path()).deliver(real);
    EXPECT_EQ(delivery.problem, std::nullopt);
    EXPECT_EQ(delivery.delivered, 8 - runsThere);
    EXPECT_EQ(test::runsIn(real), 8);
}

TEST(Server, ThatTakesConnectionsAndSaysNothingIsWaitedForOnce) {
    const std::string where = test::PostgresCluster::shared().newDatabase();
    const test::Folder folder;
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    (folder.path() / ".s.PGSQL.5432").string().copy(address.sun_path, sizeof address.sun_path - 1);
    const int socket = ::socket(AF_UNIX, SOCK_STREAM, 0);
    ASSERT_EQ(bind(socket, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    ASSERT_EQ(listen(socket, 5), 0);
    Store real(where);
    real.setPatience(test::kLong);
    playToSilence("postgresql:///runs?host=" + folder.path().string(), real, 0);
    close(socket);
}

// The run is in the store, and nobody knows.
TEST(Server, WhoseAnswerToACommitIsLostHasTheRunOnce) {
    const std::string where = test::PostgresCluster::shared().newDatabase();
    Store real(where);
    real.setPatience(test::kLong);
    real.connect();
    test::runOnPostgres(
        where,
        "CREATE FUNCTION wait() RETURNS trigger LANGUAGE plpgsql AS "
        "'BEGIN IF (SELECT COUNT(*) FROM zrlab.runs) = 1 THEN PERFORM pg_sleep(3); END IF; RETURN "
        "NULL; END';"
        "CREATE CONSTRAINT TRIGGER late AFTER INSERT ON zrlab.runs DEFERRABLE INITIALLY DEFERRED "
        "FOR EACH ROW EXECUTE FUNCTION wait()");
    playToSilence(where, real, 1);
}

// 32 stations write, the server is killed, stays away for a while and comes back: every run is in the store once.
TEST(Server, KilledUnderManyWritersHasEveryRunOnce) {
    constexpr int kStations = 32;
    constexpr int kRunsAfter = 3;
    test::PostgresCluster& server = test::PostgresCluster::shared();
    const std::string where = server.newDatabase();
    Store store(where);
    store.setPatience(test::kLong);
    store.connect();
    test::Folder folder;
    const fs::path spool = folder.path() / "spool";
    const auto path = [&](const char* name) { return folder.path() / name; };
    const auto wait = [](const auto& isSo) {
        while (!isSo()) {
            std::this_thread::sleep_for(std::chrono::milliseconds(5));
        }
    };
    const auto say = [&](const char* name) { std::ofstream(path(name)).flush(); };
    const int written = test::inProcesses(
        kStations,
        [&](int station) {
            int runs = 0;
            const auto play = [&](const auto& isEnough) {
                host::StoreListener listener({.where = where, .spoolFolder = spool},
                                             [](const std::string&) {});
                do {
                    host::SessionRecord session = test::storedSession();
                    session.identity.station += std::to_string(station);
                    listener.sessionStarted(session);
                    listener.runEnded(session.runs.front());
                    ++runs;
                    // Slow enough that the sum of all can be told by what processes return.
                    std::this_thread::sleep_for(std::chrono::milliseconds(20));
                } while (!isEnough() && runs < 90);
            };
            play([&] { return fs::exists(path("killed")); });
            wait([&] { return fs::exists(path("started")); });
            for (int at = 0; at < kRunsAfter; ++at) {
                play([] { return true; });
            }
            return runs;
        },
        [&] {
            wait([&] { return test::runsIn(store) > kStations; });
            server.kill();
            wait([&] { return Spool(spool).waiting() > 3; });
            say("killed");
            server.start();
            say("started");
        });
    const Spool::Delivery rest = Spool(spool).deliver(store);
    EXPECT_EQ(rest.problem, std::nullopt);
    EXPECT_EQ(rest.waiting, 0U);
    EXPECT_GT(written, kStations * (kRunsAfter + 1));
    EXPECT_EQ(test::runsIn(store), written);
    EXPECT_EQ(test::numberIn(store, "SELECT COUNT(*) FROM results"), written * 64);
}

// A server that was started again between two runs is asked again.
TEST(Server, StartedAgainTakesTheNextRun) {
    test::PostgresCluster& server = test::PostgresCluster::shared();
    Store store(server.newDatabase());
    store.setPatience(test::kLong);
    for (int runs = 1; runs < 4; ++runs) {
        const host::SessionRecord session = test::storedSession();
        EXPECT_TRUE(store.write(session, session.runs.front()));
        EXPECT_EQ(test::runsIn(store), runs);
        server.stop();
        server.start();
    }
}

// After a statement that failed, the same connection and its transactions are as before.
TEST(Server, GoesOnAfterAStatementThatFailed) {
    Store store(test::PostgresCluster::shared().newDatabase());
    store.setPatience(test::kLong);
    using Cause = StoreProblem::Cause;
    const std::pair<const char*, Cause> rows[] = {
        {"SELEC 1", Cause::Unusable},
        {"SELECT 1 / 0", Cause::Refused},
        {"INSERT INTO results VALUES (99, 0, 0, 0, 99, 0, NULL, 0, 1, '')", Cause::Refused},
        {"INSERT INTO stations (name) SELECT string_agg(md5(i::text), '') FROM generate_series(1, "
         "9999) i",
         Cause::Refused},
        {"CREATE TABLE pg_catalog.mine (x INTEGER)", Cause::ReadOnly},
    };
    for (const auto& [sql, cause] : rows) {
        try {
            store.query(sql);
            ADD_FAILURE() << sql;
        } catch (const StoreProblem& problem) {
            EXPECT_EQ(problem.cause(), cause) << problem.what();
            EXPECT_THAT(problem.what(), testing::StartsWith(store.name() + ": "));
        }
        const host::SessionRecord session = test::storedSession();
        EXPECT_TRUE(store.write(session, session.runs.front()));
    }
}

// The server gives up what nobody waits for any more, so that it holds up nobody.
TEST(Server, GivesUpWhatItsClientGaveUp) {
    const std::string where = test::PostgresCluster::shared().newDatabase();
    Store store(where);
    store.connect();
    store.setPatience(test::kShort);
    EXPECT_THROW(store.query("SELECT pg_advisory_xact_lock(1), pg_sleep(600)"), StoreProblem);
    Store other(where);
    other.setPatience(test::kLong);
    EXPECT_NO_THROW(other.query("SELECT pg_advisory_xact_lock(1)"));
}

TEST(Server, ValuesOfItsTypesAreThoseOfCells) {
    Store store(test::PostgresCluster::shared().newDatabase());
    const host::Bytes bytes{std::byte{0}, std::byte{0xFF}, std::byte{'\\'}};
    const std::int64_t least = std::numeric_limits<std::int64_t>::min();
    constexpr double kInfinity = std::numeric_limits<double>::infinity();
    const host::Rows rows = store.query(
        "SELECT TRUE, 7::SMALLINT, SUM(x), SUM(x) / 3.0, 1e30::NUMERIC, '-Infinity'::REAL, NULL, "
        "'text'::NAME, "
        "$1::BYTEA, $2::BIGINT, $3::DOUBLE PRECISION, $4::TEXT, $5::BYTEA, $6::DOUBLE PRECISION "
        "FROM (VALUES (1::BIGINT), (3::BIGINT)) AS numbers (x)",
        {bytes, least, 5e-324, std::string("ä'\\"), host::Bytes(),
         std::numeric_limits<double>::quiet_NaN()});
    const host::Row expected{std::int64_t{1},
                             std::int64_t{7},
                             std::int64_t{4},
                             4 / 3.0,
                             1e30,
                             -kInfinity,
                             {},
                             std::string("text"),
                             bytes,
                             least,
                             5e-324,
                             std::string("ä'\\"),
                             host::Bytes(),
                             {}};
    EXPECT_EQ(rows, host::Rows{expected});
}

}  // namespace
