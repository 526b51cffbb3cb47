// zrlab results as a command line asks for it.
#include "host/zrlab/results_command.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <optional>
#include <sstream>

#include <gmock/gmock.h>
#include <nlohmann/json.hpp>

#include "host/record/problem.h"
#include "host/report/report_forms.h"
#include "host/zrlab/command_line.h"
#include "tests/host/results/sample_store.h"

namespace {

using testing::AllOf;
using testing::EndsWith;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::StartsWith;

// Without the settings of the machine.
class ResultsCommand : public testing::Test {
  protected:
    ResultsCommand() {
        for (const char* place : {"ZRLAB_STATION_FILE", "ZRLAB_USER_FILE", "ZRLAB_SYSTEM_FILE"}) {
            set(place, "");
        }
        store.add({.unit = "u1", .values = {1}});
        uuid = store.add({.unit = "u2",
                          .verdict = host::Verdict::Failed,
                          .station = "right",
                          .hour = 1,
                          .values = {7}});
    }
    ~ResultsCommand() override {
        for (const std::string& name : _variables) {
            unsetenv(name.c_str());
        }
    }

    void set(const std::string& name, const std::string& value) {
        setenv(name.c_str(), value.c_str(), 1);
        _variables.push_back(name);
    }

    // What the command prints, or of a help the help.
    static std::string run(const std::vector<std::string>& words) {
        std::vector<const char*> arguments = {"zrlab", "results"};
        for (const std::string& word : words) {
            arguments.push_back(word.c_str());
        }
        host::CommandLine commandLine;
        if (const auto text =
                commandLine.read(static_cast<int>(arguments.size()), arguments.data())) {
            return *text;
        }
        return host::resultsCommand(commandLine.results);
    }
    std::string ask(std::vector<std::string> words) const {
        words.insert(words.end(), {"--store", store.address()});
        return run(words);
    }

    static std::string contentOf(const std::filesystem::path& path) {
        std::ifstream file(path);
        return {std::istreambuf_iterator<char>(file), {}};
    }

    const std::filesystem::path folder = testing::TempDir();
    test::SampleStore store;
    std::string uuid;

  private:
    std::vector<std::string> _variables;
};

TEST_F(ResultsCommand, EveryQuestionHasEveryForm) {
    for (const host::Question& question : host::questions()) {
        std::vector<std::string> words = {std::string(question.name)};
        if (!question.subject.empty()) {
            words.emplace_back(question.name == "unit" ? "u2" : "Offset");
        }
        const auto in = [&](const char* form) {
            auto all = words;
            all.insert(all.end(), {"--format", form});
            return ask(all);
        };
        EXPECT_THAT(ask(words),
                    AllOf(HasSubstr("store " + store.address()), HasSubstr("Alignment")));
        EXPECT_EQ(in("text"), ask(words));
        const auto json = nlohmann::json::parse(in("json"));
        EXPECT_EQ(json["question"], question.name);
        EXPECT_FALSE(json["rows"].empty()) << question.name;
        const std::string csv = in("csv");
        EXPECT_EQ(std::count(csv.begin(), csv.end(), '\n'), 1 + json["rows"].size());
        if (question.isPage) {
            EXPECT_THAT(in("html"), AllOf(StartsWith("<!DOCTYPE html>"), EndsWith("</html>\n")));
        } else {
            EXPECT_THROW(in("html"), host::Problem) << question.name;
        }
        EXPECT_THAT(run({std::string(question.name), "--help"}), HasSubstr("--program-version"));
    }
}

TEST_F(ResultsCommand, ShowsARunInEveryFormOfReport) {
    for (const host::ReportForm& form : host::reportForms()) {
        const std::string text = ask({"show", uuid, "--format", std::string(form.name)});
        EXPECT_THAT(text, AllOf(HasSubstr("Offset"), HasSubstr("u2"))) << form.name;
        const auto file = folder / ("shown" + std::string(form.ending));
        EXPECT_THAT(ask({"show", uuid.substr(0, 8), "--output", file.string()}), IsEmpty());
        // It tells of then, not of now.
        EXPECT_EQ(contentOf(file), text) << form.name;
        std::filesystem::remove(file);
    }
}

TEST_F(ResultsCommand, AFileGetsTheFormOfItsEnding) {
    const auto file = folder / "answer.CSV";
    EXPECT_THAT(ask({"yield", "--by", "station", "--output", file.string()}), IsEmpty());
    EXPECT_EQ(contentOf(file), ask({"yield", "--by", "station", "--format", "csv"}));
    std::filesystem::remove(file);
    EXPECT_THAT(ask({"list", "--limit", "1", "--output", "-"}), HasSubstr("There are more"));
}

// A station's own settings must not filter what it asks, nor choose the form.
TEST_F(ResultsCommand, OfTheSettingsOnlyTheStoreCounts) {
    set("ZRLAB_STORE", store.address());
    set("ZRLAB_STATION", "right");
    set("ZRLAB_FORMAT", "junit");
    EXPECT_THAT(run({"yield"}), HasSubstr("2 runs: 1 PASS, 1 FAIL"));
    EXPECT_THAT(run({"yield", "--station", "right"}), HasSubstr("1 run: 0 PASS, 1 FAIL"));
}

TEST_F(ResultsCommand, AFileOfSettingsNamesTheStore) {
    const auto file = folder / "station.conf";
    std::ofstream(file) << "station = right\nstore = " << store.address() << "\n";
    set("ZRLAB_STATION_FILE", file.string());
    EXPECT_THAT(run({"yield"}), HasSubstr("2 runs: 1 PASS, 1 FAIL"));
    std::ofstream(file) << "stroe = a.db\n";
    try {
        ADD_FAILURE() << run({"yield"});
    } catch (const host::Problem& problem) {
        EXPECT_THAT(problem.what(), StartsWith(file.string() + ":1: unknown option \"stroe\""));
        EXPECT_EQ(problem.status(), host::kExitUsage);
    }
    std::filesystem::remove(file);
}

TEST_F(ResultsCommand, BadInputIsOneLine) {
    const std::string none = (folder / "none.db").string();
    const std::string notAStore = (folder / "not-a-store.db").string();
    std::ofstream(notAStore) << std::string(4096, 'x');
    const std::string there = store.address();
    const struct {
        std::vector<std::string> words;
        int status;
        std::string text;
    } kCases[] = {
        {{}, 64, "results: no command given; zrlab results --help lists them"},
        {{"yeild"}, 64, "results: unknown command \"yeild\"; did you mean yield?"},
        {{"yield"}, 64, "results: which store? Give --store"},
        {{"yield", "--store", ""}, 64, "the value is empty"},
        {{"yield", "--store", none}, 2, "store " + none},
        {{"yield", "--store", notAStore}, 2, "store " + notAStore},
        {{"yield", "--store", there, "--by", "week"}, 64, "\"week\" is not one of diagnostic"},
        {{"yield", "--store", there, "--limit", "3"}, 64, "results yield: unknown option --limit"},
        {{"list", "--store", there, "--limit", "0"}, 64, "\"0\" is not a whole number"},
        {{"list", "--store", there, "--format", "html"},
         64,
         "\"html\" is not one of text, json, csv"},
        {{"list", "--store", there, "--output", "a.html"},
         64,
         "results list: its answer cannot be a page"},
        {{"list", "--store", there, "--format", "csv", "--output", "a.json"},
         64,
         "--output a.json: its ending asks for json"},
        {{"list", "--store", there, "--output", "/none/a.csv"}, 64, "/none/a.csv"},
        {{"list", "--store", there, "--since", "yesterday"},
         64,
         "results: --since yesterday: it is not a time"},
        {{"list", "--store", there, "--since", "1d", "--until", "2d"},
         64,
         "no time is between --since 1d and --until 2d"},
        {{"list", "--store", there, "--staton", "x"},
         64,
         "unknown option --staton; did you mean --station?"},
        {{"trend", "--store", there}, 64, "MEASUREMENT"},
        {{"show", "--store", there}, 64, "UUID"},
        {{"show", "--store", there, "ffff"},
         64,
         "no run in " + there + " has a UUID that begins with \"ffff\""},
        {{"show", "--store", there, "0190"}, 64, "the UUIDs of several runs begin with \"0190\""},
    };
    for (const auto& [words, status, text] : kCases) {
        try {
            ADD_FAILURE() << testing::PrintToString(words) << ": " << run(words);
        } catch (const host::Problem& problem) {
            EXPECT_EQ(problem.status(), status) << problem.what();
            EXPECT_THAT(problem.what(), AllOf(HasSubstr(text), Not(HasSubstr("\n"))));
        }
    }
    EXPECT_FALSE(std::filesystem::exists(none));
    std::filesystem::remove(notAStore);
}

}  // namespace
