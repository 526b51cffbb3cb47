#include "devices/recording/operation.h"

#include <cctype>
#include <iterator>
#include <utility>

#include "platform/text_format.h"

namespace recording {

namespace {

using platform::Dictionary;
using platform::List;
using platform::Value;

// In the order of the enumeration.
constexpr std::string_view kNames[] = {
    "device",
    "streams",
    "requestControlOfStreams",
    "invalidate",
    "valueForProperty",
    "setValue",
    "start",
    "stop",
    "simpleChannels",
    "sample",
    "difference",
    "createManager",
    "enumerateDevicesMatching",
    "devices",
    "open",
    "close",
    "setInputReportCallback",
    "setFeatureReportWithID",
    "scheduleWithRunLoop",
    "unscheduleFromRunLoop",
    "mainDisplay",
    "registryObject",
    "property",
};
static_assert(std::size(kNames) == kOperations);

constexpr std::string_view kObject = "(object)";

// Writes a byte that is not printable as \xHH: two reports never look the same, and the text stays on one line.
std::string escaped(std::string_view text) {
    std::string result;
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if (std::isprint(byte) != 0 && c != '\\') {
            result += c;
        } else {
            constexpr std::string_view kDigits = "0123456789abcdef";
            result += "\\x";
            result += kDigits[byte >> 4U];
            result += kDigits[byte & 15U];
        }
    }
    return result;
}

std::string textOf(const Value& value) {
    if (const auto* number = value.number()) {
        return number->text();
    }
    if (const auto* text = value.string()) {
        return escaped(*text);
    }
    std::string entries;
    const auto add = [&entries](std::string_view key, const Value& entry) {
        entries += entries.empty() ? "" : ", ";
        entries += key;
        entries += textOf(entry);
    };
    if (const auto* list = value.list()) {
        for (const Value& entry : *list) {
            add("", entry);
        }
        return platform::format("[%@]", entries);
    }
    if (const auto* dictionary = value.dictionary()) {
        for (const auto& [key, entry] : *dictionary) {
            add(escaped(key) + ": ", entry);
        }
        return platform::format("{%@}", entries);
    }
    return value.isPresent() ? std::string(kObject) : "nothing";
}

}  // namespace

std::string_view nameOf(Operation operation) {
    return kNames[static_cast<std::size_t>(operation)];
}

Value withoutObjects(const Value& value) {
    if (const auto* list = value.list()) {
        platform::MutableList entries;
        entries.reserve(list->size());
        for (const Value& entry : *list) {
            entries.push_back(withoutObjects(entry));
        }
        return List(std::move(entries));
    }
    if (const auto* dictionary = value.dictionary()) {
        platform::MutableDictionary entries;
        for (const auto& [key, entry] : *dictionary) {
            entries.set(key, withoutObjects(entry));
        }
        return Dictionary(std::move(entries));
    }
    const bool isObject =
        value.isPresent() && value.number() == nullptr && value.string() == nullptr;
    return isObject ? Value(kObject) : value;
}

std::string callText(Operation operation, const Value& arguments) {
    std::string text(nameOf(operation));
    text += '(';
    text += arguments.isPresent() ? textOf(arguments) : "";
    text += ')';
    return text;
}

}  // namespace recording
