#include "host/store/migrations.h"

#include <chrono>
#include <fstream>
#include <memory>

#include <gmock/gmock.h>

#include "host/store/engine.h"
#include "tests/host/store/store_support.h"
#include "tests/support/postgres_cluster.h"

namespace {

std::unique_ptr<host::Database> connected(const std::string& where) {
    auto database = host::openDatabase(where, host::Access::Make);
    database->setPatience(std::chrono::seconds(60));
    database->connect();
    return database;
}

host::Rows rowsOf(host::Database& database, std::string_view sql) {
    const host::Statement statement{sql};
    return database.run({&statement, 1}).front();
}

class Migrations : public testing::TestWithParam<test::EngineRow> {
  protected:
    std::string address() const { return GetParam().address(_folder.path()); }

  private:
    test::Folder _folder;
};

INSTANTIATE_TEST_SUITE_P(Engines, Migrations, testing::ValuesIn(test::kEngines), test::nameOf);

// A store that the program which had version 1 made, and which is never made anew; what describes a schema.
struct Version1 {
    const char* file;
    std::string_view schema;
};
const Version1 kVersion1[] = {
    {ZR_VERSION_1 "sqlite.sql",
     "SELECT type, name, tbl_name, sql FROM sqlite_master ORDER BY type, name"},
    {ZR_VERSION_1 "postgres.sql",
     "SELECT table_name, column_name, data_type, is_nullable, column_default, is_identity, '', '' "
     "FROM information_schema.columns WHERE table_schema = 'zrlab' UNION ALL "
     "SELECT tablename, indexname, indexdef, '', '', '', '', '' FROM pg_indexes "
     "WHERE schemaname = 'zrlab' UNION ALL "
     "SELECT viewname, definition, '', '', '', '', '', '' FROM pg_views WHERE schemaname = 'zrlab' "
     "UNION ALL SELECT conrelid::regclass::text, conname, pg_get_constraintdef(oid), '', '', '', "
     "'', '' FROM pg_constraint WHERE connamespace = 'zrlab'::regnamespace ORDER BY 1, 2, 3"}};

TEST_P(Migrations, MakeAStoreOfVersion1AsOneOfToday) {
    const std::string old = address();
    const bool isServer = old.starts_with("postgresql:");
    const Version1& version = kVersion1[isServer ? 1 : 0];
    std::ifstream text(version.file);
    (isServer ? test::runOnPostgres : test::runSql)(old,
                                                    {std::istreambuf_iterator<char>(text), {}});
    host::Store store(old);
    const auto uuid = store.query("SELECT uuid FROM runs").at(0).at(0);
    const auto session = store.load(std::get<std::string>(uuid));
    ASSERT_TRUE(session.has_value());
    EXPECT_EQ(session->identity.unit, "SN-7");
    EXPECT_EQ(session->runs.front().results.size(), 60U);
    const host::SessionRecord another = test::storedSession();
    EXPECT_TRUE(store.write(another, another.runs.front()));

    test::Folder folder;
    host::Store fresh(GetParam().address(folder.path()));
    const host::Rows schema = store.query(version.schema);
    EXPECT_GT(schema.size(), 10U);
    EXPECT_EQ(schema, fresh.query(version.schema));
}

TEST_P(Migrations, TakeEachStepOnceAndWhole) {
    constexpr std::string_view kTexts[] = {
        "CREATE TABLE a (x {id}); INSERT INTO a VALUES (1)",
        "ALTER TABLE a ADD COLUMN y BIGINT; UPDATE a SET y = x + 1",
        "CREATE TABLE b (x BIGINT); INSERT INTO nowhere VALUES (1)"};
    const std::span<const std::string_view> texts(kTexts);
    const std::string where = address();
    const auto state = [&] {
        return rowsOf(*connected(where), "SELECT version, x, y FROM schema_version, a").at(0);
    };
    host::migrate(*connected(where), texts.first(1));
    test::inProcesses(4, [&](int) {
        const auto database = connected(where);
        host::migrate(*database, texts.first(2));
        return 0;
    });
    const host::Row second{std::int64_t{2}, std::int64_t{1}, std::int64_t{2}};
    EXPECT_EQ(state(), second);
    EXPECT_THROW(host::migrate(*connected(where), texts), host::StoreProblem);
    EXPECT_EQ(state(), second);
    EXPECT_FALSE(connected(where)->hasTable("b"));
    try {
        host::migrate(*connected(where), texts.first(1));
        ADD_FAILURE() << "a newer schema was taken";
    } catch (const host::StoreProblem& problem) {
        EXPECT_EQ(problem.cause(), host::StoreProblem::Cause::Newer) << problem.what();
    }
    EXPECT_EQ(state(), second);
}

}  // namespace
