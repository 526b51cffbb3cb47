#include "host/results/answer_forms.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <memory>

#include <gmock/gmock.h>
#include <nlohmann/json.hpp>

#include "tests/host/results/sample_store.h"

namespace {

using testing::HasSubstr;
using testing::Not;

host::Answer sampleAnswer() {
    host::Answer answer;
    answer.question = "yield";
    answer.title = "Yield of <all>";
    answer.scope = {{"store", "a & b"}};
    answer.runs = 3;
    answer.verdicts[0] = 2;
    answer.verdicts[1] = 1;
    answer.columns = {{"name", "Name"},
                      {"runs", "Runs", host::ColumnKind::Count},
                      {"mean", "Mean", host::ColumnKind::Number},
                      {"firstPass", "First pass", host::ColumnKind::Share}};
    answer.rows = {{"a,\"b\"\x1B[1m\n", std::int64_t{3}, 0.1, host::Share{1, 2, 0.25, 0.75}},
                   {"=größer", std::int64_t{12}, {}, {}}};
    answer.notes = {"A note."};
    return answer;
}

TEST(AnswerForms, TextIsATable) {
    EXPECT_EQ(host::textAnswer(sampleAnswer()),
              "Yield of <all>\n"
              "store a & b, 3 runs: 2 PASS, 1 FAIL, 0 ERROR, 0 INTERRUPTED\n"
              "\n"
              "Name        Runs  Mean  First pass\n"
              "a,\"b\"?[1m?     3   0.1  1 of 2, 50.0 % (25.0 … 75.0)\n"
              "=größer       12     –  –\n"
              "\n"
              "A note.\n");
}

TEST(AnswerForms, CsvQuotesFieldsAndOpensShares) {
    EXPECT_EQ(host::csvAnswer(sampleAnswer()),
              "name,runs,mean,firstPass.count,firstPass.of,firstPass.share,firstPass.low,firstPass."
              "high\r\n"
              "\"a,\"\"b\"\"\uFFFD[1m\n\",3,0.1,1,2,0.5,0.25,0.75\r\n"
              "=größer,12,,,,,,\r\n");  // data stay data
}

TEST(AnswerForms, JsonHoldsEveryFigure) {
    const auto json = nlohmann::json::parse(host::jsonAnswer(sampleAnswer()));
    EXPECT_EQ(json["runs"]["pass"], 2);
    EXPECT_EQ(json["rows"][0]["firstPass"]["high"], 0.75);
    EXPECT_TRUE(json["rows"][1]["mean"].is_null());
    EXPECT_EQ(json["columns"][3]["kind"], "share");
    EXPECT_EQ(json["notes"][0], "A note.");
}

TEST(AnswerForms, PercentHasDigitsWhereTheyCount) {
    EXPECT_EQ(host::percentText(0), "0");
    EXPECT_EQ(host::percentText(1), "100");
    EXPECT_EQ(host::percentText(0.9333), "93.3");
    EXPECT_EQ(host::percentText(0.99987), "99.987");
    EXPECT_EQ(host::percentText(0.000384), "0.038");
}

// A factory of three stations over three weeks, for the checks outside of this program: see tests/reports.
TEST(AnswerForms, WritesSamplePages) {
    const char* given = std::getenv("ZR_SAMPLES");
    const std::filesystem::path folder =
        given != nullptr ? given : std::filesystem::path(testing::TempDir()) / "zrlab-samples";
    std::filesystem::create_directories(folder);
    test::SampleStore store;
    const auto error = std::make_shared<platform::Error>("Domain", 204, "No <stream>", nullptr);
    for (int at = 0; at < 300; ++at) {
        const std::string station = at % 3 == 0   ? "left"
                                    : at % 3 == 1 ? "right"
                                                  : "a \"far\" & <strange> station";
        const double value = (at * 37 % 101) / 20.0 - 2.5 + at / 200.0;
        const double bound = at < 200 ? 3 : 2.8;
        const bool passes = value <= bound;
        store.add({.unit = "SN-" + std::to_string(at % 250),
                   .verdict = at % 41 == 0 ? host::Verdict::Error
                              : passes     ? host::Verdict::Passed
                                           : host::Verdict::Failed,
                   .station = station,
                   .hour = at * 2,
                   .values = at % 41 == 0 ? std::vector<double>() : std::vector<double>{value},
                   .diagnostic = at % 2 == 0 ? "Alignment" : "Illumination",
                   .lot = at < 100 ? "L1" : "L2",
                   .error = at % 41 == 0 ? error : nullptr},
                  bound);
    }
    const struct {
        const char* file;
        const char* question;
        host::Asked asked;
    } kPages[] = {{"yield", "yield", {.by = "station"}},
                  {"yield-days", "yield", {.by = "day"}},
                  {"pareto", "pareto", {}},
                  {"spread", "spread", {}},
                  {"trend", "trend", {.subject = "Offset"}}};
    for (const auto& [file, question, asked] : kPages) {
        host::Asked whole = asked;
        whole.commandLine = std::string("zrlab results ") + question + " --store <runs>.db";
        const std::string page = host::htmlAnswer(store.ask(question, whole));
        EXPECT_THAT(page, HasSubstr("<figure>")) << file;
        EXPECT_THAT(page, Not(HasSubstr("<strange>"))) << file;
        const auto path = folder / (std::string("results-") + file + ".html");
        EXPECT_TRUE(std::ofstream(path) << page << std::flush) << path;
    }
}

}  // namespace
