#include "host/run/bench_limits.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "host/record/problem.h"
#include "host/run/figure.h"

namespace {

namespace fs = std::filesystem;

const std::vector<std::string> kRunnable = {"VantorFaultDiagnostic", "VantorMeterixDiagnostic",
                                            "KirraImageExperiment"};
const fs::path kFolder = ZR_LIMITS;

std::string problemOf(const std::string& path) {
    try {
        host::readBenchLimits(path, kRunnable);
        return "";
    } catch (const host::Problem& problem) {
        EXPECT_EQ(problem.status(), host::kExitUsage);
        return problem.what();
    }
}

TEST(BenchLimits, KnowsEveryKey) {
    const auto limits = host::readBenchLimits(kFolder / "every_key.json", kRunnable);
    ASSERT_EQ(limits.size(), 1 + host::kFigureCount);
    EXPECT_EQ(limits[0].measurement, "LPDP");
    EXPECT_FALSE(limits[0].partOfVerdict);
    for (std::size_t at = 0; at < host::kFigureCount; ++at) {
        const host::BenchLimit& limit = limits[at + 1];
        const bool ofFrames = host::kFigures[at].group == host::FigureGroup::Frames;
        EXPECT_EQ(limit.figure, at);
        EXPECT_TRUE(limit.partOfVerdict);
        EXPECT_EQ(limit.limit.name, "Every key");
        EXPECT_EQ(limit.limit.lower->open, !ofFrames);
        EXPECT_EQ(limit.limit.upper->open, ofFrames);
    }
}

TEST(BenchLimits, SaysWhatIsWrongInOneLine) {
    std::string folder = (fs::path(testing::TempDir()) / "limits-XXXXXX").string();
    const std::string path = (fs::path(mkdtemp(folder.data())) / "mine.json").string();
    const auto write = [&path](const std::string& text) { std::ofstream(path) << text; };
    std::ifstream in(kFolder / "broken_limits.json");
    for (const auto& row : nlohmann::ordered_json::parse(in)) {
        write(row["limits"].dump());
        EXPECT_EQ(problemOf(path), "--limits " + path + ": " + row["problem"].get<std::string>());
    }
    write("{\"limits\": }");
    EXPECT_NE(problemOf(path).find("line 1, column 12: syntax error"), std::string::npos);
    EXPECT_EQ(problemOf(folder), "--limits " + folder + ": a folder, not a file of limits");
    EXPECT_EQ(problemOf("/no/such"),
              "--limits /no/such: cannot be read: No such file or directory");
    write(R"({"limits": {"KirraImageExperiment": {"images": {"amplitude": {"above": 1}}}}})");
    const auto limits = host::readBenchLimits(path, kRunnable);
    EXPECT_EQ(limits.at(0).limit.name, "mine");
    EXPECT_FALSE(limits.at(0).partOfVerdict);
}

}  // namespace
