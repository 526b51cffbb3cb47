#include "host/zrlab/output_file.h"

#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <gmock/gmock.h>

#include "host/record/problem.h"

namespace {

namespace fs = std::filesystem;
using testing::ThrowsMessage;

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
    host::requireWritable(file);
    EXPECT_EQ(read(file), "what was there before, and longer than what comes");
    const std::string content("new\0content\n", 12);
    host::writeFile(file, content);
    EXPECT_EQ(read(file), content);
    EXPECT_EQ(entries(), 1U);
}

TEST_F(OutputFile, KeepsModesLinksAndWhatIsNoFile) {
    const fs::path file = _folder / "private";
    std::ofstream(file) << "old";
    fs::permissions(file, fs::perms::owner_read | fs::perms::owner_write);
    fs::create_symlink(file, _folder / "link");
    host::writeFile(_folder / "link", "new");
    EXPECT_TRUE(fs::is_symlink(_folder / "link"));
    EXPECT_EQ(read(file), "new");
    EXPECT_EQ(fs::status(file).permissions(), fs::perms::owner_read | fs::perms::owner_write);

    fs::create_symlink("/dev/null", _folder / "nothing");
    host::requireWritable(_folder / "nothing");
    host::writeFile(_folder / "nothing", "gone");
    EXPECT_TRUE(fs::is_character_file("/dev/null"));
    fs::create_symlink("/dev/full", _folder / "full");
    EXPECT_THROW(host::writeFile(_folder / "full", "too much"), host::Problem);
}

TEST_F(OutputFile, SaysWhatCannotBeWrittenAndTouchesNothing) {
    const fs::path absent = _folder / "no" / "such" / "report";
    const auto isRefused = [](const std::string& why) { return ThrowsMessage<host::Problem>(why); };
    const std::string why = "cannot write " + absent.string() + ": No such file or directory";
    EXPECT_THAT([&] { host::requireWritable(absent); }, isRefused(why));
    EXPECT_THAT([&] { host::writeFile(absent, "x"); }, isRefused(why));
    EXPECT_THAT([&] { host::requireWritable(_folder); },
                isRefused("cannot write " + _folder.string() + ": Is a directory"));
    EXPECT_EQ(entries(), 0U);
}

// What was written is kept, beside the target, unless nothing was.
TEST_F(OutputFile, WritesAsItComesIntoAPartFile) {
    const fs::path file = _folder / "report";
    const fs::path part = _folder / "report.part";
    std::ofstream(file) << "before";
    std::ofstream(part) << "of a program that was killed";
    {
        const auto report = host::openOutputFile(file, true);
        EXPECT_EQ(read(part), "");
        EXPECT_THAT([&] { host::openOutputFile(file, true); },
                    ThrowsMessage<host::Problem>("cannot write " + file.string() +
                                                 ": another program is writing " + part.string()));
        report->append("one\n");
        report->append("two\n");
        EXPECT_EQ(read(part), "one\ntwo\n");
        EXPECT_EQ(read(file), "before");
        report->finish();
        EXPECT_EQ(read(file), "one\ntwo\n");
        EXPECT_EQ(entries(), 1U);
    }
    host::openOutputFile(file, true)->append("three\n");  // and never finished
    EXPECT_EQ(read(part), "three\n");
    EXPECT_EQ(read(file), "one\ntwo\n");
    host::openOutputFile(file, true);
    EXPECT_EQ(entries(), 1U);

    fs::create_symlink(file, _folder / "link");
    const auto linked = host::openOutputFile(_folder / "link", true);
    linked->append("through a link");
    linked->finish();
    EXPECT_TRUE(fs::is_symlink(_folder / "link"));
    EXPECT_EQ(read(file), "through a link");
}

// A pipe gets everything at the end.
TEST_F(OutputFile, WritesToWhatIsNoFileAtTheEnd) {
    const fs::path pipe = _folder / "pipe";
    ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
    const int reader = open(pipe.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    const auto report = host::openOutputFile(pipe, true);
    char text[16];
    report->append("whole");
    EXPECT_EQ(::read(reader, text, sizeof text), 0);  // no writer yet
    report->finish();
    EXPECT_EQ(::read(reader, text, sizeof text), 5);
    close(reader);
    EXPECT_EQ(entries(), 1U);
}

}  // namespace
