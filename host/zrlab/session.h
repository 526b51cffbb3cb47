// A session: one call of `zrlab run`, from its options to its reports.
#ifndef ZR_HOST_ZRLAB_SESSION_H
#define ZR_HOST_ZRLAB_SESSION_H

#include <cstdint>
#include <string>
#include <vector>

#include "host/zrlab/terminal.h"
#include "platform/log.h"

namespace host {

struct SessionOptions {
    std::vector<std::string> names;     // what to run, in this order
    std::vector<std::string> settings;  // PARAM=VALUE
    std::string device = "healthy";     // a name of the gallery, or a file
    std::string speed = "1";            // device seconds a second, 0.001 to 100, or "max"
    std::string format = "text";        // text, json, jsonl or junit
    std::string output;                 // the file that gets the format; empty for standard output
    std::vector<std::string> reports;   // further files, their form told by their ending
    std::uint64_t repeat = 0;           // how often; 0 when not asked for
    bool untilFail = false;             // stop at the first run that does not pass
    bool verbose = false;
    Colour colour = Colour::Automatic;
    std::string logLevel = "default";  // debug, default, error or off
    std::string version;               // of the program
    std::string commandLine;           // as given, for the record
};

// Exit statuses of the program.
inline constexpr int kExitPassed = 0;  // every verdict passed, or an experiment ran
inline constexpr int kExitFailed = 1;  // a verdict failed
inline constexpr int kExitError = 2;   // something could not be run to its end
inline constexpr int kExitUsage = 64;  // the command line is wrong (EX_USAGE of sysexits.h)

// Runs the session with the loaded modules and returns the exit status. A problem is told in one
// line on standard error; what cannot work (a name, a parameter, a profile, a file that cannot be
// written) is told before anything runs.
int runSession(const SessionOptions& options);

}  // namespace host

#endif
