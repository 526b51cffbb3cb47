#include "devices/simulator/profile/value_readers.h"

#include <charconv>
#include <limits>
#include <memory>
#include <string_view>
#include <utility>

namespace simulator {

namespace {

struct ErrorParts {
    std::optional<std::string> domain;
    std::optional<std::int64_t> code;
    std::optional<std::string> message;
    platform::ErrorRef underlying;
};

constexpr JsonKey<ErrorParts> kErrorKeys[] = {
    {"domain", [](const JsonNode& node, ErrorParts& parts) { parts.domain = node.asText(); }},
    {"code",
     [](const JsonNode& node, ErrorParts& parts) { parts.code = node.asInteger<std::int64_t>(); }},
    {"message", [](const JsonNode& node, ErrorParts& parts) { parts.message = node.asText(); }},
    {"underlying",
     [](const JsonNode& node, ErrorParts& parts) { parts.underlying = readError(node); }},
};

// Takes a number from 1 off the front of `text`; 0 when there is none.
std::uint64_t takeOrdinal(std::string_view& text) {
    std::uint64_t number = 0;
    const auto [end, problem] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (problem != std::errc()) {
        return 0;
    }
    text.remove_prefix(static_cast<std::size_t>(end - text.data()));
    return number;
}

platform::Number wholeNumber(const Json& json) {
    if (json.is_number_unsigned() && !std::in_range<std::int64_t>(json.get<std::uint64_t>())) {
        return json.get<std::uint64_t>();
    }
    const auto number = json.get<std::int64_t>();
    return std::in_range<std::int32_t>(number) ? platform::Number(static_cast<std::int32_t>(number))
                                               : platform::Number(number);
}

}  // namespace

Fault readFault(const JsonNode& node) {
    if (node.isObject()) {
        return Fault::failing(readError(node));
    }
    if (node.isNull()) {
        return {};
    }
    if (!node.json().is_boolean()) {
        node.fail("not a fault: true, false, null or an error object");
    }
    return node.asBool() ? Fault::failing(nullptr) : Fault();
}

platform::ErrorRef readError(const JsonNode& node) {
    if (node.isNull()) {
        return nullptr;
    }
    ErrorParts parts;
    readObject(node, kErrorKeys, parts);
    if (!parts.domain.has_value() || !parts.code.has_value() || !parts.message.has_value()) {
        node.fail(R"(an error object needs "domain", "code" and "message")");
    }
    return std::make_shared<const platform::Error>(*parts.domain, *parts.code,
                                                   std::move(*parts.message), parts.underlying);
}

NumberRange readRange(const JsonNode& node, const std::string& what) {
    const std::string text = node.json().is_string() ? node.asText() : "";
    std::string_view rest = text;
    NumberRange range;
    range.first = takeOrdinal(rest);
    range.last = range.first;
    if (!rest.empty() && rest.front() == '-') {
        rest.remove_prefix(1);
        range.last = rest.empty() ? std::numeric_limits<std::uint64_t>::max() : takeOrdinal(rest);
    }
    if (range.first == 0 || range.last < range.first || !rest.empty()) {
        node.fail("not a range of " + what + R"(: "10", "10-20" or "10-", counted from 1)");
    }
    return range;
}

std::optional<std::uint64_t> readOptional(const JsonNode& node, std::uint64_t least) {
    return node.isNull() ? std::nullopt : std::optional(node.asInteger<std::uint64_t>(least));
}

platform::Value readValue(const JsonNode& node) {
    const Json& json = node.json();
    switch (json.type()) {
        case Json::value_t::boolean:
            return node.asBool();
        case Json::value_t::string:
            return node.asText();
        case Json::value_t::number_integer:
        case Json::value_t::number_unsigned:
            return wholeNumber(json);
        case Json::value_t::number_float:
            return node.asDouble();
        case Json::value_t::array: {
            platform::MutableList entries;
            node.forEachEntry([&](const JsonNode& entry) { entries.push_back(readValue(entry)); });
            return platform::List(std::move(entries));
        }
        case Json::value_t::object: {
            platform::MutableDictionary entries;
            node.forEachKey([&](const std::string& key, const JsonNode& value) {
                entries.set(key, readValue(value));
            });
            return platform::Dictionary(std::move(entries));
        }
        default:
            return {};
    }
}

}  // namespace simulator
