// Work in processes of its own, so that it may crash, hang or leave anything behind.
#ifndef ZR_HOST_ZRLAB_TRIAL_PROCESS_H
#define ZR_HOST_ZRLAB_TRIAL_PROCESS_H

#include <chrono>
#include <cstddef>
#include <functional>
#include <stop_token>
#include <string>

namespace host {

// How a process ended.
struct Ended {
    enum class How { Done, Crashed, Hung };

    How how = How::Done;
    std::string text;  // what the work returned; else in one line what ended the process
};

struct TrialProcesses {
    std::size_t most;            // processes at a time
    std::chrono::seconds limit;  // a process that takes longer hangs, and is killed
    std::stop_token stop;        // ends all of it early
};

// Does `count` pieces of work, each by its number from 0 in a process that is forked from this one, and calls
// `ended` on this thread as each of them ends. Returns false when it was stopped before all of them had ended.
// A process of the work prints nothing. Call while no other thread of the program holds a lock that the work
// needs. Throws std::system_error when no process or pipe can be made.
bool inProcesses(const TrialProcesses& how,
                 std::size_t count,
                 const std::function<std::string(std::size_t number)>& work,
                 const std::function<void(std::size_t number, const Ended&)>& ended);

}  // namespace host

#endif
