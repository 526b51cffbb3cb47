// The capture service of a device profile: calls that fail, streams and their frames.
#include <algorithm>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "devices/simulator/profile/parts.h"
#include "devices/simulator/profile/value_forms.h"
#include "platform/welkin/capture.h"

namespace simulator {

namespace {

// The service's own metadata keys under the names that a profile has for them.
struct ShortName {
    std::string_view name;
    std::string_view key;
};

constexpr ShortName kMetadataNames[] = {
    {"infraredLightSource", kRylCaptureStreamMetadata_InfraredLightSource},
    {"floodActiveTemperature", kRylCaptureStreamMetadata_FloodActiveTemperature},
};

// A new stream starts as the healthy one of its port type, or as the front camera when there is none.
StreamProfile newStream(std::string_view portType) {
    const std::vector<StreamProfile> healthy = healthyCapture().streams;
    const auto find = [&](std::string_view wanted) {
        return std::find_if(healthy.begin(), healthy.end(),
                            [&](const StreamProfile& stream) { return stream.portType == wanted; });
    };
    const auto same = find(portType);
    return same != healthy.end() ? *same : *find("ryl.port.front");
}

// The name of a metadata key that has a short one, or null.
const ShortName* shortMetadataName(std::string_view key) {
    const auto* found = std::find_if(std::begin(kMetadataNames), std::end(kMetadataNames),
                                     [&](const ShortName& row) { return row.key == key; });
    return found == std::end(kMetadataNames) ? nullptr : found;
}

// The names of the metadata keys that the service has: the short ones, and the keys of healthy streams.
const std::vector<std::string>& metadataNames() {
    static const auto& names = *new std::vector<std::string>([] {
        std::vector<std::string> all;
        for (const ShortName& row : kMetadataNames) {
            all.emplace_back(row.name);
        }
        for (const StreamProfile& stream : healthyCapture().streams) {
            for (const auto& [key, value] : stream.metadata) {
                if (shortMetadataName(key) == nullptr) {
                    all.emplace_back(key);
                }
            }
        }
        return all;
    }());
    return names;
}

bool isMetadataName(std::string_view name) {
    return std::find(metadataNames().begin(), metadataNames().end(), name) != metadataNames().end();
}

// A key that the service does not have is written with a + in front, so that a slip is not taken for one.
constexpr char kNewKey = '+';

std::string_view metadataKey(const JsonNode& node, std::string_view name) {
    for (const ShortName& row : kMetadataNames) {
        if (row.name == name) {
            return row.key;
        }
    }
    if (name.size() > 1 && name.front() == kNewKey) {
        return name.substr(1);
    }
    if (!isMetadataName(name)) {
        input::failUnknownName(node, name, metadataNames(), "metadata key",
                               "a new one is written \"" + (kNewKey + std::string(name)) + "\"");
    }
    return name;
}

std::string metadataName(std::string_view key) {
    if (const ShortName* found = shortMetadataName(key)) {
        return std::string(found->name);
    }
    return (isMetadataName(key) ? "" : std::string(1, kNewKey)) + std::string(key);
}

// Something for each metadata key of an object; null takes it away.
template <class T>
void readEntries(const JsonNode& node, platform::StringMap<T>& entries) {
    node.forEachKey([&](const std::string& name, const JsonNode& value) {
        const std::string_view key = metadataKey(value, name);
        T entry = {};
        if (value.isNull()) {
            entries.remove(key);
        } else {
            readInto(value, entry);
            entries.set(key, std::move(entry));
        }
    });
}

// null for those of `names` that have no entry.
template <class T>
Json writeEntries(const platform::StringMap<T>& entries, const std::vector<std::string>& names) {
    Json json = Json::object();
    for (const std::string& name : names) {
        json[name] = nullptr;
    }
    for (const auto& [key, value] : entries) {
        json[metadataName(key)] = jsonOf(value);
    }
    return json;
}

void readOverrideMetadata(const JsonNode& node, FrameOverride& change) {
    if (node.isObject()) {
        node.forEachKey([&](const std::string& name, const JsonNode& value) {
            const std::string_view key = metadataKey(value, name);
            platform::Value entry;
            if (value.isNull()) {
                change.remove.emplace_back(key);
            } else {
                readInto(value, entry);
                change.set.set(key, std::move(entry));
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

Json writeOverrideMetadata(const FrameOverride& change) {
    if (change.noMetadata || change.metadataIsNoDictionary) {
        return change.noMetadata ? "missing" : "corrupt";
    }
    Json json = writeEntries(change.set, {});
    for (const std::string& key : change.remove) {
        json[metadataName(key)] = nullptr;
    }
    return json;
}

constexpr JsonKey<FrameOverride> kFrameOverrideKeys[] = {
    {"frames",
     [](const JsonNode& node, FrameOverride& change) { change.frames = readRange(node, "frames"); },
     [](const FrameOverride& change) { return jsonOf(change.frames); }},
    {"metadata", readOverrideMetadata, writeOverrideMetadata},
    memberKey<&FrameOverride::dropped>("dropped"),
};

constexpr JsonKey<FrameEvent> kFrameEventKeys[] = {
    numberKey<&FrameEvent::frame, std::uint64_t{1}, kLastNumber>("frame"),
    memberKey<&FrameEvent::code>("code"),
    memberKey<&FrameEvent::info>("info"),
};

// An entry of the error counters that a client reads.
template <const std::string_view& counter>
constexpr JsonKey<StreamProfile> errorCounterKey(std::string_view name) {
    return {name,
            [](const JsonNode& node, StreamProfile& stream) {
                platform::MutableDictionary counters;
                if (const platform::Dictionary* known = stream.errorCounters.dictionary()) {
                    counters = known->entries();
                }
                platform::Value value;
                readInto(node, value);
                if (value.isPresent()) {
                    counters.set(counter, std::move(value));
                } else {
                    counters.remove(counter);
                }
                stream.errorCounters = platform::Dictionary(std::move(counters));
            },
            [](const StreamProfile& stream) { return jsonOf(stream.errorCounters[counter]); }};
}

constexpr std::string_view kLpdpErrors = "LPDPErrorCount";
constexpr std::string_view kUartErrors = "UARTErrorCount";
constexpr std::string_view kSifErrors = "SIFErrorCount";
constexpr std::string_view kProjectorErrors = "ProjectorErrorCount";
constexpr JsonKey<StreamProfile> kErrorCounterKeys[] = {
    errorCounterKey<kRylCaptureStreamPropertyValue_I2CErrorCount>("i2c"),
    errorCounterKey<kRylCaptureStreamPropertyValue_MIPIErrorCount>("mipi"),
    errorCounterKey<kLpdpErrors>("lpdp"),
    errorCounterKey<kUartErrors>("uart"),
    errorCounterKey<kSifErrors>("sif"),
    errorCounterKey<kProjectorErrors>("projector"),
};

// Whether reading or writing a property fails.
template <const std::string_view& property>
constexpr JsonKey<StreamProfile> propertyKey(std::string_view name) {
    return {name,
            [](const JsonNode& node, StreamProfile& stream) {
                Fault fault;
                readInto(node, fault);
                stream.propertyFaults.set(property, std::move(fault));
            },
            [](const StreamProfile& stream) {
                const Fault* fault = stream.propertyFaults.find(property);
                return jsonOf(fault != nullptr ? *fault : Fault());
            }};
}

constexpr JsonKey<StreamProfile> kStreamFaultKeys[] = {
    memberKey<&StreamProfile::control>("control"),
    memberKey<&StreamProfile::start>("start"),
    memberKey<&StreamProfile::stop>("stop"),
    propertyKey<kRylCaptureStreamProperty_PortType>("portType"),
    propertyKey<kRylCaptureStreamProperty_InfraredLightSourceConfiguration>("lightSource"),
    propertyKey<kRylCaptureStreamProperty_MultipleOutputSupportEnabled>("multipleOutputs"),
    propertyKey<kRylCaptureStreamProperty_FormatIndex>("formatIndex"),
    propertyKey<kRylCaptureStreamProperty_MinimumFrameRate>("minimumFrameRate"),
    propertyKey<kRylCaptureStreamProperty_MaximumFrameRate>("maximumFrameRate"),
    propertyKey<kRylCaptureStreamProperty_VideoOutputConfigurations>("outputConfigurations"),
    propertyKey<kRylCaptureStreamProperty_VideoOutputsEnabled>("outputsEnabled"),
    propertyKey<kRylCaptureStreamProperty_AEEnabled>("autoExposure"),
    propertyKey<kRylCaptureStreamProperty_VideoOutputHandlers>("outputHandlers"),
    propertyKey<kRylCaptureStreamProperty_ErrorCounters>("errorCounters"),
};

void readWarming(const JsonNode& node, StreamProfile& stream) {
    readEntries(node, stream.warming);
}

Json writeWarming(const StreamProfile& stream) {
    std::vector<std::string> names;
    for (const auto& [key, rise] : newStream(stream.portType).warming) {
        names.push_back(metadataName(key));
    }
    return writeEntries(stream.warming, names);
}

// A port type that the service has itself may be given by the name of the healthy stream that has it.
std::string portTypeOf(const JsonNode& node) {
    std::string text = node.asText();
    for (const StreamProfile& stream : healthyCapture().streams) {
        if (stream.name == text) {
            return stream.portType;
        }
    }
    return text;
}

constexpr JsonKey<StreamProfile> kStreamKeys[] = {
    {"portType",
     [](const JsonNode& node, StreamProfile& stream) { stream.portType = portTypeOf(node); },
     [](const StreamProfile& stream) { return jsonOf(stream.portType); }},
    groupKey<kStreamFaultKeys>("faults"),
    groupKey<kErrorCounterKeys>("errorCounters"),
    {"metadata",
     [](const JsonNode& node, StreamProfile& stream) { readEntries(node, stream.metadata); },
     [](const StreamProfile& stream) { return writeEntries(stream.metadata, metadataNames()); }},
    {"lightSources",
     [](const JsonNode& node, StreamProfile& stream) {
         stream.lightSources.clear();
         node.forEachEntry(
             [&](const JsonNode& entry) { readInto(entry, stream.lightSources.emplace_back()); });
     },
     [](const StreamProfile& stream) { return Json(stream.lightSources); }},
    {"warming", readWarming, writeWarming},
    listKey<&StreamProfile::overrides, kFrameOverrideKeys>("overrides"),
    listKey<&StreamProfile::events, kFrameEventKeys>("events"),
    numberKey<&StreamProfile::jitterMicroseconds, 0, kLargestQuantity>("jitterMicroseconds"),
    memberKey<&StreamProfile::seed>("seed"),
    memberKey<&StreamProfile::stallAfterFrame>("stallAfterFrame"),
    memberKey<&StreamProfile::framesAfterStop>("framesAfterStop"),
};

constexpr JsonNames<StreamProfile> kStreamNames = {
    "stream",
    &StreamProfile::name,
    {"portType"},
    [](const JsonNode& node) { return newStream(portTypeOf(node["portType"])); },
};

constexpr JsonKey<CaptureProfile> kCaptureFaultKeys[] = {
    memberKey<&CaptureProfile::device>("device"),
    memberKey<&CaptureProfile::streamList>("streams"),
    memberKey<&CaptureProfile::invalidate>("invalidate"),
};

constexpr JsonKey<CaptureProfile> kCaptureKeys[] = {
    memberKey<&CaptureProfile::plugIn>("plugIn"),
    groupKey<kCaptureFaultKeys>("faults"),
    namedKey<&CaptureProfile::streams, kStreamKeys, kStreamNames>("streams"),
};

}  // namespace

void readCapture(const JsonNode& node, CaptureProfile& capture) {
    input::readObject(node, kCaptureKeys, capture);
}

input::Json writeCapture(const CaptureProfile& capture) {
    return input::writeObject(kCaptureKeys, capture);
}

}  // namespace simulator
