// What one call of `zrlab run` was asked for.
#ifndef ZR_HOST_ZRLAB_SESSION_OPTIONS_H
#define ZR_HOST_ZRLAB_SESSION_OPTIONS_H

#include <cstdint>
#include <string>
#include <vector>

#include "host/record/identity.h"
#include "host/zrlab/device_choice.h"
#include "host/zrlab/terminal.h"

namespace host {

struct SessionOptions {
    std::vector<std::string> names;     // what to run, in this order
    std::vector<std::string> settings;  // PARAM=VALUE
    DeviceChoice device;
    std::string format = "text";  // name of a report form for standard output
    // The file that gets the format, and further files, their form by their ending; both with placeholders,
    // see file_template.h. Without an output, or with "-", the format goes to standard output.
    std::string output;
    std::vector<std::string> reports;
    std::string limits;  // the file of the bench's limits; empty when there is none
    // The files of the frames' and of the images' table, with placeholders; empty when there is none.
    std::string frames;
    std::string images;
    std::string record;  // the file of the recording, with placeholders; empty when there is none
    std::string store;   // where runs are stored, see Store; empty when they are not
    bool storeFrames = false;  // with a run's frames, and with its images
    bool storeImages = false;
    std::uint64_t repeat = 0;  // how often; 0 when not asked for
    bool untilFail = false;    // stop at the first run that does not pass
    bool verbose = false;
    Colour colour = Colour::Automatic;
    std::string logLevel = "default";  // debug, default, error or off
    Identity identity;                 // of the unit, and of the place
    std::string version;               // of the program
    std::string commandLine;           // as given, passwords masked, for the record
};

}  // namespace host

#endif
