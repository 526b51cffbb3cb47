#include "host/zrlab/recording_session.h"

#include <algorithm>
#include <utility>

#include <fmt/format.h>

#include "devices/recording/kind.h"
#include "frame/host_interface.h"
#include "host/record/problem.h"
#include "host/run/planner.h"

namespace host {

namespace {

// "3 deliveries and 0 calls were lost".
std::string lostText(const recording::Hole& lost) {
    return lost.deliveries == 0 && lost.calls == 0
               ? ""
               : fmt::format("the recording has holes: {} deliveries and {} calls were lost",
                             lost.deliveries, lost.calls);
}

// A name that is run several times in a row once.
std::vector<std::string> withoutRepetitions(std::vector<std::string> names) {
    names.erase(std::unique(names.begin(), names.end()), names.end());
    return names;
}

bool declares(const std::string& name, const ParameterSetting& setting) {
    const ZRLab& lab = ZRLab::defaultLab();
    const auto parts = partsOf(lab, name);
    return std::any_of(parts.begin(), parts.end(), [&](const auto& part) {
        const auto description = describePart(lab, part.first, part.second);
        if (setting.part.value_or(part.first) != part.first || !description.has_value()) {
            return false;
        }
        const auto& declared = description->parameters();
        return std::any_of(declared.begin(), declared.end(),
                           [&](const auto& parameter) { return parameter.first == setting.name; });
    });
}

}  // namespace

void SessionRecorder::record(devices::Device& device,
                             const std::vector<std::string>& parameters,
                             const std::string& version) {
    _recorder = recording::Recorder::start({.device = device.name,
                                            .summary = device.summary,
                                            .facts = device.facts,
                                            .services = recording::serviceNames(device.services),
                                            .parameters = parameters,
                                            .program = "zrlab " + version,
                                            .started = platform::Date::now().timestamp()},
                                           _sink);
    device.services = _recorder->record(std::move(device.services));
}

std::string SessionRecorder::finish() {
    return _recorder != nullptr ? lostText(_recorder->finish()) : "";
}

void SessionRecorder::runStarted(const RunRecord& run) {
    _recorder->beginRun({.name = run.plan.name, .number = run.number});
}

RecordedSession recordedSession(const DeviceChoice& choice) {
    RecordedSession recorded;
    if (deviceKind(choice) != recording::kReplayKind) {
        return recorded;
    }
    try {
        const auto file = recording::readRecording(deviceArgument(choice));
        for (const recording::Entry& entry : file.entries) {
            if (const auto* run = std::get_if<recording::Run>(&entry.content)) {
                recorded.names.push_back(run->name);
            }
        }
        recorded.names = withoutRepetitions(std::move(recorded.names));
        recorded.parameters = file.session.parameters;
        recorded.warnings = file.warnings();
    } catch (const recording::RecordingProblem& problem) {
        throw Problem(kExitUsage, problem.what());
    }
    return recorded;
}

void requireRecorded(const std::vector<std::string>& names,
                     const RecordedSession& recorded,
                     const DeviceChoice& choice) {
    if (deviceKind(choice) != recording::kReplayKind) {
        return;
    }
    const std::vector<std::string> asked = withoutRepetitions(names);
    const bool isRecorded = asked.size() <= recorded.names.size() &&
                            std::equal(asked.begin(), asked.end(), recorded.names.begin());
    if (!isRecorded) {
        throw Problem(kExitUsage,
                      recorded.names.empty()
                          ? fmt::format("{}: nothing was run in this recording", choice.device)
                          : fmt::format("{}: this recording is of {}; run the same, in this order",
                                        choice.device, fmt::join(recorded.names, ", ")));
    }
}

std::vector<std::string> withRecorded(const std::vector<std::string>& given,
                                      const RecordedSession& recorded,
                                      const std::vector<std::string>& names) {
    std::vector<std::string> parameters;
    for (const std::string& text : recorded.parameters) {
        const ParameterSetting setting = readSetting(text);
        const bool isGiven = std::any_of(given.begin(), given.end(), [&](const auto& other) {
            return readSetting(other).name == setting.name;
        });
        if (!isGiven && std::any_of(names.begin(), names.end(), [&](const std::string& name) {
                return declares(name, setting);
            })) {
            parameters.push_back(text);
        }
    }
    parameters.insert(parameters.end(), given.begin(), given.end());
    return parameters;
}

}  // namespace host
