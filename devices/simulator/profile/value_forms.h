// What several parts of a device profile are made of: faults, error objects, ranges, values of any kind.
// readInto() reads a value of the document into a variable or throws a DocumentProblem; jsonOf() gives the
// value that reads back to the same. Below them, the rows that most tables of keys are made of.
#ifndef ZR_DEVICES_SIMULATOR_PROFILE_VALUE_FORMS_H
#define ZR_DEVICES_SIMULATOR_PROFILE_VALUE_FORMS_H

#include <concepts>
#include <cstdint>
#include <limits>
#include <optional>
#include <string>
#include <string_view>
#include <type_traits>

#include "devices/simulator/profile/fault.h"
#include "devices/simulator/profile/number_range.h"
#include "input/json_reader.h"
#include "platform/error.h"
#include "platform/value.h"

namespace simulator {

using input::DocumentProblem;
using input::Json;
using input::JsonKey;
using input::JsonNames;
using input::JsonNode;
using input::OwnerOf;

// What a device measures, in any unit: a number of a profile that is larger is a mistake.
constexpr std::int64_t kLargestQuantity = 1'000'000'000;

constexpr std::uint64_t kLastNumber = NumberRange().last;

// Numbers within bounds; null is "nothing" for an optional one.
inline void readNumber(const JsonNode& node, double& place, double least, double most) {
    place = node.asDouble(least, most);
}
template <std::integral T>
void readNumber(const JsonNode& node, T& place, T least, T most) {
    place = node.asInteger<T>(least, most);
}
template <std::integral T>
void readNumber(const JsonNode& node, std::optional<T>& place, T least, T most) {
    place = node.isNull() ? std::nullopt : std::optional(node.asInteger<T>(least, most));
}

inline void readInto(const JsonNode& node, bool& place) {
    place = node.asBool();
}
inline void readInto(const JsonNode& node, double& place) {
    place = node.asDouble(-kLargestQuantity, kLargestQuantity);
}
template <std::integral T>
void readInto(const JsonNode& node, T& place) {
    place = node.asInteger<T>();
}
template <std::integral T>
void readInto(const JsonNode& node, std::optional<T>& place) {
    readNumber(node, place, std::numeric_limits<T>::min(), std::numeric_limits<T>::max());
}
inline void readInto(const JsonNode& node, std::string& place) {
    place = node.asText();
}
// false and null: the call succeeds; true: it fails without an error object; an object: it fails with
// that error.
void readInto(const JsonNode& node, Fault& place);
// {"domain", "code", "message"} and perhaps an "underlying" error. Never null.
void readInto(const JsonNode& node, platform::ErrorRef& place);
// Numbers keep their kind: a whole one is the smallest of signed 32, signed 64 and unsigned 64 bits
// that holds it, others are doubles. null is a Value that holds nothing.
void readInto(const JsonNode& node, platform::Value& place);

// "10", "10-20", "10-". `what` the numbers count, for the message of an error.
NumberRange readRange(const JsonNode& node, const std::string& what);

template <class T>
requires std::is_arithmetic_v<T> Json jsonOf(T value) {
    return value;
}
template <std::integral T>
Json jsonOf(const std::optional<T>& value) {
    return value.has_value() ? Json(*value) : Json();
}
inline Json jsonOf(const std::string& text) {
    return text;
}
Json jsonOf(const Fault& fault);
Json jsonOf(const platform::ErrorRef& error);
Json jsonOf(const NumberRange& range);
Json jsonOf(const platform::Value& value);

// A key for the member of an object.
template <auto Member>
constexpr JsonKey<OwnerOf<Member>> memberKey(std::string_view name) {
    using Owner = OwnerOf<Member>;
    return {name, [](const JsonNode& node, Owner& object) { readInto(node, object.*Member); },
            [](const Owner& object) { return jsonOf(object.*Member); }};
}

// The same for a number within bounds.
template <auto Member, auto least, auto most>
constexpr JsonKey<OwnerOf<Member>> numberKey(std::string_view name) {
    using Owner = OwnerOf<Member>;
    return {
        name,
        [](const JsonNode& node, Owner& object) { readNumber(node, object.*Member, least, most); },
        [](const Owner& object) { return jsonOf(object.*Member); }};
}

// A key for a member that is an object with keys of its own.
template <auto Member, const auto& keys>
constexpr JsonKey<OwnerOf<Member>> objectKey(std::string_view name) {
    using Owner = OwnerOf<Member>;
    return {
        name,
        [](const JsonNode& node, Owner& object) { input::readObject(node, keys, object.*Member); },
        [](const Owner& object) { return input::writeObject(keys, object.*Member); }};
}

// The same for a member that is a list of such objects; the list replaces the one before.
template <auto Member, const auto& keys>
constexpr JsonKey<OwnerOf<Member>> listKey(std::string_view name) {
    using Owner = OwnerOf<Member>;
    return {
        name,
        [](const JsonNode& node, Owner& object) { object.*Member = input::readList(node, keys); },
        [](const Owner& object) { return input::writeList(keys, object.*Member); }};
}

// The same for a member that is a list of such objects with names.
template <auto Member, const auto& keys, const auto& names>
constexpr JsonKey<OwnerOf<Member>> namedKey(std::string_view name) {
    using Owner = OwnerOf<Member>;
    return {name,
            [](const JsonNode& node, Owner& object) {
                input::readNamed(node, keys, names, object.*Member);
            },
            [](const Owner& object) { return input::writeNamed(keys, names, object.*Member); }};
}

// A key for some members of the object itself, under a common name.
template <const auto& keys>
constexpr auto groupKey(std::string_view name) {
    using Owner = typename std::remove_cvref_t<decltype(keys[0])>::Object;
    return JsonKey<Owner>{
        name, [](const JsonNode& node, Owner& object) { input::readObject(node, keys, object); },
        [](const Owner& object) { return input::writeObject(keys, object); }};
}

}  // namespace simulator

#endif
