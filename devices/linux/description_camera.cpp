#include "devices/linux/description_camera.h"

#include <algorithm>
#include <iterator>
#include <map>
#include <utility>

#include "devices/linux/description_numbers.h"
#include "platform/welkin/capture.h"

namespace linux_device {

namespace {

constexpr std::uint32_t kMostBuffers = 32;  // VIDEO_MAX_FRAME

constexpr ShortName kErrorCounters[] = {
    {"i2c", kRylCaptureStreamPropertyValue_I2CErrorCount},
    {"mipi", kRylCaptureStreamPropertyValue_MIPIErrorCount},
    {"lpdp", "LPDPErrorCount"},
    {"uart", "UARTErrorCount"},
    {"sif", "SIFErrorCount"},
    {"projector", "ProjectorErrorCount"},
};
constexpr ShortName kPortTypes[] = {
    {"front-infrared", kRylCapturePortType_FrontFacingInfraredCamera},
};

template <std::size_t N>
std::string longName(const std::string& name, const ShortName (&table)[N]) {
    const auto* found = std::find_if(std::begin(table), std::end(table),
                                     [&](const ShortName& each) { return each.shortName == name; });
    return std::string(found != std::end(table) ? found->name : std::string_view(name));
}

std::optional<unsigned> indexOf(const Node& node) {
    return node.asInteger<unsigned>();
}

std::uint32_t sizeOf(const Node& node) {
    return node.asInteger<std::uint32_t>(1, 1U << 16U);
}

std::string fourccOf(const Node& node) {
    std::string text = node.asText();
    if (text.empty() || text.size() > 4) {
        node.fail("not a format code of up to four characters");
    }
    return text;
}

constexpr JsonKey<VideoMatch> kVideoKeys[] = {
    key<&VideoMatch::driver, textOf>("driver"),
    key<&VideoMatch::name, textOf>("name"),
    key<&VideoMatch::busInfo, textOf>("busInfo"),
    key<&VideoMatch::index, indexOf>("index"),
    identityKey<VideoMatch, &VideoMatch::usb, &UsbIdentity::vendor, identityOf>("vendor"),
    identityKey<VideoMatch, &VideoMatch::usb, &UsbIdentity::product, identityOf>("product"),
    identityKey<VideoMatch, &VideoMatch::usb, &UsbIdentity::serial, textOf>("serial"),
};

VideoMatch videoOf(const Node& node) {
    if (node.isObject() && node.json().empty()) {
        node.fail("empty: it would match any camera");
    }
    return objectOf<kVideoKeys>(node);
}

constexpr JsonKey<VideoFormat> kFormatKeys[] = {
    key<&VideoFormat::fourcc, fourccOf>("fourcc"),
    key<&VideoFormat::width, sizeOf>("width"),
    key<&VideoFormat::height, sizeOf>("height"),
};

VideoFormat formatOf(const Node& node) {
    node.requireKeys({"fourcc", "width", "height"}, R"(needs "fourcc", "width" and "height")");
    return objectOf<kFormatKeys>(node);
}

template <class Target, auto read>
constexpr JsonKey<PropertyTarget> targetKey(std::string_view name) {
    return {name, [](const Node& node, PropertyTarget& property) {
                property.target = Target(read(node));
            }};
}

std::map<std::string, std::int64_t> valuesOf(const Node& node) {
    std::map<std::string, std::int64_t> values;
    node.forEachKey([&](const std::string& written, const Node& value) {
        values.emplace(written, integerOf<std::int64_t>(value));
    });
    return values;
}

constexpr JsonKey<PropertyTarget> kTargetKeys[] = {
    targetKey<Control, controlOf>("control"),
    targetKey<ExtensionUnit, extensionUnitOf>("extensionUnit"),
    key<&PropertyTarget::values, valuesOf>("values"),
    key<&PropertyTarget::scale, quantityOf>("scale"),
    key<&PropertyTarget::add, quantityOf>("add"),
    kNote<PropertyTarget>,
};

constexpr std::string_view kAccepted = "accepted";

PropertyTarget targetOf(const Node& node, const std::string& name) {
    PropertyTarget property;
    if (node.json().is_string()) {
        if (node.asText() != kAccepted) {
            node.fail("neither \"accepted\" nor an object");
        }
    } else {
        node.requireKeys({}, "");
        if (node.json().contains("control") == node.json().contains("extensionUnit")) {
            node.fail(R"(needs "control" or "extensionUnit")");
        }
        input::readObject(node, kTargetKeys, property);
        if (const auto* unit = std::get_if<ExtensionUnit>(&property.target);
            unit != nullptr && unit->type.form == DataType::Form::Float) {
            node["extensionUnit"]["type"].fail("a property is written as an integer");
        }
    }
    property.name = name;
    return property;
}

template <std::size_t N>
void requireKnown(const Node& node, const std::string& name, const ShortName (&known)[N]) {
    std::vector<std::string> names;
    for (const ShortName& each : known) {
        names.emplace_back(each.shortName);
    }
    if (std::find(names.begin(), names.end(), name) == names.end()) {
        input::failUnknownKey(node, name, names);
    }
}

std::vector<PropertyTarget> propertiesOf(const Node& node) {
    std::vector<PropertyTarget> properties;
    node.forEachKey([&](const std::string& name, const Node& value) {
        requireKnown(value, name, kProperties);
        if (name != "lightSource") {
            properties.push_back(targetOf(value, name));
            return;
        }
        value.forEachKey([&](const std::string& part, const Node& target) {
            requireKnown(target, part, kLightSourceKeys);
            properties.push_back(targetOf(target, name + "." + part));
        });
    });
    return properties;
}

std::int64_t settingOf(const Node& node) {
    return integerOf<std::int64_t>(node);
}

constexpr JsonKey<ControlSetting> kSettingKeys[] = {
    key<&ControlSetting::control, controlOf>("control"),
    key<&ControlSetting::value, settingOf>("value"),
    kNote<ControlSetting>,
};

ControlSetting controlSettingOf(const Node& node) {
    node.requireKeys({"control", "value"}, R"(needs "control" and "value")");
    return objectOf<kSettingKeys>(node);
}

EventCause causeOf(const Node& node) {
    static constexpr std::pair<std::string_view, EventCause> kChoices[] = {
        {"control", EventCause::ControlChanged},
        {"sourceChange", EventCause::SourceChanged},
        {"errorBuffer", EventCause::ErrorBuffer},
        {"lostFrames", EventCause::LostFrames}};
    return choiceOf(node, kChoices, "cause of an event");
}

std::int32_t codeOf(const Node& node) {
    return node.asInteger<std::int32_t>();
}

constexpr JsonKey<EventRule> kEventKeys[] = {
    key<&EventRule::cause, causeOf>("on"),
    key<&EventRule::control, controlOf>("control"),
    key<&EventRule::code, codeOf>("code"),
    kNote<EventRule>,
};

EventRule eventOf(const Node& node) {
    node.requireKeys({"on", "code"}, R"(needs "on" and "code")");
    EventRule rule = objectOf<kEventKeys>(node);
    if ((rule.cause == EventCause::ControlChanged) != node.json().contains("control")) {
        node.fail(R"("control" belongs to "on": "control")");
    }
    return rule;
}

NumberSource errorCounterOf(const Node& node, const std::string& name) {
    requireKnown(node, name, kErrorCounters);
    NumberSource number = numberOf(node, InErrorCounters);
    number.name = longName(name, kErrorCounters);
    number.key = name;
    return number;
}

// A key of the frames' metadata; others than the known ones may be a camera's own, but not a slip.
NumberSource metadataOf(const Node& node, const std::string& name) {
    const FrameKey* meant = nullptr;
    std::vector<std::string> known;
    for (const FrameKey& each : kFrameKeys) {
        if (each.shortName == name || each.name == name) {
            meant = &each;
        }
        known.emplace_back(each.shortName);
    }
    if (meant == nullptr && !input::nearest(name, known).empty()) {
        input::failUnknownKey(node, name, known);
    }
    NumberSource number = numberOf(node, InMetadata);
    number.name = meant != nullptr ? std::string(meant->name) : name;
    number.key = name;
    return number;
}

std::string portTypeOf(const Node& node) {
    return longName(textOf(node), kPortTypes);
}

std::uint32_t buffersOf(const Node& node) {
    return node.asInteger<std::uint32_t>(2, kMostBuffers);
}

constexpr JsonKey<StreamDescription> kStreamKeys[] = {
    key<&StreamDescription::portType, portTypeOf>("portType"),
    key<&StreamDescription::video, videoOf>("video"),
    key<&StreamDescription::metadataFormat, fourccOf>("metadataFormat"),
    key<&StreamDescription::buffers, buffersOf>("buffers"),
    key<&StreamDescription::formats, listOf<formatOf>>("formats"),
    key<&StreamDescription::properties, propertiesOf>("properties"),
    key<&StreamDescription::beforeStart, listOf<controlSettingOf>>("beforeStart"),
    key<&StreamDescription::metadata, namedOf<metadataOf>>("metadata"),
    key<&StreamDescription::errorCounters, namedOf<errorCounterOf>>("errorCounters"),
    key<&StreamDescription::events, listOf<eventOf>>("events"),
    kNote<StreamDescription>,
};

template <class Entry>
void addUnlessNamed(std::vector<Entry>& entries, Entry entry) {
    if (std::none_of(entries.begin(), entries.end(),
                     [&](const Entry& each) { return each.name == entry.name; })) {
        entries.push_back(std::move(entry));
    }
}

// What holds unless the description says something else.
void addUsual(StreamDescription& stream) {
    if (!stream.formats.empty()) {
        addUnlessNamed(stream.properties, {.name = "formatIndex", .target = FormatChoice()});
    }
    for (const char* const rate : {"minimumFrameRate", "maximumFrameRate"}) {
        addUnlessNamed(stream.properties, {.name = rate, .target = FrameInterval()});
    }
    // A counter that is left out is recorded as 0: as a constant, reports and the check name it.
    for (const ShortName& counter : kErrorCounters) {
        addUnlessNamed(stream.errorCounters, {.name = std::string(counter.name),
                                              .key = std::string(counter.shortName),
                                              .source = Constant{0}});
    }
}

}  // namespace

StreamDescription streamOf(const Node& node, const std::string& name) {
    node.requireKeys({"portType", "video"}, R"(needs "portType" and "video")");
    StreamDescription stream = objectOf<kStreamKeys>(node);
    stream.name = name;
    addUsual(stream);
    for (const NumberSource& number : stream.metadata) {
        if (std::holds_alternative<BufferField>(number.source) && stream.metadataFormat.empty()) {
            node.fail("\"" + number.name +
                      R"(" is in the metadata buffer; it needs "metadataFormat")");
        }
    }
    return stream;
}

}  // namespace linux_device
