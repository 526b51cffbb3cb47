#include "devices/recording/kind.h"

#include <algorithm>
#include <stdexcept>
#include <utility>

#include "devices/recording/replayed.h"
#include "devices/recording/script.h"
#include "platform/text_format.h"

namespace recording {

namespace {

// What was recorded is replayed; calls that are missing in between would answer for others.
Recording usableRecording(const std::string& path) {
    if (path.empty()) {
        throw std::invalid_argument("replay: name the file of a recording: replay:FILE");
    }
    try {
        Recording recording = readRecording(path);
        if (recording.lost.calls > 0) {
            throw RecordingProblem(platform::format(
                "%@: %lu calls were lost when it was recorded; it cannot be replayed", path,
                recording.lost.calls));
        }
        return recording;
    } catch (const RecordingProblem& problem) {
        throw std::invalid_argument(problem.what());
    }
}

template <class Service>
std::shared_ptr<Service> replayed(const Session& session,
                                  std::string_view name,
                                  std::shared_ptr<Service> (*replay)(ScriptRef),
                                  const ScriptRef& script) {
    const auto& names = session.services;
    return std::find(names.begin(), names.end(), name) != names.end() ? replay(script) : nullptr;
}

devices::Device openRecording(const devices::Request& request) {
    const Recording recording = usableRecording(request.what);
    const auto script = std::make_shared<Script>(recording, request.speed);
    const Session& session = recording.session;
    devices::Device device{
        .name = session.device, .summary = session.summary, .facts = session.facts, .services = {}};
    device.facts.emplace_back("recording", request.what);
    device.facts.emplace_back("recorded", session.started);
    for (const std::string& warning : recording.warnings()) {
        device.facts.emplace_back("missing", warning);
    }
    device.services = {.capture = replayed(session, "capture", replayCapture, script),
                       .meterix = replayed(session, "meterix", replayMeterix, script),
                       .hid = replayed(session, "hid", replayHid, script),
                       .display = replayed(session, "display", replayDisplay, script),
                       .registry = replayed(session, "registry", replayRegistry, script)};
    device.unanswered = [script] { return script->unanswered(); };
    return device;
}

}  // namespace

devices::Kind kind() {
    return {.name = std::string(kReplayKind),
            .summary = "Recordings of a device, by their files",
            .takesSpeed = true,
            .open = openRecording};
}

std::vector<std::string> serviceNames(const platform::Services& services) {
    std::vector<std::string> names;
    const auto add = [&names](const auto& service, const char* name) {
        if (service != nullptr) {
            names.emplace_back(name);
        }
    };
    add(services.capture, "capture");
    add(services.meterix, "meterix");
    add(services.hid, "hid");
    add(services.display, "display");
    add(services.registry, "registry");
    return names;
}

}  // namespace recording
