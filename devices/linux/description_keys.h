// What the tables of keys of a port description are made of: readers of values, and rows for members of an object.
#ifndef ZR_DEVICES_LINUX_DESCRIPTION_KEYS_H
#define ZR_DEVICES_LINUX_DESCRIPTION_KEYS_H

#include <concepts>
#include <cstdint>
#include <limits>
#include <optional>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <vector>

#include "devices/linux/description.h"
#include "input/json_reader.h"
#include "input/nearest.h"

namespace linux_device {

using input::JsonKey;
using Node = input::JsonNode;

// Each of these fails about a value that does not fit.

inline std::string textOf(const Node& node) {
    std::string text = node.asText();
    if (text.empty()) {
        node.fail("empty");
    }
    return text;
}

inline bool boolOf(const Node& node) {
    return node.asBool();
}

inline double quantityOf(const Node& node) {
    constexpr double kLargest = 1e12;
    return node.asDouble(-kLargest, kLargest);
}

// Also "0x1234", as tools print identities and masks.
template <std::integral T>
T integerOf(const Node& node) {
    if (!node.json().is_string()) {
        return node.asInteger<T>();
    }
    const std::string text = node.asText();
    const platform::Number number = text.starts_with("0x") ? parseNumber(text) : platform::Number();
    if (!number.isPresent() || !std::in_range<T>(number.as<std::uint64_t>())) {
        node.fail("not a number such as \"0x1f\" of at most " +
                  std::to_string(std::numeric_limits<T>::max()));
    }
    return number.as<T>();
}

inline std::optional<std::uint16_t> identityOf(const Node& node) {
    return integerOf<std::uint16_t>(node);
}

// One of the names of a table; says which one may have been meant.
template <class T, std::size_t N>
T choiceOf(const Node& node,
           const std::pair<std::string_view, T> (&choices)[N],
           const std::string& kind) {
    const std::string name = node.asText();
    std::vector<std::string> names;
    for (const auto& [known, value] : choices) {
        if (known == name) {
            return value;
        }
        names.emplace_back(known);
    }
    std::string all;
    for (const std::string& known : names) {
        all += (all.empty() ? "" : ", ") + known;
    }
    const std::string meant = input::didYouMean(name, names);
    node.fail("no such " + kind + (meant.empty() ? "; there are " + all : meant));
}

inline std::vector<std::pair<std::string, std::string>> whereOf(const Node& node) {
    std::vector<std::pair<std::string, std::string>> where;
    node.forEachKey([&](const std::string& file, const Node& content) {
        where.emplace_back(file, content.asText());
    });
    return where;
}

// A key whose value `read` gives, for a member of the object.
template <auto Member, auto read>
constexpr JsonKey<input::OwnerOf<Member>> key(std::string_view name) {
    return {name,
            [](const Node& node, input::OwnerOf<Member>& object) { object.*Member = read(node); }};
}

// A remark of the author: JSON has no other place for one.
template <class T>
inline constexpr JsonKey<T> kNote = {"note",
                                     [](const Node& node, T& /*object*/) { node.asText(); }};

// Objects that are read from a table of keys.
template <const auto& keys>
auto objectOf(const Node& node) {
    typename std::remove_cvref_t<decltype(keys[0])>::Object object;
    input::readObject(node, keys, object);
    return object;
}

// Values that are named by their keys.
template <auto read>
auto namedOf(const Node& node) {
    std::vector<decltype(read(node, std::string()))> list;
    node.forEachKey(
        [&](const std::string& name, const Node& value) { list.push_back(read(value, name)); });
    return list;
}

template <auto read>
auto listOf(const Node& node) {
    std::vector<decltype(read(node))> list;
    node.forEachEntry([&](const Node& entry) { list.push_back(read(entry)); });
    return list;
}

template <class T, UsbIdentity T::*identity, auto Member, auto read>
constexpr JsonKey<T> identityKey(std::string_view name) {
    return {name, [](const Node& node, T& object) { object.*identity.*Member = read(node); }};
}

}  // namespace linux_device

#endif
