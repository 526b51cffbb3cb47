#include "tests/support/store_engines.h"

#include <memory>
#include <ostream>
#include <sqlite3.h>

#include "tests/support/postgres_cluster.h"

namespace test {

const EngineRow kEngines[2] = {
    {"Sqlite", [](const std::filesystem::path& folder) { return (folder / "runs.db").string(); },
     runSql},
    {"Postgres",
     [](const std::filesystem::path&) { return PostgresCluster::shared().newDatabase(); },
     [](const std::string& address, const std::string& sql) {
         runOnPostgres(address, "SET search_path = zrlab;" + sql);
     }},
};

std::string nameOf(const testing::TestParamInfo<EngineRow>& engine) {
    return engine.param.name;
}

void PrintTo(const EngineRow& engine, std::ostream* out) {
    *out << engine.name;
}

void runSql(const std::string& file, const std::string& sql) {
    sqlite3* opened = nullptr;
    ASSERT_EQ(sqlite3_open(file.c_str(), &opened), SQLITE_OK);
    const std::unique_ptr<sqlite3, int (*)(sqlite3*)> database(opened, sqlite3_close);
    ASSERT_EQ(sqlite3_exec(opened, sql.c_str(), nullptr, nullptr, nullptr), SQLITE_OK)
        << sqlite3_errmsg(opened);
}

}  // namespace test
