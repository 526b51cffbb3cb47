// The SQL on the page about stations does what the page says, on both engines.
#include <fstream>
#include <regex>
#include <sstream>

#include <gmock/gmock.h>

#include "host/store/run_json.h"
#include "tests/host/store/store_support.h"
#include "tests/support/postgres_cluster.h"

namespace {

using host::Judgement;
using host::Store;
using host::Verdict;

// SQL on the page, and the lines that it prints there.
struct Block {
    std::string sql;
    std::string output;
};

std::vector<Block> blocksOf(const std::string& section) {
    std::ifstream file(ZR_PAGE);
    const std::string page(std::istreambuf_iterator<char>(file), {});
    const std::size_t begin = page.find("\n## " + section + "\n");
    EXPECT_NE(begin, std::string::npos) << section;
    const std::string text = page.substr(begin, page.find("\n## ", begin + 1) - begin);
    static const std::regex kBlock("```sql\n([^`]*)```\n(```\n([^`]*)```)?");
    std::vector<Block> blocks;
    for (std::sregex_iterator at(text.begin(), text.end(), kBlock); at != std::sregex_iterator();
         ++at) {
        blocks.push_back({at->str(1), at->str(3)});
    }
    return blocks;
}

// As `psql -At` prints a row.
std::string lineOf(const host::Row& row) {
    std::ostringstream line;
    line.precision(15);
    for (std::size_t at = 0; at < row.size(); ++at) {
        line << (at == 0 ? "" : "|");
        if (const auto* integer = std::get_if<std::int64_t>(&row[at])) {
            line << *integer;
        } else if (const auto* number = std::get_if<double>(&row[at])) {
            line << *number;
        } else if (const auto* words = std::get_if<std::string>(&row[at])) {
            line << *words;
        }
    }
    return line.str();
}

// Two weeks of two stations.
void fill(Store& store) {
    constexpr char kMeterix[] = "VantorMeterixDiagnostic";
    constexpr char kFault[] = "VantorFaultDiagnostic";
    const struct {
        int day;
        const char* station;
        const char* unit;
        const char* diagnostic;
        Verdict verdict;
        double value;
    } rows[] = {{1, "bench-3", "SN-1", kMeterix, Verdict::Passed, 0},
                {1, "bench-3", "SN-1", kFault, Verdict::Passed, 0},
                {2, "bench-3", "SN-2", kMeterix, Verdict::Failed, 3},
                {2, "bench-4", "SN-3", kMeterix, Verdict::Passed, 0},
                {3, "bench-4", "SN-4", kMeterix, Verdict::Passed, 0},
                {3, "bench-4", "SN-4", kFault, Verdict::Error, 0},
                {8, "bench-4", "SN-5", kMeterix, Verdict::Passed, 0},
                {9, "bench-4", "SN-6", kMeterix, Verdict::Failed, 2},
                {9, "bench-3", "SN-6", kMeterix, Verdict::Passed, 0}};
    int minute = 0;
    for (const auto& row : rows) {
        host::SessionRecord session = test::storedSession(0);
        session.identity.unit = row.unit;
        session.identity.station = row.station;
        host::RunRecord& run = session.runs.front();
        run.plan.name = row.diagnostic;
        run.started = host::dateOf(1'793'491'200'000'000 + (row.day - 1) * 86'400'000'000 +
                                   ++minute * 60'000'000);
        run.verdict = row.verdict;
        if (row.verdict == Verdict::Error) {
            run.failures.push_back({host::Part::Experiment, host::kStepRun,
                                    std::make_shared<const platform::Error>(
                                        "ZRCapturePlugInErrorDomain", 204,
                                        "Failed to start streaming zorvel.", nullptr),
                                    ""});
        } else if (run.plan.name == kMeterix) {
            const host::LimitRecord limit{"Max Reports", host::BoundRecord{0, false},
                                          host::BoundRecord{0, false}};
            run.results.push_back({"Number Xel INT_FAULT_CC", row.value, "events", limit,
                                   row.value == 0 ? Judgement::Within : Judgement::Outside});
        }
        ASSERT_TRUE(store.write(session, run));
    }
}

class Page : public testing::TestWithParam<test::EngineRow> {};

INSTANTIATE_TEST_SUITE_P(Engines, Page, testing::ValuesIn(test::kEngines), test::nameOf);

TEST_P(Page, ShowsWhatItsQueriesPrint) {
    test::Folder folder;
    const std::string where = GetParam().address(folder.path());
    Store store(where);
    fill(store);
    const std::vector<Block> queries = blocksOf("Read it from SQL");
    EXPECT_EQ(queries.size(), 5U);
    for (const Block& query : queries) {
        std::string output;
        for (const host::Row& row : store.query(query.sql)) {
            output += lineOf(row) + "\n";
        }
        EXPECT_EQ(output, query.output) << query.sql;
    }
    const std::vector<Block> removal = blocksOf("How much it is");
    GetParam().runSql(where, removal.at(0).sql);
    EXPECT_EQ(test::numberIn(store, "SELECT COUNT(*) FROM runs"), 7);
    EXPECT_EQ(test::numberIn(store, "SELECT COUNT(*) FROM results"), 6);
}

// The roles of the page can do what they are for, and nothing else.
TEST(Page, MakesRolesWithTheLeastRights) {
    const std::string admin = test::PostgresCluster::shared().newDatabase();
    const auto as = [&](const std::string& role) {
        return "postgresql://" + role + "@/zrlab" + admin.substr(admin.find('?'));
    };
    const std::vector<Block> blocks = blocksOf("Three hundred stations");
    ASSERT_EQ(blocks.size(), 2U);
    std::istringstream roles(blocks[0].sql);
    for (std::string statement; std::getline(roles, statement);) {
        test::runOnPostgres(admin, statement);
    }
    test::runOnPostgres(as("zrlab"), blocks[1].sql);

    const auto isRefused = [](const auto& action) {
        try {
            action();
            return false;
        } catch (const host::StoreProblem& problem) {
            EXPECT_EQ(problem.cause(), host::StoreProblem::Cause::ReadOnly) << problem.what();
            return true;
        }
    };
    const auto write = [](Store& store) {
        const host::SessionRecord session = test::storedSession();
        return store.write(session, session.runs.front());
    };
    Store owner(as("zrlab_owner"));
    Store station(as("zrlab_station"));
    Store reader(as("zrlab_reader"));
    EXPECT_TRUE(isRefused([&] { station.connect(); }));  // there are no tables
    EXPECT_TRUE(write(owner));
    EXPECT_TRUE(write(station));
    EXPECT_TRUE(isRefused([&] { write(reader); }));
    for (const char* change : {"UPDATE runs SET verdict = 'pass'", "DELETE FROM results",
                               "DROP TABLE logs", "UPDATE schema_version SET version = 0"}) {
        EXPECT_TRUE(isRefused([&] { station.query(change); })) << change;
        EXPECT_TRUE(isRefused([&] { reader.query(change); })) << change;
    }
    for (Store* const store : {&owner, &station, &reader}) {
        EXPECT_EQ(test::runsIn(*store), 2);
        EXPECT_EQ(test::numberIn(*store, "SELECT COUNT(*) FROM named_results"), 128);
    }
}

}  // namespace
