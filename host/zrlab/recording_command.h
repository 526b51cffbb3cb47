// zrlab recording: what is in the recording of a device, and the device profile that it gives.
#ifndef ZR_HOST_ZRLAB_RECORDING_COMMAND_H
#define ZR_HOST_ZRLAB_RECORDING_COMMAND_H

#include <string>

namespace host {

// "show" says what is in the recording of that file; "profile" gives a profile of a simulated device that does what
// was recorded. Throws a Problem (kExitUsage) when the file is not a recording that can be used.
std::string recordingCommand(const std::string& action, const std::string& file);

}  // namespace host

#endif
