// zrlab store: the store of runs, and the runs that wait for it.
#ifndef ZR_HOST_ZRLAB_STORE_COMMAND_H
#define ZR_HOST_ZRLAB_STORE_COMMAND_H

#include <string>
#include <vector>

namespace host {

// What is printed, the problems, and the exit status of the program.
struct StoreAnswer {
    std::string text;
    std::vector<std::string> problems;
    int status;
};

// Throws a Problem (kExitUsage) that says where a store can be named when `where` is empty.
void requireNamedStore(const std::string& command, const std::string& where);

// "show" tells of the store at `where` what it is, how many runs it has, and how many wait for it where. "sync"
// writes the runs that wait to it: kExitError when one still waits or was set aside. Throws a Problem: kExitUsage
// when `where` is empty, and as Store does; kExitError when the store does not work.
StoreAnswer storeCommand(const std::string& action, const std::string& where);

}  // namespace host

#endif
