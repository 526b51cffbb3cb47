#include "host/store/migrations.h"

#include <cstddef>

#include <fmt/format.h>

namespace host {

namespace {

constexpr std::string_view kTable = "schema_version";

std::size_t versionOf(Database& database) {
    if (!database.hasTable(kTable)) {
        return 0;
    }
    static const Statement& statement = *new Statement{"SELECT version FROM schema_version"};
    const Rows rows = database.run({&statement, 1}).front();
    const auto* version = rows.empty() ? nullptr : std::get_if<std::int64_t>(&rows.front().front());
    if (version == nullptr || *version < 0) {
        throw StoreProblem(StoreProblem::Cause::Unusable,
                           database.name() + ": its schema has no version");
    }
    return static_cast<std::size_t>(*version);
}

}  // namespace

void migrate(Database& database, std::span<const std::string_view> texts) {
    if (versionOf(database) == texts.size()) {
        return;
    }
    database.begin();
    try {
        database.lockSchema();
        const std::size_t version = versionOf(database);
        if (version > texts.size()) {
            throw StoreProblem(
                StoreProblem::Cause::Newer,
                fmt::format(
                    "{}: its schema has version {}, and this program knows up to {}; it needs a "
                    "newer program",
                    database.name(), version, texts.size()));
        }
        if (version == 0) {
            database.runScript(
                "CREATE TABLE schema_version (version BIGINT NOT NULL);"
                "INSERT INTO schema_version VALUES (0)");
        }
        for (const std::string_view text : texts.subspan(version)) {
            database.runScript(text);
        }
        database.runScript(fmt::format("UPDATE schema_version SET version = {}", texts.size()));
        database.commit();
    } catch (...) {
        database.rollback();
        throw;
    }
}

}  // namespace host
