// What a device is to the bench, and the registry of the kinds of devices.
//
// A kind makes devices that stand behind the interfaces of platform/: the simulator makes one from a
// profile, a port's kind opens the hardware. The program registers the kinds that are built in; a device
// module, a port's shared object, registers its own from an initializer:
//
//     [[gnu::constructor]] void registerKind() {
//         devices::registerKind({.name = "bench-board", .summary = "...", .open = openBoard});
//     }
//
// A module is built with the compiler and the standard library of the program.
#ifndef ZR_DEVICES_DEVICE_H
#define ZR_DEVICES_DEVICE_H

#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/services.h"

namespace devices {

// The version of this header. It rises with every change after which a module must be built again.
inline constexpr int kInterfaceVersion = 4;

// A device, ready to run on. It lives as long as one of its services, streams or sensors is held.
struct Device {
    std::string name;     // under which reports know it
    std::string summary;  // one line

    // What the device says of itself, each fact a name and a text of one line: its platform, a serial
    // number, a firmware version. Reports show them in this order. "platform" is the one name with a
    // meaning: what kind of system stands behind the services.
    std::vector<std::pair<std::string, std::string>> facts = {};

    // What the bench installs; a service that is null counts as not available.
    platform::Services services = {};

    // How many calls so far the device had no answer for, as when it replays a recording that lacks them. Empty
    // for a device that answers every call. Any thread.
    std::function<std::uint64_t()> unanswered = {};
};

// Which device is asked for.
struct Request {
    std::string what;  // what was given after "KIND:"; may be empty
    double speed = 1;  // simulated seconds per real second, 0.001 to 100; 1 for a kind without
};

// A device that can be asked for by name.
struct Entry {
    std::string name;
    std::string summary;  // one line
};

// Something wrong that a device can deliver while each call to it succeeds: a counter that rises, a frame without
// metadata. A campaign (zrlab campaign) runs the diagnostics on one after the other.
struct DataFault {
    std::string group;    // of what it is a fault: "frame metadata"
    std::string kind;     // what is wrong: "missing in every frame"
    std::string subject;  // with what: "HardwareEvents"; the three together are unique
    // The service that shows it, by its name in platform::Services; empty when several do.
    std::string service;
    // A new device that has this fault and no other; throws as Kind::open() does.
    std::function<Device(double speed)> open = {};
};

// What checking the description of a device finds.
struct Findings {
    // What is wrong with the description, one line for each problem that names the culprit; none when open() can
    // make the device that it describes.
    std::vector<std::string> problems = {};
    // What it stands for on this machine, one line each. Empty for a device that is made of its description alone.
    std::vector<std::string> lines = {};
    // How many of the described things this machine does not have, or does not let us use.
    std::size_t missing = 0;
};

struct Kind {
    std::string name;     // lower-case letters, digits and hyphens, from a letter
    std::string summary;  // one line

    bool takesSpeed = false;  // its devices can run faster or slower than real time
    bool hasFaults = false;   // its devices can be configured to fail

    // The devices that can be named; empty when none are known before they are opened. Called, like
    // open(), on the program's main thread.
    std::function<std::vector<Entry>()> list = {};

    // The device that is asked for. When it cannot be opened, throws an exception derived from
    // std::exception, whose text is one line that names the culprit: std::invalid_argument when it was
    // asked for wrongly (no such device, a description that cannot be read), another one when the device
    // itself fails.
    std::function<Device(const Request&)> open = {};

    // The description of the device that is asked for by Request::what: text that ends with a line end, in a
    // form of the kind's own. Kept in a file, it describes the same device to the kind. Empty when devices of
    // the kind have no such form. Throws as open() does.
    std::function<std::string(const std::string& what)> show = {};

    // Checks a description, and what it describes. Empty when devices of the kind have no descriptions.
    std::function<Findings(const std::string& what)> check = {};

    // What the device that is asked for by Request::what can deliver wrongly, the faults of a group one after the
    // other; the same faults in the same order each time. Empty when devices of the kind cannot be made to.
    // Throws as open() does.
    std::function<std::vector<DataFault>(const std::string& what)> dataFaults = {};
};

namespace detail {
void registerKind(int interfaceVersion, const Kind& kind);
}  // namespace detail

// Adds a kind to the registry, for good. A name that is taken or not well formed, a kind that cannot
// open anything and a caller built for another version of this header are refused; the refusal is
// remembered. Any thread.
inline void registerKind(const Kind& kind) {
    // The version is the caller's, and it is compared before `kind` is looked at.
    detail::registerKind(kInterfaceVersion, kind);
}

// The registered kinds in the order of registration. Any thread.
std::vector<Kind> kinds();

// Why registrations were refused, one line each, in their order. Any thread.
std::vector<std::string> refusals();

// Loads a device module. Throws a std::runtime_error, whose text is one line that names the file, when
// it cannot be loaded (platform/module.h says why), when one of its kinds was refused and when it registers
// none. A file that was loaded before does nothing. One thread at a time.
void loadDeviceModule(const std::string& path);

}  // namespace devices

#endif
