// What one call of `zrlab run` was asked for.
#ifndef ZR_HOST_ZRLAB_SESSION_OPTIONS_H
#define ZR_HOST_ZRLAB_SESSION_OPTIONS_H

#include <cstdint>
#include <string>
#include <vector>

#include "host/zrlab/device_choice.h"
#include "host/zrlab/terminal.h"

namespace host {

struct SessionOptions {
    std::vector<std::string> names;     // what to run, in this order
    std::vector<std::string> settings;  // PARAM=VALUE
    DeviceChoice device;
    std::string format = "text";  // name of a report form for standard output
    std::string output;           // the file that gets the format; empty or "-" for standard output
    std::vector<std::string> reports;  // further files, their form by their ending
    std::string limits;                // the file of the bench's limits; empty when there is none
    std::string frames;                // the file of the frames' table; empty when there is none
    std::string images;                // the file of the images' table; empty when there is none
    std::uint64_t repeat = 0;          // how often; 0 when not asked for
    bool untilFail = false;            // stop at the first run that does not pass
    bool verbose = false;
    Colour colour = Colour::Automatic;
    std::string logLevel = "default";  // debug, default, error or off
    std::string version;               // of the program
    std::string commandLine;           // as given, for the record
};

}  // namespace host

#endif
