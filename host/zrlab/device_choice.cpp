#include "host/zrlab/device_choice.h"

#include <algorithm>
#include <charconv>
#include <exception>
#include <stdexcept>
#include <string_view>

#include "devices/simulator/kind.h"
#include "host/record/problem.h"
#include "input/nearest.h"

namespace host {

namespace {

// The built-in kinds. They are listed here, and not registered by initializers of their own, because the
// linker drops an object file of a library that only an initializer would need. The first one is meant by a
// name without a kind.
constexpr devices::Kind (*kBuiltIn[])() = {simulator::kind};

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

devices::Kind kindOf(const DeviceChoice& choice) {
    const std::vector<devices::Kind> kinds = devices::kinds();
    const std::size_t length = kindLength(choice.device);
    if (length == 0) {
        return kinds.front();
    }
    const std::string name = choice.device.substr(0, length);
    std::vector<std::string> names;
    for (const devices::Kind& kind : kinds) {
        if (kind.name == name) {
            return kind;
        }
        names.push_back(kind.name);
    }
    const std::string meant = input::didYouMean(name, names);
    throw Problem(kExitUsage, "--device " + choice.device + ": unknown kind of device \"" + name +
                                  "\"" +
                                  (meant.empty() ? "; zrlab devices --kinds lists them" : meant));
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
    const std::size_t length = kindLength(choice.device);
    return length == 0 ? choice.device : choice.device.substr(length + 1);
}

devices::Device openDevice(const DeviceChoice& choice) {
    const devices::Kind kind = kindOf(choice);
    if (choice.speed.has_value() && !kind.takesSpeed) {
        throw Problem(kExitUsage, "--speed " + *choice.speed + ": devices of the kind \"" +
                                      kind.name + "\" do not take a speed");
    }
    const double speed = choice.speed.has_value() ? readSpeed(*choice.speed) : 1;
    try {
        return kind.open({.what = deviceArgument(choice), .speed = speed});
    } catch (const std::invalid_argument& problem) {
        throw Problem(kExitUsage, problem.what() + whereListed(kind, deviceArgument(choice)));
    } catch (const std::exception& problem) {
        throw Problem(kExitError, problem.what());
    }
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
