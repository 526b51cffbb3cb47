#include "host/zrlab/device_command.h"

#include "host/record/problem.h"
#include "host/zrlab/device_choice.h"

namespace host {

DeviceAnswer deviceCommand(const std::string& action, const std::vector<std::string>& devices) {
    if (action == "show") {
        if (devices.size() > 1) {
            throw Problem(kExitUsage, "device: show takes one device");
        }
        return {showDevice(devices.front()), kExitPassed};
    }
    DeviceAnswer answer = {"", kExitPassed};
    for (const std::string& device : devices) {
        const std::vector<std::string> problems = checkDevice(device);
        for (const std::string& problem : problems) {
            answer.text += problem + "\n";
            answer.status = kExitUsage;
        }
        answer.text += problems.empty() ? device + ": a valid profile\n" : "";
    }
    return answer;
}

}  // namespace host
