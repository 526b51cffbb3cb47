#include "host/store/migrations.h"

#include <fstream>
#include <memory>

#include <gmock/gmock.h>

#include "host/store/engine.h"
#include "tests/host/store/store_support.h"

namespace {

std::unique_ptr<host::Database> connected(const std::string& file) {
    auto database = host::openDatabase(file, host::Access::Make);
    database->connect();
    return database;
}

host::Rows rowsOf(host::Database& database, std::string_view sql) {
    const host::Statement statement{sql};
    return database.run({&statement, 1}).front();
}

constexpr std::string_view kSchema =
    "SELECT type, name, tbl_name, sql FROM sqlite_master ORDER BY type, name";

// The file was made by the program that had version 1, and is never made anew.
TEST(Migrations, AStoreOfVersion1IsAsOneMadeToday) {
    test::Folder folder;
    const std::string old = (folder.path() / "old.db").string();
    std::ifstream text(ZR_VERSION_1);
    test::runSql(old, {std::istreambuf_iterator<char>(text), {}});
    host::Store store(old);
    const auto uuid = store.query("SELECT uuid FROM runs").at(0).at(0);
    const auto session = store.load(std::get<std::string>(uuid));
    ASSERT_TRUE(session.has_value());
    EXPECT_EQ(session->identity.unit, "SN-7");
    EXPECT_EQ(session->runs.front().results.size(), 60U);

    host::Store fresh((folder.path() / "fresh.db").string());
    EXPECT_EQ(store.query(kSchema), fresh.query(kSchema));
}

TEST(Migrations, EachStepIsTakenOnceAndWhole) {
    constexpr std::string_view kTexts[] = {
        "CREATE TABLE a (x {id}); INSERT INTO a VALUES (1)",
        "ALTER TABLE a ADD COLUMN y BIGINT; UPDATE a SET y = x + 1",
        "CREATE TABLE b (x BIGINT); INSERT INTO nowhere VALUES (1)"};
    const std::span<const std::string_view> texts(kTexts);
    test::Folder folder;
    const std::string file = (folder.path() / "runs.db").string();
    const auto state = [&] {
        return rowsOf(*connected(file), "SELECT version, x, y FROM schema_version, a").at(0);
    };
    host::migrate(*connected(file), texts.first(1));
    test::inProcesses(4, [&](int) {
        const auto database = connected(file);
        database->setPatience(std::chrono::seconds(60));
        host::migrate(*database, texts.first(2));
        return 0;
    });
    const host::Row second{std::int64_t{2}, std::int64_t{1}, std::int64_t{2}};
    EXPECT_EQ(state(), second);
    EXPECT_THROW(host::migrate(*connected(file), texts), host::StoreProblem);
    EXPECT_EQ(state(), second);
    EXPECT_FALSE(connected(file)->hasTable("b"));
    try {
        host::migrate(*connected(file), texts.first(1));
        ADD_FAILURE() << "a newer schema was taken";
    } catch (const host::StoreProblem& problem) {
        EXPECT_EQ(problem.cause(), host::StoreProblem::Cause::Newer) << problem.what();
    }
    EXPECT_EQ(state(), second);
}

}  // namespace
