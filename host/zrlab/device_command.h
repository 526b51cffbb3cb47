// zrlab device: what a device is made of, shown and checked.
#ifndef ZR_HOST_ZRLAB_DEVICE_COMMAND_H
#define ZR_HOST_ZRLAB_DEVICE_COMMAND_H

#include <string>
#include <vector>

namespace host {

// What is printed, and the exit status of the program.
struct DeviceAnswer {
    std::string text;
    int status;
};

// "show" gives the description of the one device; "check" says of each description that it is valid, or what
// is wrong with it: kExitUsage when one is not; and what it stands for on this machine, if its kind knows: kExitFailed
// when some of it is not there. Throws a Problem (kExitUsage) when more than one device is to
// be shown, and as showDevice() and checkDevice() do.
DeviceAnswer deviceCommand(const std::string& action, const std::vector<std::string>& devices);

}  // namespace host

#endif
