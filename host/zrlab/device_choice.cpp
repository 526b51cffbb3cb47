#include "host/zrlab/device_choice.h"

#include <algorithm>
#include <charconv>
#include <exception>
#include <stdexcept>
#include <string_view>

#include "devices/linux/kind.h"
#include "devices/recording/kind.h"
#include "devices/simulator/kind.h"
#include "host/record/problem.h"
#include "input/nearest.h"

namespace host {

namespace {

// The built-in kinds. They are listed here, and not registered by initializers of their own, because the
// linker drops an object file of a library that only an initializer would need. The first one is meant by a
// name without a kind.
constexpr devices::Kind (*kBuiltIn[])() = {simulator::kind, linux_device::kind, recording::kind};

// Any faster, frames could outrun their validation and results would depend on the machine's load.
constexpr double kLeastSpeed = 0.001;
constexpr double kMaxSpeed = 100;

double readSpeed(const std::string& text) {
    if (text == "max") {
        return kMaxSpeed;
    }
    double speed = 0;
    const auto [end, problem] = std::from_chars(text.data(), text.data() + text.size(), speed);
    const bool isWhole = problem == std::errc() && end == text.data() + text.size();
    if (!isWhole || !(speed >= kLeastSpeed && speed <= kMaxSpeed)) {
        throw Problem(kExitUsage,
                      "--speed " + text + ": neither \"max\" nor a factor from 0.001 to 100");
    }
    return speed;
}

// The length of the kind's name that `device` begins with; 0 when there is none. A file's name can have a
// colon too; it is unlikely to have one after such a word.
std::size_t kindLength(std::string_view device) {
    const std::size_t length = device.find_first_not_of("abcdefghijklmnopqrstuvwxyz0123456789-");
    return length != std::string_view::npos && device[length] == ':' ? length : 0;
}

// `option` is what comes before the device on the command line.
devices::Kind kindOf(const std::string& device, const std::string& option = "") {
    const std::vector<devices::Kind> kinds = devices::kinds();
    const std::size_t length = kindLength(device);
    if (length == 0) {
        return kinds.front();
    }
    const std::string name = device.substr(0, length);
    std::vector<std::string> names;
    for (const devices::Kind& kind : kinds) {
        if (kind.name == name) {
            return kind;
        }
        names.push_back(kind.name);
    }
    const std::string meant = input::didYouMean(name, names);
    throw Problem(kExitUsage, option + device + ": unknown kind of device \"" + name + "\"" +
                                  (meant.empty() ? "; zrlab devices --kinds lists them" : meant));
}

// What the device is asked for by: the part behind its kind.
std::string argumentOf(const std::string& device) {
    const std::size_t length = kindLength(device);
    return length == 0 ? device : device.substr(length + 1);
}

// Where to look for a device's name, unless one is near enough to have been suggested or a file was meant.
std::string whereListed(const devices::Kind& kind, const std::string& name) {
    std::vector<std::string> names;
    if (kind.list && name.find_first_of("/.") == std::string::npos) {
        for (const devices::Entry& entry : kind.list()) {
            names.push_back(entry.name);
        }
    }
    return !names.empty() && input::nearest(name, names).empty() ? "; zrlab devices lists them"
                                                                 : "";
}

// The answer of a kind; what it throws instead becomes a Problem.
template <class Ask>
auto answer(const devices::Kind& kind, const std::string& what, const Ask& ask) {
    try {
        return ask();
    } catch (const std::invalid_argument& problem) {
        throw Problem(kExitUsage, problem.what() + whereListed(kind, what));
    } catch (const std::exception& problem) {
        throw Problem(kExitError, problem.what());
    }
}

// An operation that a kind need not have; `done` is what cannot be done without it.
template <class Operation>
const Operation& require(const Operation& operation,
                         const devices::Kind& kind,
                         const std::string& device,
                         const std::string& done) {
    if (!operation) {
        throw Problem(kExitUsage,
                      device + ": devices of the kind \"" + kind.name + "\" cannot be " + done);
    }
    return operation;
}

}  // namespace

void registerBuiltInKinds() {
    for (const auto& kind : kBuiltIn) {
        devices::registerKind(kind());
    }
}

void loadDeviceModules(const std::vector<std::string>& files) {
    for (const std::string& file : files) {
        try {
            devices::loadDeviceModule(file);
        } catch (const std::exception& problem) {
            throw Problem(kExitUsage, problem.what());
        }
    }
}

std::string deviceArgument(const DeviceChoice& choice) {
    return argumentOf(choice.device);
}

std::string deviceKind(const DeviceChoice& choice) {
    return choice.device.substr(0, kindLength(choice.device));
}

devices::Device openDevice(const DeviceChoice& choice) {
    const devices::Kind kind = kindOf(choice.device, "--device ");
    if (choice.speed.has_value() && !kind.takesSpeed) {
        throw Problem(kExitUsage, "--speed " + *choice.speed + ": devices of the kind \"" +
                                      kind.name + "\" do not take a speed");
    }
    const std::string what = argumentOf(choice.device);
    const double speed = speedOf(choice);
    return answer(kind, what, [&] { return kind.open({.what = what, .speed = speed}); });
}

bool takesSpeed(const DeviceChoice& choice) {
    return kindOf(choice.device, "--device ").takesSpeed;
}

double speedOf(const DeviceChoice& choice) {
    return choice.speed.has_value() ? readSpeed(*choice.speed) : 1;
}

std::vector<devices::DataFault> dataFaults(const DeviceChoice& choice) {
    const devices::Kind kind = kindOf(choice.device, "--device ");
    const std::string what = argumentOf(choice.device);
    return kind.dataFaults ? answer(kind, what, [&] { return kind.dataFaults(what); })
                           : std::vector<devices::DataFault>();
}

std::string showDevice(const std::string& device) {
    const devices::Kind kind = kindOf(device);
    const auto& show = require(kind.show, kind, device, "shown");
    const std::string what = argumentOf(device);
    return answer(kind, what, [&] { return show(what); });
}

devices::Findings checkDevice(const std::string& device) {
    const devices::Kind kind = kindOf(device);
    return require(kind.check, kind, device, "checked")(argumentOf(device));
}

std::vector<devices::Entry> listDevices() {
    std::vector<devices::Entry> listed;
    bool isFirst = true;
    for (const devices::Kind& kind : devices::kinds()) {
        const std::string prefix = isFirst ? "" : kind.name + ":";
        isFirst = false;
        if (kind.list) {
            for (const devices::Entry& entry : kind.list()) {
                listed.push_back({prefix + entry.name, entry.summary});
            }
        }
    }
    return listed;
}

}  // namespace host
