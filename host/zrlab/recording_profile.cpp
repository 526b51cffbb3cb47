#include "host/zrlab/recording_profile.h"

#include <algorithm>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <utility>

#include <nlohmann/json.hpp>

#include "devices/simulator/profile/device_profile.h"
#include "devices/simulator/profile/writer.h"
#include "platform/display.h"
#include "platform/welkin/capture.h"
#include "platform/welkin/hid.h"

namespace host {

namespace {

using platform::Value;
using recording::Call;
using recording::Frame;
using recording::Microseconds;
using recording::ObjectId;
using recording::Operation;
using recording::Report;
using simulator::Fault;

constexpr std::string_view kFrameNumber = "FrameNumber";
constexpr std::string_view kLightSource = kRylCaptureStreamMetadata_InfraredLightSource;
constexpr std::int64_t kImageReport = 118;
constexpr std::size_t kImageSize = 792;
constexpr std::size_t kFrameIdOffset = 4;

// A device that stays silent for so long before it is stopped has stalled.
constexpr Microseconds kStall = std::chrono::milliseconds(500);

// The fault of a call that failed with this error, if any.
Fault faultOf(const Call& call) {
    return Fault::failing(call.error);
}

bool isTrue(const Call& call) {
    return call.result.asNumber().isTrue();
}

// A stream of the recording, and what becomes of it.
struct Stream {
    simulator::StreamProfile profile;
    std::uint64_t frames = 0;  // so far, the lost ones included
    std::optional<Microseconds> lastFrame;
    std::optional<Microseconds> started;
    platform::MutableDictionary base;  // the metadata of the first frame
};

std::uint32_t frameId(const Report& report) {
    std::uint32_t id = 0;
    for (std::size_t at = 0; at < 4 && kFrameIdOffset + at < report.data.size(); ++at) {
        id |= std::uint32_t{static_cast<unsigned char>(report.data[kFrameIdOffset + at])}
              << (8 * at);
    }
    return id;
}

// What is different about a frame whose metadata should be `base`.
simulator::FrameOverride difference(const platform::Dictionary& metadata,
                                    const platform::MutableDictionary& base) {
    simulator::FrameOverride change;
    for (const auto& [key, value] : metadata) {
        const Value* usual = base.find(key);
        if (key != kFrameNumber && (usual == nullptr || !(*usual == value))) {
            change.set.set(key, value);
        }
    }
    for (const auto& [key, value] : base) {
        if (!metadata.contains(key)) {
            change.remove.emplace_back(key);
        }
    }
    return change;
}

bool isSame(const simulator::FrameOverride& a, const simulator::FrameOverride& b) {
    return a.set == b.set && a.remove == b.remove && a.noMetadata == b.noMetadata &&
           a.metadataIsNoDictionary == b.metadataIsNoDictionary && a.dropped == b.dropped;
}

bool isSame(const simulator::ReportOverride& a, const simulator::ReportOverride& b) {
    return a.length == b.length && a.reportID == b.reportID && a.dropped == b.dropped;
}

simulator::NumberRange& rangeOf(simulator::FrameOverride& change) {
    return change.frames;
}
simulator::NumberRange& rangeOf(simulator::ReportOverride& change) {
    return change.reports;
}

// Adds the change for these numbers, to the one before when that is the same and ends where they begin.
template <class Override>
void addOverride(std::vector<Override>& overrides,
                 Override change,
                 simulator::NumberRange numbers) {
    if (!overrides.empty() && isSame(overrides.back(), change) &&
        rangeOf(overrides.back()).last + 1 == numbers.first) {
        rangeOf(overrides.back()).last = numbers.last;
    } else {
        rangeOf(change) = numbers;
        overrides.push_back(std::move(change));
    }
}

class ProfileMaker {
  public:
    simulator::DeviceProfile make(const recording::Recording& recording) {
        const recording::Session& session = recording.session;
        _profile.name = session.device;
        _profile.summary = session.summary;
        const auto has = [&session](std::string_view service) {
            const auto& names = session.services;
            return std::find(names.begin(), names.end(), service) != names.end();
        };
        _profile.capture.plugIn = has("capture");
        _profile.hid.managerAvailable = has("hid");
        for (const recording::Entry& entry : recording.entries) {
            _at = entry.at;
            std::visit([this](const auto& content) { _add(content); }, entry.content);
        }
        if (_hasStreams) {
            _profile.capture.streams.clear();
            for (const ObjectId id : _order) {
                _profile.capture.streams.push_back(std::move(_streams[id].profile));
            }
        }
        return std::move(_profile);
    }

  private:
    template <class Other>
    void _add(const Other& /*other*/) {}

    void _add(const Call& call) {
        // Of every operation with its arguments the first call counts, but for the two snapshots.
        const bool first =
            _seen.insert({call.object, recording::callText(call.operation, call.arguments)}).second;
        if (call.operation == Operation::Sample) {
            _addSample(call);
        } else if (first) {
            _addCapture(call);
            _addCounters(call);
            _addHid(call);
            _addDisplay(call);
        }
    }

    void _addCapture(const Call& call) {
        simulator::CaptureProfile& capture = _profile.capture;
        switch (call.operation) {
            case Operation::Device:
                capture.device = call.result.isPresent() ? Fault() : faultOf(call);
                break;
            case Operation::Streams:
                if (call.result.list() == nullptr) {
                    capture.streamList = faultOf(call);
                } else if (!_hasStreams) {
                    _addStreams(*call.result.list());
                }
                break;
            case Operation::RequestControl:
                if (!isTrue(call) && call.arguments.list() != nullptr) {
                    for (const Value& id : *call.arguments.list()) {
                        _streams[id.asNumber().as<ObjectId>()].profile.control = faultOf(call);
                    }
                }
                break;
            case Operation::Invalidate:
                capture.invalidate = isTrue(call) ? Fault() : faultOf(call);
                break;
            default:
                _addStreamCall(call);
        }
    }

    void _addStreams(const platform::List& ids) {
        _hasStreams = true;
        for (const Value& id : ids) {
            _order.push_back(id.asNumber().as<ObjectId>());
            simulator::StreamProfile& stream = _streams[_order.back()].profile;
            stream.name = "stream-" + std::to_string(_order.size());
            stream.errorCounters = platform::Dictionary();
        }
    }

    void _addStreamCall(const Call& call) {
        Stream& stream = _streams[call.object];
        simulator::StreamProfile& profile = stream.profile;
        const auto* parts = call.arguments.list();
        const Value property = parts != nullptr && !parts->empty() ? (*parts)[0] : call.arguments;
        if (call.operation == Operation::ValueForProperty && property.string() != nullptr) {
            if (!call.result.isPresent()) {
                profile.propertyFaults.set(*property.string(), faultOf(call));
            } else if (*property.string() == kRylCaptureStreamProperty_PortType) {
                profile.portType = call.result.string() != nullptr ? *call.result.string() : "";
            } else if (*property.string() == kRylCaptureStreamProperty_ErrorCounters) {
                profile.errorCounters = call.result;
            }
        } else if (call.operation == Operation::SetValue && property.string() != nullptr) {
            if (!isTrue(call)) {
                profile.propertyFaults.set(*property.string(), faultOf(call));
            }
        } else if (call.operation == Operation::Start) {
            stream.started = _at;
            profile.start = isTrue(call) ? Fault() : faultOf(call);
        } else if (call.operation == Operation::Stop) {
            profile.stop = isTrue(call) ? Fault() : faultOf(call);
            const auto since = stream.lastFrame.has_value() ? stream.lastFrame : stream.started;
            if (since.has_value() && _at - *since > kStall) {
                profile.stallAfterFrame = stream.frames;
            }
        }
    }

    void _add(const Frame& frame) {
        if (frame.phase.start != 1) {
            return;
        }
        Stream& stream = _streams[frame.stream];
        simulator::StreamProfile& profile = stream.profile;
        const auto* metadata = frame.metadata.dictionary();
        std::uint64_t number = stream.frames + 1;
        if (metadata != nullptr && metadata->number(kFrameNumber).isPresent()) {
            const auto sensors = metadata->number(kFrameNumber).as<std::uint64_t>();
            if (sensors > number) {
                simulator::FrameOverride lost;
                lost.dropped = true;
                addOverride(profile.overrides, std::move(lost), {number, sensors - 1});
                number = sensors;
            }
        }
        if (metadata == nullptr) {
            simulator::FrameOverride change;
            change.noMetadata = !frame.metadata.isPresent();
            change.metadataIsNoDictionary = frame.metadata.isPresent();
            addOverride(profile.overrides, std::move(change), {number, number});
        } else {
            _addMetadata(stream, *metadata, number);
        }
        stream.frames = number;
        stream.lastFrame = _at;
        profile.framesAfterStop += frame.phase.stopped ? 1 : 0;
    }

    // The first frame's metadata is that of all; the light source of the first two is that of all in turn.
    static void _addMetadata(Stream& stream,
                             const platform::Dictionary& metadata,
                             std::uint64_t number) {
        simulator::StreamProfile& profile = stream.profile;
        if (profile.metadata.empty()) {
            profile.metadata = metadata.entries();
            profile.metadata.remove(kFrameNumber);
            stream.base = profile.metadata;
        }
        const platform::Number light = metadata.number(kLightSource);
        const bool turns =
            light.isPresent() && number <= 2 && profile.lightSources.size() + 1 == number;
        if (turns) {
            profile.lightSources.push_back(light.as<std::int32_t>());
        }
        if (!profile.lightSources.empty()) {
            stream.base.set(kLightSource,
                            profile.lightSources[(number - 1) % profile.lightSources.size()]);
        }
        simulator::FrameOverride change = difference(metadata, stream.base);
        if (!change.set.empty() || !change.remove.empty()) {
            addOverride(profile.overrides, std::move(change), {number, number});
        }
    }

    void _add(const recording::Event& event) {
        Stream& stream = _streams[event.stream];
        if (event.phase.start == 1) {
            stream.profile.events.push_back(
                {.frame = stream.frames + 1, .code = event.code, .info = event.info});
        }
    }

    void _addCounters(const Call& call) {
        simulator::MeterixProfile& meterix = _profile.meterix;
        if (call.operation == Operation::SimpleChannels) {
            if (call.result.list() == nullptr) {
                meterix.report = faultOf(call);
                return;
            }
            meterix.channels.clear();
            for (const Value& entry : *call.result.list()) {
                meterix.channels.push_back(_channelOf(entry));
            }
        } else if (call.operation == Operation::Difference) {
            if (call.result.list() == nullptr) {
                meterix.difference = faultOf(call);
                return;
            }
            _forEachSample(call.result, [](simulator::CounterChannel& channel, const auto& rise) {
                if (rise.template as<std::int64_t>() > 0) {
                    channel.riseAtFrame = 1;
                    channel.riseBy = rise.template as<std::uint64_t>();
                }
            });
        }
    }

    void _addSample(const Call& call) {
        const bool first = _samples++ == 0;
        if (call.result.list() == nullptr) {
            (first ? _profile.meterix.firstSnapshot : _profile.meterix.laterSnapshots) =
                faultOf(call);
        } else if (first) {
            _forEachSample(call.result, [](simulator::CounterChannel& channel, const auto& count) {
                channel.count = count.isPresent()
                                    ? std::optional(count.template as<std::uint64_t>())
                                    : std::nullopt;
            });
        }
    }

    static simulator::CounterChannel _channelOf(const Value& value) {
        const auto part = [&value](std::size_t index) -> std::string {
            const auto* parts = value.list();
            const Value text =
                parts != nullptr && index < parts->size() ? (*parts)[index] : Value();
            return text.string() != nullptr ? *text.string() : "";
        };
        return {part(0), part(1), part(2)};
    }

    template <class Use>
    void _forEachSample(const Value& samples, Use use) {
        for (const Value& sample : *samples.list()) {
            const auto* pair = sample.list();
            if (pair == nullptr || pair->size() != 2) {
                continue;
            }
            const auto wanted = _channelOf((*pair)[0]);
            for (simulator::CounterChannel& channel : _profile.meterix.channels) {
                if (channel.name == wanted.name && channel.group == wanted.group &&
                    channel.subgroup == wanted.subgroup) {
                    use(channel, (*pair)[1].asNumber());
                }
            }
        }
    }

    void _addHid(const Call& call) {
        simulator::HidProfile& hid = _profile.hid;
        if (call.operation == Operation::CreateManager) {
            hid.managerAvailable = call.result.isPresent();
        } else if (call.operation == Operation::Enumerate) {
            const auto* matching = call.arguments.list();
            _matching = matching != nullptr && !matching->empty() ? (*matching)[0] : Value();
        } else if (call.operation == Operation::Devices && call.result.list() != nullptr &&
                   !_hasSensors) {
            _hasSensors = true;
            hid.devices.clear();
            for (const Value& id : *call.result.list()) {
                simulator::HidDeviceProfile& device = hid.devices.emplace_back();
                device.product = "sensor-" + std::to_string(hid.devices.size());
                device.usagePage =
                    _matching[platform::kHidPrimaryUsagePage].asNumber().as<std::int64_t>();
                device.usage = _matching[platform::kHidPrimaryUsage].asNumber().as<std::int64_t>();
                _sensors[id.asNumber().as<ObjectId>()] = {hid.devices.size() - 1, 0, {}};
            }
        } else if (auto* sensor = _sensorOf(call.object)) {
            _addSensorCall(call, *sensor);
        }
    }

    void _addSensorCall(const Call& call, simulator::HidDeviceProfile& sensor) {
        const auto* parts = call.arguments.list();
        Reports& reports = _sensors[call.object];
        if (call.operation == Operation::Open) {
            sensor.open = isTrue(call) ? Fault() : faultOf(call);
        } else if (call.operation == Operation::Close) {
            sensor.close =
                isTrue(call) || sensor.unplugAtReport.has_value() ? Fault() : faultOf(call);
        } else if (call.operation == Operation::SetFeatureReport && !isTrue(call) &&
                   parts != nullptr && !parts->empty()) {
            sensor.featureReports[(*parts)[0].asNumber().as<std::int64_t>()] = faultOf(call);
        } else if (call.operation == Operation::Schedule) {
            reports.last = _at;
        } else if (call.operation == Operation::Unschedule && _at - reports.last > kStall &&
                   !sensor.unplugAtReport.has_value() && !sensor.errorAtReport.has_value()) {
            sensor.maxReports = reports.count;
        }
    }

    void _add(const Report& report) {
        auto* sensor = _sensorOf(report.sensor);
        if (sensor == nullptr || report.schedule != 1) {
            return;
        }
        Reports& reports = _sensors[report.sensor];
        std::uint64_t number = reports.count + 1;
        reports.last = _at;
        if (report.error != nullptr) {
            sensor->errorAtReport = {.report = number, .error = report.error};
        } else if (report.reportID != kImageReport || report.data.size() != kImageSize) {
            simulator::ReportOverride change;
            if (report.data.size() != kImageSize) {
                change.length = report.data.size();
            }
            if (report.reportID != kImageReport) {
                change.reportID = report.reportID;
            }
            addOverride(sensor->overrides, change, {number, number});
        } else {
            if (number == 1) {
                sensor->firstFrameId = frameId(report);
            }
            // Lost reports leave a gap in the frame IDs.
            const std::uint64_t sent = frameId(report) - sensor->firstFrameId + std::uint64_t{1};
            if (sent > number && sent - number < 1000) {
                addOverride(sensor->overrides, {.dropped = true}, {number, sent - 1});
                number = sent;
            }
        }
        reports.count = number;
    }

    void _add(const recording::Vanished& vanished) {
        if (auto* sensor = _sensorOf(vanished.sensor)) {
            sensor->unplugAtReport = _sensors[vanished.sensor].count + 1;
        }
    }

    simulator::HidDeviceProfile* _sensorOf(ObjectId id) {
        const auto known = _sensors.find(id);
        return known != _sensors.end() ? &_profile.hid.devices[known->second.index] : nullptr;
    }

    void _addDisplay(const Call& call) {
        simulator::DisplayProfile& display = _profile.display;
        if (call.operation == Operation::MainDisplay && call.result.list() != nullptr &&
            !call.result.list()->empty()) {
            display.mainDisplayStatus = (*call.result.list())[0].asNumber().as<int>();
        } else if (call.operation == Operation::RegistryObject) {
            display.registryService = isTrue(call);
        } else if (call.operation == Operation::Property) {
            const Value& info = call.result[platform::kDisplayPowerInfo];
            const Value& panel = info[platform::kDisplayPowerInfoPanel];
            display.property = call.result.isPresent();
            display.powerInfo = info.isPresent();
            display.powerPanel = panel.isPresent();
            display.powered = panel.isPresent() ? panel : display.powered;
        }
    }

    struct Reports {
        std::size_t index = 0;  // of the device in the profile
        std::uint64_t count = 0;
        Microseconds last{0};
    };

    simulator::DeviceProfile _profile;
    Microseconds _at{0};  // of the entry that is added
    std::set<std::pair<ObjectId, std::string>> _seen;
    bool _hasStreams = false;      // the device listed them
    std::vector<ObjectId> _order;  // of the streams
    std::map<ObjectId, Stream> _streams;
    std::size_t _samples = 0;
    Value _matching;
    bool _hasSensors = false;  // the manager listed them
    std::map<ObjectId, Reports> _sensors;
};

}  // namespace

std::string profileOf(const recording::Recording& recording, const std::string& name) {
    try {
        return simulator::profileText(ProfileMaker().make(recording));
    } catch (const nlohmann::json::type_error&) {
        throw recording::RecordingProblem(name +
                                          ": a text in it is not UTF-8, so no profile can hold it");
    }
}

}  // namespace host
