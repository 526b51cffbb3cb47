#include "tests/program/program.h"

#include <algorithm>
#include <csignal>
#include <map>
#include <stdexcept>
#include <string_view>

#include <fcntl.h>
#include <poll.h>
#include <sys/wait.h>
#include <unistd.h>

namespace test {

namespace {

std::vector<std::string> environmentWith(const std::vector<std::string>& variables) {
    std::map<std::string, std::string> entries;  // by name
    const auto add = [&entries](const std::string& variable) {
        entries[variable.substr(0, variable.find('='))] = variable;
    };
    for (char** at = environ; *at != nullptr; ++at) {
        if (!std::string_view(*at).starts_with("ZRLAB_")) {
            add(*at);
        }
    }
    for (const char* none : {"ZRLAB_STATION_FILE=", "ZRLAB_USER_FILE=", "ZRLAB_SYSTEM_FILE="}) {
        add(none);
    }
    std::for_each(variables.begin(), variables.end(), add);
    std::vector<std::string> environment;
    for (const auto& [name, variable] : entries) {
        environment.push_back(variable);
    }
    return environment;
}

// For exec(): pointers into the texts, and a null at the end.
std::vector<char*> pointersTo(const std::vector<std::string>& texts) {
    std::vector<char*> pointers;
    for (const std::string& text : texts) {
        pointers.push_back(const_cast<char*>(text.c_str()));
    }
    pointers.push_back(nullptr);
    return pointers;
}

}  // namespace

Program::Program(const std::vector<std::string>& arguments,
                 const std::vector<std::string>& variables) {
    int output[2];
    int errors[2];
    if (pipe2(output, O_CLOEXEC) != 0 || pipe2(errors, O_CLOEXEC) != 0) {
        throw std::runtime_error("no pipe");
    }
    const std::vector<char*> argv = pointersTo(arguments);
    const std::vector<std::string> environment = environmentWith(variables);
    const std::vector<char*> envp = pointersTo(environment);
    _process = fork();
    if (_process == 0) {
        dup2(output[1], STDOUT_FILENO);
        dup2(errors[1], STDERR_FILENO);
        execve(argv[0], argv.data(), envp.data());
        _exit(127);
    }
    close(output[1]);
    close(errors[1]);
    _outputPipe = output[0];
    _errorPipe = errors[0];
}

Program::~Program() {
    if (_process > 0) {
        kill(_process, SIGKILL);
        finish();
    }
}

bool Program::_read() {
    pollfd files[] = {{_outputPipe, POLLIN, 0}, {_errorPipe, POLLIN, 0}};
    if ((_outputPipe < 0 && _errorPipe < 0) || poll(files, 2, -1) < 0) {
        return false;
    }
    const auto take = [](const pollfd& file, int& pipe, std::string& text) {
        if (file.revents == 0) {
            return;
        }
        char buffer[4096];
        const ssize_t count = read(pipe, buffer, sizeof buffer);
        if (count > 0) {
            text.append(buffer, static_cast<std::size_t>(count));
        } else {
            close(pipe);
            pipe = -1;  // poll() passes over it
        }
    };
    take(files[0], _outputPipe, _outcome.output);
    take(files[1], _errorPipe, _outcome.errors);
    return true;
}

bool Program::waitForError(const std::string& text) {
    while (_outcome.errors.find(text) == std::string::npos) {
        if (!_read()) {
            return false;
        }
    }
    return true;
}

void Program::signal(int number) const {
    kill(_process, number);
}

Outcome Program::finish() {
    while (_read()) {
    }
    int status = 0;
    waitpid(_process, &status, 0);
    _process = -1;
    _outcome.status = WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
    return _outcome;
}

}  // namespace test
