// zr_spend FILE COMMAND ARGUMENT...: runs the command, writes to FILE what it used as a line of JSON, and
// ends with its status. A program of its own because the peak memory that the system reports for a process
// is at least that of the process which started it.
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstring>

#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

namespace {

double seconds(const timeval& time) {
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) * 1e-6;
}

int fail(const char* what) {
    std::fprintf(stderr, "zr_spend: %s: %s\n", what, std::strerror(errno));
    return 126;
}

}  // namespace

int main(int count, char** arguments) {
    if (count < 3) {
        std::fprintf(stderr, "usage: zr_spend FILE COMMAND ARGUMENT...\n");
        return 64;
    }
    std::FILE* file = std::fopen(arguments[1], "w");
    if (file == nullptr) {
        return fail(arguments[1]);
    }
    const auto start = std::chrono::steady_clock::now();
    const pid_t child = fork();
    if (child == 0) {
        execvp(arguments[2], arguments + 2);
        _exit(fail(arguments[2]));
    }
    int status = 0;
    rusage used{};
    if (child < 0 || wait4(child, &status, 0, &used) < 0) {
        return fail(arguments[2]);
    }
    const std::chrono::duration<double> took = std::chrono::steady_clock::now() - start;
    std::fprintf(file,
                 "{\"seconds\": %.6f, \"cpu\": %.6f, \"switches\": %ld, \"megabytes\": %.3f}\n",
                 took.count(), seconds(used.ru_utime) + seconds(used.ru_stime),
                 used.ru_nvcsw + used.ru_nivcsw, static_cast<double>(used.ru_maxrss) / 1024);
    if (std::fclose(file) != 0) {
        return fail(arguments[1]);
    }
    return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}
