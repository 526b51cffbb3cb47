#include "host/zrlab/output_file.h"

#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>

#include <sys/stat.h>
#include <unistd.h>

#include <gmock/gmock.h>

namespace {

namespace fs = std::filesystem;
using testing::HasSubstr;

class OutputFile : public testing::Test {
  protected:
    OutputFile() {
        std::string name = (fs::temp_directory_path() / "zrlab-output-XXXXXX").string();
        _folder = mkdtemp(name.data());
    }
    ~OutputFile() override { fs::remove_all(_folder); }

    static std::string read(const fs::path& file) {
        std::ifstream in(file, std::ios::binary);
        return {std::istreambuf_iterator<char>(in), {}};
    }
    std::size_t entries() const {
        return static_cast<std::size_t>(
            std::distance(fs::directory_iterator(_folder), fs::directory_iterator()));
    }
    fs::path _folder;
};

TEST_F(OutputFile, ReplacesWholeAndLeavesNothingElse) {
    const fs::path file = _folder / "report";
    std::ofstream(file) << "what was there before, and longer than what comes";
    EXPECT_EQ(host::cannotWrite(file), std::nullopt);
    EXPECT_EQ(read(file), "what was there before, and longer than what comes");
    const std::string content("new\0content\n", 12);
    EXPECT_EQ(host::writeFile(file, content), std::nullopt);
    EXPECT_EQ(read(file), content);
    EXPECT_EQ(entries(), 1U);
}

TEST_F(OutputFile, KeepsModesLinksAndWhatIsNoFile) {
    const fs::path file = _folder / "private";
    std::ofstream(file) << "old";
    fs::permissions(file, fs::perms::owner_read | fs::perms::owner_write);
    fs::create_symlink(file, _folder / "link");
    EXPECT_EQ(host::writeFile(_folder / "link", "new"), std::nullopt);
    EXPECT_TRUE(fs::is_symlink(_folder / "link"));
    EXPECT_EQ(read(file), "new");
    EXPECT_EQ(fs::status(file).permissions(), fs::perms::owner_read | fs::perms::owner_write);

    fs::create_symlink("/dev/null", _folder / "nothing");
    EXPECT_EQ(host::cannotWrite(_folder / "nothing"), std::nullopt);
    EXPECT_EQ(host::writeFile(_folder / "nothing", "gone"), std::nullopt);
    EXPECT_TRUE(fs::is_character_file("/dev/null"));
    fs::create_symlink("/dev/full", _folder / "full");
    EXPECT_NE(host::writeFile(_folder / "full", "too much"), std::nullopt);
}

TEST_F(OutputFile, SaysWhatCannotBeWrittenAndTouchesNothing) {
    const fs::path absent = _folder / "no" / "such" / "report";
    for (const auto& problem : {host::cannotWrite(absent), host::writeFile(absent, "x")}) {
        ASSERT_TRUE(problem.has_value());
        EXPECT_THAT(*problem, HasSubstr("cannot write " + absent.string()));
        EXPECT_THAT(*problem, HasSubstr("No such file or directory"));
    }
    EXPECT_THAT(host::cannotWrite(_folder).value_or(""), HasSubstr("Is a directory"));
    EXPECT_EQ(entries(), 0U);
}

}  // namespace
