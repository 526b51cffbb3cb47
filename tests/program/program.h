// Runs a program and collects what it does.
#ifndef ZR_TESTS_PROGRAM_PROGRAM_H
#define ZR_TESTS_PROGRAM_PROGRAM_H

#include <string>
#include <vector>

#include <sys/types.h>

namespace test {

struct Outcome {
    int status = -1;  // the exit status; minus the signal's number when one ended the program
    std::string output;
    std::string errors;
};

// A program that runs, its standard output and standard error going to pipes.
class Program {
  public:
    // Its environment is this process's without settings of the program (ZRLAB_…), which would change what
    // it does on a machine where somebody has some, and with `variables`: "NAME=VALUE".
    explicit Program(const std::vector<std::string>& arguments,
                     const std::vector<std::string>& variables = {});
    ~Program();
    Program(const Program&) = delete;
    Program& operator=(const Program&) = delete;

    // Waits until standard error holds `text`, or the program ends.
    bool waitForError(const std::string& text);
    void signal(int number) const;
    // Waits for the end.
    Outcome finish();

  private:
    bool _read();

    pid_t _process = -1;
    int _outputPipe = -1;
    int _errorPipe = -1;
    Outcome _outcome;
};

inline Outcome runProgram(const std::vector<std::string>& arguments,
                          const std::vector<std::string>& variables = {}) {
    return Program(arguments, variables).finish();
}

// zrlab, as it was built.
inline Outcome zrlab(std::vector<std::string> arguments,
                     const std::vector<std::string>& variables = {}) {
    arguments.insert(arguments.begin(), ZR_PROGRAM);
    return runProgram(arguments, variables);
}

}  // namespace test

#endif
