// The engines that a store may have, for tests that run over each.
#ifndef ZR_TESTS_SUPPORT_STORE_ENGINES_H
#define ZR_TESTS_SUPPORT_STORE_ENGINES_H

#include <filesystem>
#include <iosfwd>
#include <string>

#include <gtest/gtest.h>

namespace test {

// An engine, and the address of a new store of its own, in the folder if it is a file.
struct EngineRow {
    const char* name;
    std::string (*address)(const std::filesystem::path& folder);
    // Runs SQL on the store beside its own connection.
    void (*runSql)(const std::string& address, const std::string& sql);
};
extern const EngineRow kEngines[2];
std::string nameOf(const testing::TestParamInfo<EngineRow>& engine);
// Names a test's parameter: without it the name has addresses in it.
void PrintTo(const EngineRow& engine, std::ostream* out);

// Runs SQL on the file of a store.
void runSql(const std::string& file, const std::string& sql);

}  // namespace test

#endif
