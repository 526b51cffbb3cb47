#include "host/zrlab/trial_process.h"

#include <atomic>
#include <csignal>
#include <cstdlib>
#include <map>
#include <string>

#include <unistd.h>

#include <gmock/gmock.h>

namespace {

using host::Ended;
using testing::HasSubstr;

[[noreturn]] void hang() {
    while (true) {
        pause();
    }
}

TEST(TrialProcess, SaysHowEachPieceOfWorkEnded) {
    const std::string large(1'000'000, 'x');  // more than a pipe holds
    std::map<std::size_t, Ended> seen;
    const auto work = [&](std::size_t number) -> std::string {
        switch (number) {
            case 0:
                return large;
            case 1:
                std::raise(SIGKILL);
                break;
            case 2:
                _exit(7);
            case 3:
                hang();
            default:
                break;
        }
        return std::to_string(number);
    };
    EXPECT_TRUE(host::inProcesses({.most = 3, .limit = std::chrono::seconds(2), .stop = {}}, 20,
                                  work, [&](std::size_t number, const Ended& ended) {
                                      EXPECT_TRUE(seen.emplace(number, ended).second) << number;
                                  }));
    ASSERT_EQ(seen.size(), 20);
    EXPECT_EQ(seen[0].text, large);
    EXPECT_EQ(seen[1].how, Ended::How::Crashed);
    EXPECT_THAT(seen[1].text, HasSubstr("KILL"));
    EXPECT_EQ(seen[2].how, Ended::How::Crashed);
    EXPECT_THAT(seen[2].text, HasSubstr("status 7"));
    EXPECT_EQ(seen[3].how, Ended::How::Hung);
    EXPECT_EQ(seen[19].text, "19");
}

TEST(TrialProcess, StopsWithoutWaitingForWhatRuns) {
    std::stop_source stop;
    int ended = 0;
    EXPECT_FALSE(host::inProcesses(
        {.most = 2, .limit = std::chrono::hours(1), .stop = stop.get_token()}, 100,
        [](std::size_t number) -> std::string {
            if (number != 0) {
                hang();
            }
            return "";
        },
        [&](std::size_t, const Ended&) {
            ++ended;
            stop.request_stop();
        }));
    EXPECT_EQ(ended, 1);
}

}  // namespace
