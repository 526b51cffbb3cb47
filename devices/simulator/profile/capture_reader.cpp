// The capture service of a device profile: calls that fail, streams and their frames.
#include <algorithm>
#include <string>
#include <string_view>
#include <vector>

#include "devices/simulator/profile/part_readers.h"
#include "devices/simulator/profile/value_readers.h"
#include "platform/welkin/capture.h"

namespace simulator {

namespace {

constexpr std::string_view kPortTypePrefix = "ryl.port.";

// The service's own keys under the names that a profile has for them.
struct ShortName {
    std::string_view name;
    std::string_view key;
};

constexpr ShortName kMetadataNames[] = {
    {"infraredLightSource", kRylCaptureStreamMetadata_InfraredLightSource},
    {"floodActiveTemperature", kRylCaptureStreamMetadata_FloodActiveTemperature},
};

constexpr ShortName kErrorCounterNames[] = {
    {"i2c", kRylCaptureStreamPropertyValue_I2CErrorCount},
    {"mipi", kRylCaptureStreamPropertyValue_MIPIErrorCount},
    {"lpdp", "LPDPErrorCount"},
    {"uart", "UARTErrorCount"},
    {"sif", "SIFErrorCount"},
    {"projector", "ProjectorErrorCount"},
};

constexpr ShortName kPropertyNames[] = {
    {"portType", kRylCaptureStreamProperty_PortType},
    {"lightSource", kRylCaptureStreamProperty_InfraredLightSourceConfiguration},
    {"multipleOutputs", kRylCaptureStreamProperty_MultipleOutputSupportEnabled},
    {"formatIndex", kRylCaptureStreamProperty_FormatIndex},
    {"minimumFrameRate", kRylCaptureStreamProperty_MinimumFrameRate},
    {"maximumFrameRate", kRylCaptureStreamProperty_MaximumFrameRate},
    {"outputConfigurations", kRylCaptureStreamProperty_VideoOutputConfigurations},
    {"outputsEnabled", kRylCaptureStreamProperty_VideoOutputsEnabled},
    {"autoExposure", kRylCaptureStreamProperty_AEEnabled},
    {"outputHandlers", kRylCaptureStreamProperty_VideoOutputHandlers},
    {"errorCounters", kRylCaptureStreamProperty_ErrorCounters},
};

template <std::size_t N>
const ShortName* find(const ShortName (&names)[N], std::string_view name) {
    const auto* found = std::find_if(std::begin(names), std::end(names),
                                     [&](const ShortName& row) { return row.name == name; });
    return found == std::end(names) ? nullptr : found;
}

// The service's key; every other name stands for itself.
std::string_view metadataKey(std::string_view name) {
    const ShortName* found = find(kMetadataNames, name);
    return found == nullptr ? name : found->key;
}

// The key of a name that must be in the table.
template <std::size_t N>
std::string_view knownKey(const ShortName (&names)[N],
                          const JsonNode& node,
                          std::string_view name,
                          std::vector<std::string> others = {}) {
    if (const ShortName* found = find(names, name)) {
        return found->key;
    }
    for (const ShortName& row : names) {
        others.emplace_back(row.name);
    }
    input::failUnknownKey(node, name, others);
}

// An entry for each key of an object; null takes one away.
void readMetadata(const JsonNode& node, platform::MutableDictionary& metadata) {
    node.forEachKey([&](const std::string& name, const JsonNode& value) {
        if (value.isNull()) {
            metadata.remove(metadataKey(name));
        } else {
            metadata.set(metadataKey(name), readValue(value));
        }
    });
}

void readOverrideMetadata(const JsonNode& node, FrameOverride& change) {
    if (node.isObject()) {
        node.forEachKey([&](const std::string& name, const JsonNode& value) {
            if (value.isNull()) {
                change.remove.emplace_back(metadataKey(name));
            } else {
                change.set.set(metadataKey(name), readValue(value));
            }
        });
        return;
    }
    const std::string text = node.json().is_string() ? node.asText() : "";
    change.noMetadata = text == "missing";
    change.metadataIsNoDictionary = text == "corrupt";
    if (!change.noMetadata && !change.metadataIsNoDictionary) {
        node.fail(R"(neither metadata entries nor "missing" nor "corrupt")");
    }
}

constexpr JsonKey<FrameOverride> kFrameOverrideKeys[] = {
    {"frames", [](const JsonNode& node,
                  FrameOverride& change) { change.frames = readRange(node, "frames"); }},
    {"metadata", readOverrideMetadata},
    {"dropped", readMember<&FrameOverride::dropped>},
};

constexpr JsonKey<FrameEvent> kFrameEventKeys[] = {
    {"frame", [](const JsonNode& node,
                 FrameEvent& event) { event.frame = node.asInteger<std::uint64_t>(1); }},
    {"code", readMember<&FrameEvent::code>},
    {"info", readMember<&FrameEvent::info>},
};

void readErrorCounters(const JsonNode& node, StreamProfile& stream) {
    platform::MutableDictionary counters;
    if (const platform::Dictionary* known = stream.errorCounters.dictionary()) {
        counters = known->entries();
    }
    node.forEachKey([&](const std::string& name, const JsonNode& value) {
        const std::string_view key = knownKey(kErrorCounterNames, value, name);
        if (value.isNull()) {
            counters.remove(key);
        } else {
            counters.set(key, readValue(value));
        }
    });
    stream.errorCounters = platform::Dictionary(std::move(counters));
}

void readWarming(const JsonNode& node, StreamProfile& stream) {
    node.forEachKey([&](const std::string& name, const JsonNode& value) {
        if (value.isNull()) {
            stream.warming.remove(metadataKey(name));
        } else {
            stream.warming.set(metadataKey(name),
                               value.asDouble(-kLargestQuantity, kLargestQuantity));
        }
    });
}

constexpr std::pair<std::string_view, Fault StreamProfile::*> kCalls[] = {
    {"control", &StreamProfile::control},
    {"start", &StreamProfile::start},
    {"stop", &StreamProfile::stop},
};

// By the name of a call or of a property.
void readStreamFaults(const JsonNode& node, StreamProfile& stream) {
    node.forEachKey([&](const std::string& name, const JsonNode& value) {
        std::vector<std::string> calls;
        for (const auto& [call, fault] : kCalls) {
            if (call == name) {
                stream.*fault = readFault(value);
                return;
            }
            calls.emplace_back(call);
        }
        const std::string_view key = knownKey(kPropertyNames, value, name, std::move(calls));
        stream.propertyFaults.set(key, readFault(value));
    });
}

// A port type that the service has itself may be given by its short name, the stream's.
std::string portTypeOf(const JsonNode& node) {
    std::string text = node.asText();
    std::string own = std::string(kPortTypePrefix) + text;
    for (const StreamProfile& stream : healthyCapture().streams) {
        if (stream.portType == own) {
            return own;
        }
    }
    return text;
}

constexpr JsonKey<StreamProfile> kStreamKeys[] = {
    {"portType",
     [](const JsonNode& node, StreamProfile& stream) { stream.portType = portTypeOf(node); }},
    {"faults", readStreamFaults},
    {"errorCounters", readErrorCounters},
    {"metadata",
     [](const JsonNode& node, StreamProfile& stream) { readMetadata(node, stream.metadata); }},
    {"lightSources",
     [](const JsonNode& node, StreamProfile& stream) {
         stream.lightSources.clear();
         node.forEachEntry([&](const JsonNode& entry) {
             stream.lightSources.push_back(entry.asInteger<std::int32_t>());
         });
     }},
    {"warming", readWarming},
    {"overrides",
     [](const JsonNode& node, StreamProfile& stream) {
         stream.overrides = readList(node, kFrameOverrideKeys);
     }},
    {"events", [](const JsonNode& node,
                  StreamProfile& stream) { stream.events = readList(node, kFrameEventKeys); }},
    {"jitterMicroseconds",
     [](const JsonNode& node, StreamProfile& stream) {
         stream.jitterMicroseconds = node.asDouble(0, kLargestQuantity);
     }},
    {"seed", readMember<&StreamProfile::seed>},
    {"stallAfterFrame", readMember<&StreamProfile::stallAfterFrame>},
    {"framesAfterStop", readMember<&StreamProfile::framesAfterStop>},
};

// A stream is named by its port type, without the prefix that the service's own have.
std::string nameOfStream(const StreamProfile& stream) {
    const bool own = stream.portType.starts_with(kPortTypePrefix);
    return stream.portType.substr(own ? kPortTypePrefix.size() : 0);
}

// Starts as a healthy stream of its port type, or as the front camera when there is none.
StreamProfile makeStream(const std::string& /*name*/, const JsonNode& node) {
    const std::string portType = portTypeOf(node["portType"]);
    const std::vector<StreamProfile> healthy = healthyCapture().streams;
    const auto find = [&](std::string_view wanted) {
        return std::find_if(healthy.begin(), healthy.end(),
                            [&](const StreamProfile& stream) { return stream.portType == wanted; });
    };
    const auto same = find(portType);
    return same != healthy.end() ? *same : *find("ryl.port.front");
}

constexpr JsonKey<CaptureProfile> kCaptureFaultKeys[] = {
    {"device", readMember<&CaptureProfile::device>},
    {"streams", readMember<&CaptureProfile::streamList>},
    {"invalidate", readMember<&CaptureProfile::invalidate>},
};

constexpr JsonKey<CaptureProfile> kCaptureKeys[] = {
    {"plugIn", readMember<&CaptureProfile::plugIn>},
    {"faults", [](const JsonNode& node,
                  CaptureProfile& capture) { readObject(node, kCaptureFaultKeys, capture); }},
    {"streams",
     [](const JsonNode& node, CaptureProfile& capture) {
         readNamed(node, kStreamKeys, capture.streams, "stream", {"portType"}, nameOfStream,
                   makeStream);
     }},
};

}  // namespace

void readCapture(const JsonNode& node, CaptureProfile& capture) {
    readObject(node, kCaptureKeys, capture);
}

}  // namespace simulator
