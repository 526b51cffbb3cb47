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
#include "tests/support/postgres_cluster.h"

namespace {

using host::Access;
using host::Judgement;
using host::Store;
using Json = nlohmann::json;

class StoreTest : public testing::TestWithParam<test::EngineRow> {
  protected:
    std::string address() const { return GetParam().address(_folder.path()); }

  private:
    test::Folder _folder;
};

INSTANTIATE_TEST_SUITE_P(Engines, StoreTest, testing::ValuesIn(test::kEngines), test::nameOf);

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
        ASSERT_TRUE(store.write(session, run, test::kAll)) << name;
        const auto loaded = store.load(run.uuid);
        ASSERT_TRUE(loaded.has_value()) << name;
        const Json report = reportOf(session);
        EXPECT_EQ(reportOf(*loaded), report) << name;
        EXPECT_EQ(loaded->runs.front().uuid, run.uuid) << name;
        EXPECT_EQ(loaded->runs.front().frames.size(), run.frames.size()) << name;

        const host::SessionRecord spooled =
            host::runFromJson(host::runToJson(session, run, test::kAll));
        EXPECT_EQ(reportOf(spooled), report) << name;
    }
    EXPECT_EQ(store.load(host::newUuid()), std::nullopt);
}

// What a report rounds or leaves out.
TEST_P(StoreTest, KeepsEveryNumber) {
    constexpr double kNan = std::numeric_limits<double>::quiet_NaN();
    constexpr double kInfinity = std::numeric_limits<double>::infinity();
    const double numbers[] = {kNan, kInfinity, -kInfinity, 0.1, 1e308, 5e-324, -3, 0};
    host::SessionRecord session = test::storedSession(0);
    host::RunRecord& run = session.runs.front();
    for (const double number : numbers) {
        const host::LimitRecord limit{"Bound", host::BoundRecord{number, true}, std::nullopt};
        run.measurements.push_back({"m", number, "V"});
        run.results.push_back({"r", number, "V", limit, Judgement::Outside});
        run.benchResults.push_back(
            {{"b", number, "V", limit, Judgement::NotMeasured}, number < 1, "no frame has it"});
    }
    run.number = 1'000'000'000'000;
    run.framesDelivered = 5'000'000'000;
    Store store(address());
    ASSERT_TRUE(store.write(session, run));
    const auto loaded = store.load(run.uuid);
    const host::RunRecord spooled =
        host::runFromJson(host::runToJson(session, run, test::kAll)).runs.front();
    for (const host::RunRecord& kept : {loaded->runs.front(), spooled}) {
        ASSERT_EQ(kept.measurements.size(), std::size(numbers));
        ASSERT_EQ(kept.results.size(), std::size(numbers));
        ASSERT_EQ(kept.benchResults.size(), std::size(numbers));
        for (std::size_t at = 0; at < std::size(numbers); ++at) {
            const auto isSame = testing::NanSensitiveDoubleEq(numbers[at]);
            const host::BenchResult& bench = kept.benchResults[at];
            EXPECT_THAT(kept.measurements[at].value, isSame);
            EXPECT_THAT(kept.results[at].value, isSame);
            EXPECT_THAT(kept.results[at].limit->lower->value, isSame);
            EXPECT_TRUE(kept.results[at].limit->lower->open);
            EXPECT_FALSE(kept.results[at].limit->upper.has_value());
            EXPECT_THAT(bench.value, isSame);
            EXPECT_EQ(bench.judgement, Judgement::NotMeasured);
            EXPECT_EQ(bench.partOfVerdict, numbers[at] < 1);
            EXPECT_EQ(bench.note, "no frame has it");
        }
        EXPECT_EQ(kept.number, run.number);
        EXPECT_EQ(kept.framesDelivered, run.framesDelivered);
        EXPECT_EQ(kept.framesLost, std::nullopt);
    }
}

TEST_P(StoreTest, TakesARunOnce) {
    const host::SessionRecord session = test::storedSession();
    host::RunRecord again = session.runs.front();
    again.verdict = host::Verdict::Failed;
    Store store(address());
    EXPECT_TRUE(store.write(session, session.runs.front()));
    EXPECT_FALSE(store.write(session, again));
    EXPECT_EQ(test::runsIn(store), 1);
    EXPECT_EQ(test::numberIn(store, "SELECT COUNT(*) FROM results"), 64);
    EXPECT_EQ(store.load(again.uuid)->verdict, host::Verdict::Passed);
}

TEST_P(StoreTest, KeepsFramesAndImagesOnlyWhenAsked) {
    Store store(address());
    for (const auto& [name, session] : test::sampleRuns()) {
        store.write(session, session.runs.front());
    }
    EXPECT_EQ(test::numberIn(store, "SELECT COUNT(*) FROM attachments"), 0);
}

// Each process has runs of its own and some that all have: every one is in the store once.
TEST_P(StoreTest, TakesTheRunsOfManyProcessesAtOnce) {
    constexpr int kProcesses = 32;
    constexpr int kRuns = 5;
    const std::string where = address();
    std::vector<host::SessionRecord> shared;
    for (int at = 0; at < 5; ++at) {
        shared.push_back(test::storedSession(2));
    }
    const int written = test::inProcesses(kProcesses, [&](int process) {
        Store store(where);
        store.setPatience(std::chrono::seconds(60));
        int taken = 0;
        for (const auto& session : shared) {
            taken += store.write(session, session.runs.front()) ? 1 : 0;
        }
        for (int at = 0; at < kRuns; ++at) {
            host::SessionRecord session = test::storedSession();
            session.identity.unit += std::to_string((process + at) % 5);
            taken += store.write(session, session.runs.front()) ? 1 : 0;
        }
        return taken;
    });
    EXPECT_EQ(written, kProcesses * kRuns + 5);
    Store store(where);
    EXPECT_EQ(test::runsIn(store), written);
    EXPECT_EQ(test::numberIn(store, "SELECT COUNT(*) FROM results"),
              kProcesses * kRuns * 64 + 5 * 2);
    EXPECT_EQ(test::numberIn(store, "SELECT COUNT(*) FROM quantities"), 64);
    EXPECT_EQ(test::numberIn(store, "SELECT COUNT(*) FROM limits"), 1);
    EXPECT_EQ(test::numberIn(store, "SELECT COUNT(*) FROM units"), 6);
}

// A run that comes late counts where it belongs; one without a verdict about the unit does not count.
TEST_P(StoreTest, CountsAttemptsByTheTimeOfTheRuns) {
    struct Row {
        int minute;
        host::Verdict verdict;
        std::vector<std::int64_t> attempts;  // of the runs that count, by time, once it is written
    };
    const Row rows[] = {{30, host::Verdict::Passed, {1}},
                        {10, host::Verdict::Failed, {1, 2}},
                        {20, host::Verdict::Error, {1, 2}},
                        {40, host::Verdict::Interrupted, {1, 2}},
                        {15, host::Verdict::Failed, {1, 2, 3}}};
    Store store(address());
    for (const Row& row : rows) {
        host::SessionRecord session = test::storedSession(1);
        session.runs.front().started = host::dateOf(row.minute * 60'000'000LL);
        session.runs.front().verdict = row.verdict;
        store.write(session, session.runs.front());
        session = test::storedSession(1);
        session.identity.unit.clear();  // of no unit: no attempt
        store.write(session, session.runs.front());
        std::vector<std::int64_t> attempts;
        for (const host::Row& found :
             store.query("SELECT attempt FROM attempts ORDER BY started")) {
            attempts.push_back(std::get<std::int64_t>(found.at(0)));
        }
        EXPECT_EQ(attempts, row.attempts);
    }
}

TEST(StoreAddress, OneLineSaysWhatIsWrongWithIt) {
    test::Folder folder;
    const std::string none = (folder.path() / "none.db").string();
    const std::string other = (folder.path() / "other.db").string();
    const std::string empty = (folder.path() / "empty.db").string();
    test::runSql(other, "CREATE TABLE mine (x)");
    test::runSql(empty, "PRAGMA user_version = 1");
    struct Row {
        std::string address;
        Access access;
        std::string problem;
    };
    const Row rows[] = {
        {"", Access::Make, "store: the address is empty"},
        {"mysql://joe:secret@db/x", Access::Make,
         "store mysql://joe:\\*\\*\\*@db/x: unknown kind.*"},
        {"postgresql://joe:secret@db/x?colour=red", Access::Make,
         "store postgresql://joe:\\*\\*\\*@db/x\\?colour=red: the address is not well formed; it "
         "is .*"},
        {"postgres://db/x?colour=red", Access::Make,
         "store postgres://db/x\\?colour=red: invalid URI query parameter: \"colour\""},
        {"postgresql:///x?host=/nowhere&password=secret", Access::Make,
         "postgresql:///x\\?host=/nowhere&password=\\*\\*\\*: .*/nowhere.*No such file.*"},
        {none, Access::Existing, ".*none.db: unable to open.*"},
        {empty, Access::Existing, ".*empty.db: it is not a store"},
        {other, Access::Make, ".*other.db: it is not a store"},
        {test::PostgresCluster::shared().newDatabase(), Access::Existing,
         "postgresql://.*: it is not a store"},
    };
    for (const Row& row : rows) {
        try {
            Store(row.address, row.access).connect();
            ADD_FAILURE() << row.address;
        } catch (const std::exception& problem) {
            EXPECT_THAT(problem.what(), testing::MatchesRegex(row.problem));
            EXPECT_THAT(problem.what(), testing::Not(testing::HasSubstr("secret")));
        }
    }
    EXPECT_FALSE(std::filesystem::exists(none));
}

}  // namespace
