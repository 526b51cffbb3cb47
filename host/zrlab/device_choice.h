// Choosing the device that a session runs on, among the kinds that are built in and those that device
// modules register.
#ifndef ZR_HOST_ZRLAB_DEVICE_CHOICE_H
#define ZR_HOST_ZRLAB_DEVICE_CHOICE_H

#include <optional>
#include <string>
#include <vector>

#include "devices/device.h"

namespace host {

// What the command line says about the device.
struct DeviceChoice {
    // KIND:WHAT. Without a kind it is the simulator's: a name of its gallery or a file.
    std::string device = "healthy";
    std::optional<std::string> speed;  // a factor from 0.001 to 100, or "max"; 1 when not given
    std::vector<std::string> modules;  // files of device modules, loaded in this order
};

// Registers the kinds that are built in. Call it once, before any module is loaded: the first kind is the
// one that needs no name.
void registerBuiltInKinds();

// Loads device modules, in this order. Throws a Problem (kExitUsage) about one that cannot be used.
void loadDeviceModules(const std::vector<std::string>& files);

// What the device is opened with: the part of `device` behind its kind. It may be the name of a file.
std::string deviceArgument(const DeviceChoice& choice);

// The name of its kind; empty when `device` names none.
std::string deviceKind(const DeviceChoice& choice);

// Opens the device. Throws a Problem: kExitUsage about an unknown kind or device, or a speed that is
// wrong or that the kind does not take; kExitError about a device that fails.
devices::Device openDevice(const DeviceChoice& choice);

// Whether its devices can run faster or slower than real time. Throws a Problem as openDevice() does.
bool takesSpeed(const DeviceChoice& choice);

// What the device can deliver wrongly, as its kind says; nothing when the kind has no such faults. Each is opened
// at speedOf(choice). Throws a Problem as openDevice() does.
std::vector<devices::DataFault> dataFaults(const DeviceChoice& choice);

// The speed that the choice asks for, in simulated seconds per real second.
double speedOf(const DeviceChoice& choice);

// The description of a device, as its kind shows it. Throws a Problem as openDevice() does, and kExitUsage
// when the kind does not show its devices.
std::string showDevice(const std::string& device);

// What is found about a description of a device. Throws a Problem (kExitUsage) about an unknown kind, and about one
// that has no descriptions.
devices::Findings checkDevice(const std::string& device);

// The devices that the registered kinds list, by kind. The simulator's, which come first, go without
// their kind.
std::vector<devices::Entry> listDevices();

}  // namespace host

#endif
