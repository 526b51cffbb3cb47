// How a guest's device is told what to do: each argument and each line of standard input is a command, a word and a
// number, such as "light 2". The number is 1 unless given.
#ifndef ZR_TESTS_VIRTUAL_MACHINE_COMMANDS_H
#define ZR_TESTS_VIRTUAL_MACHINE_COMMANDS_H

#include <cstdio>
#include <cstdlib>
#include <functional>
#include <iostream>
#include <map>
#include <sstream>
#include <string>

namespace guest {

using Commands = std::map<std::string, std::function<void(int number)>>;

inline void obey(const Commands& commands, const std::string& line) {
    std::istringstream words(line);
    std::string word;
    int number = 1;
    words >> word >> number;
    const auto command = commands.find(word);
    if (command == commands.end()) {
        std::fprintf(stderr, "no command \"%s\"\n", word.c_str());
        std::exit(64);
    }
    command->second(words.fail() && !words.eof() ? 1 : number);
    std::printf("%s\n", line.c_str());
    std::fflush(stdout);
}

// Obeys the arguments, then calls `begin`, then obeys standard input until its end.
inline void obeyAll(const Commands& commands,
                    int argc,
                    char** argv,
                    const std::function<void()>& begin) {
    for (int at = 1; at < argc; ++at) {
        obey(commands, argv[at]);
    }
    begin();
    for (std::string line; std::getline(std::cin, line);) {
        obey(commands, line);
    }
}

}  // namespace guest

#endif
