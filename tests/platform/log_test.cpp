#include "platform/log.h"

#include <array>
#include <atomic>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include <syslog.h>

#include <gmock/gmock.h>

namespace {

std::vector<std::pair<int, std::string>> systemLog;

}  // namespace

// In place of the C library's.
extern "C" void syslog(int priority, const char* format, ...) {
    std::array<char, 256> text{};
    va_list arguments;
    va_start(arguments, format);
    std::vsnprintf(text.data(), text.size(), format, arguments);
    va_end(arguments);
    systemLog.emplace_back(priority, text.data());
}

namespace {

using platform::Log;
using platform::LogLevel;
using platform::LogLine;

struct RecordingSink final : platform::LogSink {
    void write(const LogLine& line) override {
        lines.push_back(std::string(line.subsystem) + ':' + std::string(line.category) + ' ' +
                        std::to_string(static_cast<int>(line.level)) + ' ' +
                        std::string(line.message));
    }
    std::vector<std::string> lines;
};

class LogTest : public ::testing::Test {
  protected:
    ~LogTest() override { platform::setLogSink(nullptr, LogLevel::Default); }
};

TEST_F(LogTest, ComputesAMessageOnlyWhenItsLevelIsOn) {
    constexpr LogLevel kLevels[] = {LogLevel::Debug, LogLevel::Default, LogLevel::Error};
    const Log log("sub.system", "category");
    for (const LogLevel minimum : kLevels) {
        const auto sink = std::make_shared<RecordingSink>();
        platform::setLogSink(sink, minimum);
        std::vector<std::string> expected;
        int computed = 0;
        for (const LogLevel level : kLevels) {
            EXPECT_EQ(Log::isEnabled(level), level >= minimum);
            log.write(level, [&] { return "line " + std::to_string(++computed); });
            if (level >= minimum) {
                expected.push_back("sub.system:category " +
                                   std::to_string(static_cast<int>(level)) + " line " +
                                   std::to_string(expected.size() + 1));
            }
        }
        EXPECT_EQ(sink->lines, expected);
        EXPECT_EQ(computed, static_cast<int>(expected.size()));
    }
}

TEST_F(LogTest, GoesToTheSystemLogWithoutASinkOfItsOwn) {
    platform::setLogSink(nullptr, LogLevel::Debug);
    const Log log("sub.system", "category");
    for (const LogLevel level : {LogLevel::Debug, LogLevel::Default, LogLevel::Error}) {
        log.write(level, [] { return "100 %s"; });
    }
    const std::string line = "[sub.system:category] 100 %s";
    EXPECT_THAT(systemLog,
                ::testing::ElementsAre(std::pair(LOG_DEBUG, line), std::pair(LOG_NOTICE, line),
                                       std::pair(LOG_ERR, line)));
}

TEST(LogDeathTest, AsksForNoDebugLinesAtFirst) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");  // a process in which nobody set a level
    EXPECT_EXIT(std::_Exit(Log::isEnabled(LogLevel::Debug) || !Log::isEnabled(LogLevel::Default)),
                ::testing::ExitedWithCode(0), "");
}

// Counts lines, and notices a line that reaches it after its end.
class CountingSink final : public platform::LogSink {
  public:
    explicit CountingSink(std::atomic<int>& lines) : _lines(lines) {}
    ~CountingSink() override { _alive = false; }
    void write(const LogLine& line) override {
        _lines += _alive && line.message == "a line" ? 1 : 0;
    }

  private:
    std::atomic<int>& _lines;
    bool _alive = true;
};

TEST_F(LogTest, LosesNoLineWhenItsSinkIsReplacedMeanwhile) {
    constexpr int kThreads = 3;
    constexpr int kLinesEach = 2000;
    std::atomic<int> received = 0;
    std::atomic<int> running = kThreads;
    platform::setLogSink(std::make_shared<CountingSink>(received), LogLevel::Default);
    std::vector<std::jthread> threads;
    for (int i = 0; i < kThreads; ++i) {
        threads.emplace_back([&running] {
            const Log log("sub.system", "category");
            for (int line = 0; line < kLinesEach; ++line) {
                log.write(LogLevel::Error, [] { return "a line"; });
            }
            --running;
        });
    }
    while (running > 0) {
        platform::setLogSink(std::make_shared<CountingSink>(received), LogLevel::Default);
    }
    threads.clear();
    EXPECT_EQ(received, kThreads * kLinesEach);
}

}  // namespace
