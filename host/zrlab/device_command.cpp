#include "host/zrlab/device_command.h"

#include <algorithm>
#include <memory>

#include "host/record/problem.h"
#include "host/zrlab/device_choice.h"
#include "host/zrlab/terminal.h"
#include "platform/log.h"

namespace host {

namespace {

// What a device logs while it is checked is part of the answer.
class ShownLog final : public platform::LogSink {
  public:
    void write(const platform::LogLine& line) override {
        Terminal::shared().complain(line.message);
    }
};

}  // namespace

DeviceAnswer deviceCommand(const std::string& action, const std::vector<std::string>& devices) {
    if (action == "show") {
        if (devices.size() > 1) {
            throw Problem(kExitUsage, "device: show takes one device");
        }
        return {showDevice(devices.front()), kExitPassed};
    }
    platform::setLogSink(std::make_shared<ShownLog>(), platform::LogLevel::Error);
    DeviceAnswer answer = {"", kExitPassed};
    for (const std::string& device : devices) {
        const devices::Findings findings = checkDevice(device);
        for (const auto* lines : {&findings.problems, &findings.lines}) {
            for (const std::string& line : *lines) {
                answer.text += line + "\n";
            }
        }
        if (!findings.problems.empty()) {
            answer.status = kExitUsage;
        } else if (findings.missing > 0) {
            answer.status = std::max(answer.status, kExitFailed);
        } else {
            answer.text += device + ": valid\n";
        }
    }
    return answer;
}

}  // namespace host
