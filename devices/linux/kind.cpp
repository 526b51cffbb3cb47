#include "devices/linux/kind.h"

#include <memory>
#include <optional>
#include <stdexcept>
#include <utility>
#include <variant>
#include <vector>

#include <sys/utsname.h>

#include "devices/linux/capture_service.h"
#include "devices/linux/check.h"
#include "devices/linux/counters.h"
#include "devices/linux/description.h"
#include "devices/linux/display.h"
#include "devices/linux/hid_sensor.h"

namespace linux_device {

namespace {

std::string systemName() {
    utsname system{};
    return uname(&system) == 0
               ? std::string(system.sysname) + " " + system.release + " " + system.machine
               : "Linux";
}

// What the description makes constant: reports show it, so that nobody takes it for something measured.
class ConstantFacts {
  public:
    explicit ConstantFacts(const Description& description) {
        for (const StreamDescription& stream : description.capture.value_or(Streams())) {
            _addAll(stream.metadata, _metadata);
            _addAll(stream.errorCounters, _errorCounters);
            for (const PropertyTarget& property : stream.properties) {
                if (std::holds_alternative<Accepted>(property.target)) {
                    _add(_accepted, property.name);
                }
            }
        }
        for (const CounterChannel& channel : description.counters.value_or(Channels())) {
            _addConstant(_counters, channel.count);
        }
    }

    void appendTo(std::vector<std::pair<std::string, std::string>>& facts) const {
        const std::pair<const char*, const std::string&> lists[] = {
            {"constant metadata", _metadata},
            {"constant error counters", _errorCounters},
            {"constant event counters", _counters},
            {"properties without effect", _accepted}};
        for (const auto& [name, list] : lists) {
            if (!list.empty()) {
                facts.emplace_back(name, list);
            }
        }
    }

  private:
    using Streams = std::vector<StreamDescription>;
    using Channels = std::vector<CounterChannel>;

    static void _add(std::string& list, const std::string& entry) {
        list += (list.empty() ? "" : ", ") + entry;
    }
    static void _addConstant(std::string& list, const NumberSource& number) {
        if (const auto* constant = std::get_if<Constant>(&number.source)) {
            _add(list, number.key + " " + number.conversion.apply(constant->value).text());
        }
    }
    static void _addAll(const std::vector<NumberSource>& numbers, std::string& list) {
        for (const NumberSource& number : numbers) {
            _addConstant(list, number);
        }
    }

    std::string _metadata;
    std::string _errorCounters;
    std::string _counters;
    std::string _accepted;
};

Description describedBy(const std::string& path) {
    if (path.empty()) {
        throw std::invalid_argument("linux: name the file of a port description: linux:FILE.json");
    }
    std::vector<std::string> problems;
    std::optional<Description> description = readDescription(path, problems);
    if (!description.has_value()) {
        throw std::invalid_argument(problems.front());
    }
    return *std::move(description);
}

devices::Findings check(const std::string& path) {
    devices::Findings findings;
    const std::optional<Description> description = readDescription(path, findings.problems);
    return description.has_value() ? checkMachine(*description, Machine()) : findings;
}

}  // namespace

devices::Device openDevice(const std::string& path, const Machine& machine) {
    const Description description = describedBy(path);
    const auto starts = std::make_shared<StreamStarts>(0);
    devices::Device device{.name = path,
                           .summary = description.summary,
                           .facts = {{"platform", systemName()}, {"description", path}}};
    ConstantFacts(description).appendTo(device.facts);
    if (description.capture.has_value()) {
        device.services.capture = makeCapturePlugIn(
            {.streams = *description.capture, .machine = machine, .starts = starts});
    }
    if (description.counters.has_value()) {
        device.services.meterix = makeMeterixFacility(*description.counters, machine, starts);
    }
    if (description.hid.has_value()) {
        device.services.hid = makeHidFacility(*description.hid, machine);
    }
    if (description.display.has_value()) {
        device.services.display = makeDisplayService(*description.display, machine);
        device.services.registry = makeDeviceRegistry(*description.display, machine);
    }
    return device;
}

devices::Kind kind() {
    return {
        .name = "linux",
        .summary = "Parts of this Linux machine, by the file of a port description",
        .open = [](const devices::Request& request) { return openDevice(request.what, Machine()); },
        .check = check};
}

}  // namespace linux_device
