// What a store gives back is what it was given, whatever its engine.
#include "host/store/store.h"

#include <cmath>
#include <functional>
#include <limits>

#include <gmock/gmock.h>
#include <nlohmann/json.hpp>

#include "host/record/clean_text.h"
#include "host/record/problem.h"
#include "host/record/uuid.h"
#include "host/report/json_report.h"
#include "host/store/run_json.h"
#include "tests/host/store/store_support.h"

namespace {

using host::Access;
using host::Judgement;
using host::Store;
using Json = nlohmann::json;

constexpr host::Attachments kAll{.frames = true, .images = true};

// An engine, and the address of a store of its own in a folder.
struct EngineRow {
    const char* name;
    std::string (*address)(const std::filesystem::path& folder);
};
const EngineRow kEngines[] = {
    {"Sqlite", [](const std::filesystem::path& folder) { return (folder / "runs.db").string(); }},
};

class StoreTest : public testing::TestWithParam<EngineRow> {
  protected:
    std::string address() const { return GetParam().address(_folder.path()); }

  private:
    test::Folder _folder;
};

INSTANTIATE_TEST_SUITE_P(Engines, StoreTest, testing::ValuesIn(kEngines), [](const auto& engine) {
    return engine.param.name;
});

// With every text as a store keeps it.
Json cleaned(const Json& json) {
    if (json.is_string()) {
        return host::cleanText(json.get<std::string>());
    }
    if (!json.is_structured()) {
        return json;
    }
    Json result = json;
    for (auto& [key, value] : result.items()) {
        value = cleaned(value);
    }
    return result;
}

Json reportOf(const host::SessionRecord& session) {
    return cleaned(Json::parse(host::jsonReport(session)));
}

TEST_P(StoreTest, GivesBackEverySampleAsItWas) {
    Store store(address());
    for (const auto& [name, session] : test::sampleRuns()) {
        const host::RunRecord& run = session.runs.front();
        ASSERT_TRUE(store.write(session, run, kAll)) << name;
        const auto loaded = store.load(run.uuid);
        ASSERT_TRUE(loaded.has_value()) << name;
        EXPECT_EQ(reportOf(*loaded), reportOf(session)) << name;
        EXPECT_EQ(loaded->runs.front().uuid, run.uuid) << name;
        EXPECT_EQ(loaded->runs.front().frames.size(), run.frames.size()) << name;

        const host::SessionRecord spooled = host::runFromJson(host::runToJson(session, run, kAll));
        EXPECT_EQ(reportOf(spooled), reportOf(session)) << name;
    }
    EXPECT_EQ(store.load(host::newUuid()), std::nullopt);
}

}  // namespace
