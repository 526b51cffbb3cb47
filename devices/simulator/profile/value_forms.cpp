#include "devices/simulator/profile/value_forms.h"

#include <charconv>
#include <memory>
#include <string_view>
#include <utility>

namespace simulator {

namespace {

struct ErrorParts {
    std::string domain;
    std::int64_t code = 0;
    std::string message;
    platform::ErrorRef underlying;
};

constexpr JsonKey<ErrorParts> kErrorKeys[] = {
    memberKey<&ErrorParts::domain>("domain"),
    memberKey<&ErrorParts::code>("code"),
    memberKey<&ErrorParts::message>("message"),
    {"underlying",
     [](const JsonNode& node, ErrorParts& parts) {
         parts.underlying = nullptr;
         if (!node.isNull()) {
             readInto(node, parts.underlying);
         }
     },
     [](const ErrorParts& parts) { return jsonOf(parts.underlying); }},
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

void readInto(const JsonNode& node, Fault& place) {
    if (node.isNull()) {
        place = {};
    } else if (node.json().is_boolean()) {
        place = node.asBool() ? Fault::failing(nullptr) : Fault();
    } else if (node.isObject()) {
        platform::ErrorRef error;
        readInto(node, error);
        place = Fault::failing(error);
    } else {
        node.fail("not a fault: true, false, null or an error object");
    }
}

Json jsonOf(const Fault& fault) {
    return fault.error() != nullptr ? jsonOf(fault.error()) : Json(fault.fails());
}

void readInto(const JsonNode& node, platform::ErrorRef& place) {
    node.requireKeys({"domain", "code", "message"},
                     R"(an error object needs "domain", "code" and "message")");
    ErrorParts parts;
    input::readObject(node, kErrorKeys, parts);
    place = std::make_shared<const platform::Error>(parts.domain, parts.code,
                                                    std::move(parts.message), parts.underlying);
}

Json jsonOf(const platform::ErrorRef& error) {
    return error == nullptr
               ? Json()
               : input::writeObject(kErrorKeys, ErrorParts{error->domain(), error->code(),
                                                           error->localizedDescription(),
                                                           error->underlyingError()});
}

NumberRange readRange(const JsonNode& node, const std::string& what) {
    const std::string text = node.json().is_string() ? node.asText() : "";
    std::string_view rest = text;
    NumberRange range;
    range.first = takeOrdinal(rest);
    range.last = range.first;
    if (!rest.empty() && rest.front() == '-') {
        rest.remove_prefix(1);
        range.last = rest.empty() ? kLastNumber : takeOrdinal(rest);
    }
    if (range.first == 0 || range.last < range.first || !rest.empty()) {
        node.fail("not a range of " + what + R"(: "10", "10-20" or "10-", counted from 1)");
    }
    return range;
}

Json jsonOf(const NumberRange& range) {
    const std::string first = std::to_string(range.first);
    return range.last == range.first   ? first
           : range.last == kLastNumber ? first + "-"
                                       : first + "-" + std::to_string(range.last);
}

void readInto(const JsonNode& node, platform::Value& place) {
    const Json& json = node.json();
    switch (json.type()) {
        case Json::value_t::boolean:
            place = node.asBool();
            break;
        case Json::value_t::string:
            place = node.asText();
            break;
        case Json::value_t::number_integer:
        case Json::value_t::number_unsigned:
            place = wholeNumber(json);
            break;
        case Json::value_t::number_float:
            place = node.asDouble();
            break;
        case Json::value_t::array: {
            platform::MutableList entries;
            node.forEachEntry(
                [&](const JsonNode& entry) { readInto(entry, entries.emplace_back()); });
            place = platform::List(std::move(entries));
            break;
        }
        case Json::value_t::object: {
            platform::MutableDictionary entries;
            node.forEachKey([&](const std::string& key, const JsonNode& value) {
                platform::Value entry;
                readInto(value, entry);
                entries.set(key, std::move(entry));
            });
            place = platform::Dictionary(std::move(entries));
            break;
        }
        default:
            place = {};
    }
}

Json jsonOf(const platform::Value& value) {
    if (const std::string* text = value.string()) {
        return *text;
    }
    if (const platform::List* list = value.list()) {
        Json json = Json::array();
        for (const platform::Value& entry : *list) {
            json.push_back(jsonOf(entry));
        }
        return json;
    }
    if (const platform::Dictionary* dictionary = value.dictionary()) {
        Json json = Json::object();
        for (const auto& [key, entry] : *dictionary) {
            json[key] = jsonOf(entry);
        }
        return json;
    }
    const platform::Number number = value.asNumber();
    switch (number.kind()) {
        case platform::Number::Kind::Absent:
            return nullptr;
        case platform::Number::Kind::Boolean:
            return number.isTrue();
        case platform::Number::Kind::UInt64:
            return number.as<std::uint64_t>();
        default:
            return number.isFloating() ? Json(number.asDouble()) : Json(number.as<std::int64_t>());
    }
}

}  // namespace simulator
