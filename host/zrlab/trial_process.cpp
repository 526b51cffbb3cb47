#include "host/zrlab/trial_process.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <system_error>
#include <vector>

#include <fcntl.h>
#include <poll.h>
#include <sys/wait.h>
#include <unistd.h>

#include <fmt/format.h>

#include "host/zrlab/terminal.h"

namespace host {

namespace {

using Clock = std::chrono::steady_clock;

constexpr std::chrono::milliseconds kLookForStop{100};

struct Process {
    std::size_t number;
    pid_t id;
    int pipe;  // what the work returns; at its end when the process has ended
    Clock::time_point began = Clock::now();
    std::string text = {};
};

[[noreturn]] void failed(const char* what) {
    throw std::system_error(errno, std::generic_category(), what);
}

[[noreturn]] void work(const std::function<std::string(std::size_t)>& job,
                       std::size_t number,
                       int pipe) {
    const int nowhere = open("/dev/null", O_RDWR | O_CLOEXEC);
    for (const int standard : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
        dup2(nowhere, standard);
    }
    const std::string text = job(number);
    _exit(writeWhole(pipe, text) ? 0 : 1);
}

Process start(const std::function<std::string(std::size_t)>& job, std::size_t number) {
    std::array<int, 2> ends{};
    if (pipe2(ends.data(), O_CLOEXEC) != 0) {
        failed("pipe");
    }
    const pid_t id = fork();
    if (id == 0) {
        work(job, number, ends[1]);
    }
    close(ends[1]);
    if (id < 0) {
        close(ends[0]);
        failed("fork");
    }
    return {.number = number, .id = id, .pipe = ends[0]};
}

// Reads what there is; false at the end.
bool readSome(Process& process) {
    std::array<char, 4096> buffer{};
    const ssize_t count = read(process.pipe, buffer.data(), buffer.size());
    if (count > 0) {
        process.text.append(buffer.data(), static_cast<std::size_t>(count));
    }
    return count > 0 || (count < 0 && errno == EINTR);
}

Ended end(Process& process, bool isHung) {
    if (isHung) {
        kill(process.id, SIGKILL);
    }
    close(process.pipe);
    int status = 0;
    while (waitpid(process.id, &status, 0) < 0 && errno == EINTR) {
    }
    if (isHung) {
        return {Ended::How::Hung, "did not end"};
    }
    if (WIFSIGNALED(status)) {
        return {Ended::How::Crashed, fmt::format("ended by signal {} ({})", WTERMSIG(status),
                                                 sigabbrev_np(WTERMSIG(status)))};
    }
    if (WEXITSTATUS(status) != 0) {
        return {Ended::How::Crashed, fmt::format("ended with status {}", WEXITSTATUS(status))};
    }
    return {Ended::How::Done, std::move(process.text)};
}

}  // namespace

bool inProcesses(const TrialProcesses& how,
                 std::size_t count,
                 const std::function<std::string(std::size_t number)>& work,
                 const std::function<void(std::size_t number, const Ended&)>& ended) {
    std::vector<Process> running;
    std::vector<pollfd> waited;
    std::size_t next = 0;
    while (!how.stop.stop_requested() && (next < count || !running.empty())) {
        while (next < count && running.size() < how.most) {
            running.push_back(start(work, next++));
        }
        waited.clear();
        for (const Process& process : running) {
            waited.push_back({.fd = process.pipe, .events = POLLIN, .revents = 0});
        }
        poll(waited.data(), waited.size(), static_cast<int>(kLookForStop.count()));
        std::vector<Process> left;
        for (std::size_t at = 0; at < running.size(); ++at) {
            Process& process = running[at];
            const bool goesOn = waited[at].revents == 0 || readSome(process);
            const bool isHung = goesOn && Clock::now() - process.began > how.limit;
            if (goesOn && !isHung) {
                left.push_back(std::move(process));
            } else {
                ended(process.number, end(process, isHung));
            }
        }
        running = std::move(left);
    }
    for (Process& process : running) {
        end(process, true);
    }
    return next == count && running.empty();
}

}  // namespace host
