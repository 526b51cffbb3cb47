#include "host/zrlab/interrupt.h"

#include <csignal>

#include <sys/wait.h>
#include <unistd.h>

#include <gtest/gtest.h>

namespace {

// The signals are blocked in the program's threads, but a process that it starts must be stoppable.
TEST(InterruptDeathTest, AChildProcessGetsTheSignals) {
    const auto signalThatEndsAChild = [] {
        host::interrupt::watch();
        const pid_t child = fork();
        if (child == 0) {
            raise(SIGTERM);
            _exit(0);
        }
        int status = 0;
        waitpid(child, &status, 0);
        _exit(WIFSIGNALED(status) ? WTERMSIG(status) : 0);
    };
    EXPECT_EXIT(signalThatEndsAChild(), testing::ExitedWithCode(SIGTERM), "");
}

}  // namespace
