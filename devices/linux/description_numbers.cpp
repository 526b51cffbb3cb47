#include "devices/linux/description_numbers.h"

#include <algorithm>
#include <cstddef>
#include <iterator>
#include <regex>

namespace linux_device {

namespace {

constexpr unsigned kMostShift = 63;
constexpr double kLongestCache = 3600;  // seconds

std::optional<std::uint64_t> maskOf(const Node& node) {
    return integerOf<std::uint64_t>(node);
}

unsigned shiftOf(const Node& node) {
    return node.asInteger<unsigned>(0, kMostShift);
}

DataType typeOf(const Node& node) {
    const std::string name = node.asText();
    if (const auto type = dataTypeOf(name)) {
        return *type;
    }
    const std::string meant = input::didYouMean(name, dataTypeNames());
    node.fail("no such data type" + (meant.empty() ? R"(; "u16" and "u16be" are some)" : meant));
}

std::string pathOf(const Node& node) {
    std::string path = node.asText();
    if (!path.starts_with('/')) {
        node.fail("not an absolute path");
    }
    return path;
}

// 2, "2-5", "2-".
std::optional<FieldRange> fieldOf(const Node& node) {
    FieldRange range;
    if (!node.json().is_string()) {
        range.first = node.asInteger<std::size_t>(1);
        range.last = range.first;
        return range;
    }
    const std::string text = node.asText();
    const std::size_t dash = text.find('-');
    const platform::Number first = parseNumber(text.substr(0, dash));
    const bool isOpen = dash != std::string::npos && dash + 1 == text.size();
    const platform::Number last =
        dash == std::string::npos || isOpen ? first : parseNumber(text.substr(dash + 1));
    range.first = first.as<std::size_t>();
    range.last = isOpen ? std::nullopt : std::optional(last.as<std::size_t>());
    if (!first.isPresent() || !last.isPresent() || range.first < 1 ||
        (!isOpen && *range.last < range.first)) {
        node.fail(R"(not a field: 2, "2-5" or "2-", counted from 1)");
    }
    return range;
}

std::uint8_t unitOf(const Node& node) {
    return node.asInteger<std::uint8_t>(1);
}

constexpr JsonKey<ExtensionUnit> kExtensionUnitKeys[] = {
    key<&ExtensionUnit::unit, unitOf>("unit"),
    key<&ExtensionUnit::selector, unitOf>("selector"),
    key<&ExtensionUnit::type, typeOf>("type"),
};

// What the keys of a number say before it is known what belongs together.
struct SourceParts {
    NumberSource number;
    FileNumber file;
    BufferField buffer;
    DataType type;
};

template <auto read>
constexpr JsonKey<SourceParts> sourceKey(std::string_view name) {
    return {name, [](const Node& node, SourceParts& parts) { parts.number.source = read(node); }};
}

template <auto Member, auto read>
constexpr JsonKey<SourceParts> numberKey(std::string_view name) {
    return {name, [](const Node& node, SourceParts& parts) { parts.number.*Member = read(node); }};
}

template <auto Member, auto read>
constexpr JsonKey<SourceParts> conversionKey(std::string_view name) {
    return {name, [](const Node& node, SourceParts& parts) {
                parts.number.conversion.*Member = read(node);
            }};
}

template <StreamCount count>
StreamCount streamCountOf(const Node& node) {
    if (!node.asBool()) {
        node.fail("not true");
    }
    return count;
}

Constant constantOf(const Node& node) {
    if (node.json().is_boolean()) {
        return {node.asBool()};
    }
    const double number = quantityOf(node);
    return {node.json().is_number_integer() ? platform::Number(node.asInteger<std::int64_t>())
                                            : platform::Number(number)};
}

void readPattern(const Node& node, SourceParts& parts) {
    parts.file.matchText = textOf(node);
    try {
        parts.file.match.emplace(parts.file.matchText);
    } catch (const std::regex_error& problem) {
        node.fail(std::string("not a regular expression: ") + problem.what());
    }
}

constexpr JsonKey<SourceParts> kSourceKeys[] = {
    {"file", [](const Node& node, SourceParts& parts) { parts.file.file.path = pathOf(node); }},
    {"where", [](const Node& node, SourceParts& parts) { parts.file.file.where = whereOf(node); }},
    {"match", readPattern},
    {"field", [](const Node& node, SourceParts& parts) { parts.file.field = fieldOf(node); }},
    {"at",
     [](const Node& node, SourceParts& parts) {
         parts.buffer.at = node.asInteger<std::size_t>(0, std::size_t{1} << 16U);
     }},
    {"type", [](const Node& node, SourceParts& parts) { parts.buffer.type = typeOf(node); }},
    sourceKey<controlOf>("control"),
    sourceKey<extensionUnitOf>("extensionUnit"),
    sourceKey<constantOf>("constant"),
    sourceKey<streamCountOf<StreamCount::LostFrames>>("lostFrames"),
    sourceKey<streamCountOf<StreamCount::ErrorBuffers>>("errorBuffers"),
    conversionKey<&Conversion::mask, maskOf>("mask"),
    conversionKey<&Conversion::shift, shiftOf>("shift"),
    conversionKey<&Conversion::scale, quantityOf>("scale"),
    conversionKey<&Conversion::add, quantityOf>("add"),
    numberKey<&NumberSource::optional, boolOf>("optional"),
    numberKey<&NumberSource::sinceStart, boolOf>("sinceStart"),
    {"atMostEvery",
     [](const Node& node, SourceParts& parts) {
         parts.number.atMostEvery = node.asDouble(0, kLongestCache);
     }},
    kNote<SourceParts>,
};

// The kinds of sources, each with the keys that only it has, and where it may stand.
struct SourceKind {
    std::string_view key;
    unsigned places;
    std::vector<std::string_view> furtherKeys = {};
};

const std::vector<SourceKind>& sourceKinds() {
    static const auto& kinds = *new std::vector<SourceKind>{
        {"file", InMetadata | InErrorCounters | InChannels, {"where", "match", "field"}},
        {"constant", InMetadata | InErrorCounters | InChannels},
        {"control", InMetadata | InErrorCounters},
        {"extensionUnit", InMetadata | InErrorCounters},
        {"at", InMetadata, {"type"}},
        {"lostFrames", InErrorCounters},
        {"errorBuffers", InErrorCounters},
    };
    return kinds;
}

// Which kind the object has; fails unless it is exactly one, may stand here and has only keys of its own.
std::string_view kindOf(const Node& node, Place place) {
    std::string_view found;
    std::string allowed;
    for (const SourceKind& kind : sourceKinds()) {
        if ((kind.places & place) != 0) {
            allowed += (allowed.empty() ? "\"" : ", \"") + std::string(kind.key) + "\"";
        }
        if (node.json().contains(kind.key)) {
            if (!found.empty()) {
                node.fail("has \"" + std::string(found) + "\" and \"" + std::string(kind.key) +
                          "\"; a number has one source");
            }
            found = kind.key;
        }
    }
    for (const SourceKind& kind : sourceKinds()) {
        if (kind.key == found) {
            if ((kind.places & place) == 0) {
                node.fail("\"" + std::string(found) + "\" cannot stand here; what can: " + allowed);
            }
            continue;
        }
        for (const std::string_view further : kind.furtherKeys) {
            if (node.json().contains(further)) {
                node.fail("\"" + std::string(further) + "\" needs \"" + std::string(kind.key) +
                          "\"");
            }
        }
    }
    if (found.empty()) {
        node.fail("needs a source: one of " + allowed);
    }
    return found;
}

FileNumber fileNumberOf(const Node& node, FileNumber file) {
    if (!file.file.where.empty() && file.file.path.find_first_of("*?[") == std::string::npos) {
        node.fail("\"where\" chooses among what a wildcard matches; the path has none");
    }
    if (file.match.has_value() && !file.field.has_value() && file.match->mark_count() == 0) {
        node.fail(R"("match" needs a group around the number, or "field")");
    }
    return file;
}

NumberSource finished(const Node& node, SourceParts parts, std::string_view kind) {
    if (kind == "file") {
        parts.number.source = fileNumberOf(node, std::move(parts.file));
    } else if (kind == "at") {
        node.requireKeys({"type"}, R"("at" needs "type")");
        parts.number.source = parts.buffer;
    }
    return std::move(parts.number);
}

Restarts restartsOf(const Node& node) {
    static constexpr std::pair<std::string_view, Restarts> kChoices[] = {
        {"never", Restarts::Never},
        {"streamStart", Restarts::AtStreamStart},
        {"anyTime", Restarts::AtAnyTime}};
    return choiceOf(node, kChoices, "way to restart");
}

constexpr JsonKey<CounterChannel> kChannelKeys[] = {
    key<&CounterChannel::group, textOf>("group"),
    key<&CounterChannel::subgroup, textOf>("subgroup"),
    key<&CounterChannel::restarts, restartsOf>("restarts"),
};

}  // namespace

Control controlOf(const Node& node) {
    return {textOf(node)};
}

ExtensionUnit extensionUnitOf(const Node& node) {
    node.requireKeys({"unit", "selector", "type"}, R"(needs "unit", "selector" and "type")");
    return objectOf<kExtensionUnitKeys>(node);
}

NumberSource numberOf(const Node& node, Place place) {
    node.requireKeys({}, "");  // an object
    const std::string_view kind = kindOf(node, place);
    SourceParts parts;
    input::readObject(node, kSourceKeys, parts);
    return finished(node, std::move(parts), kind);
}

// Its own keys are those of the channel and of a number.
CounterChannel channelOf(const Node& node, const std::string& name) {
    node.requireKeys({"group", "subgroup"}, R"(needs "group" and "subgroup")");
    const std::string_view kind = kindOf(node, InChannels);
    CounterChannel channel{.name = name, .group = {}, .subgroup = {}};
    SourceParts parts;
    std::vector<std::string> known;
    node.forEachKey([&](const std::string& key, const Node& value) {
        const auto read = [&](const auto& keys, auto& object) {
            return std::any_of(std::begin(keys), std::end(keys), [&](const auto& each) {
                known.emplace_back(each.name);
                const bool isMeant = each.name == key;
                if (isMeant) {
                    each.read(value, object);
                }
                return isMeant;
            });
        };
        if (!read(kChannelKeys, channel) && !read(kSourceKeys, parts)) {
            input::failUnknownKey(value, key, known);
        }
    });
    channel.count = finished(node, std::move(parts), kind);
    channel.count.name = name;
    channel.count.key = name;
    return channel;
}

}  // namespace linux_device
