// What several parts of a device profile are made of: faults, error objects, ranges, values of any
// kind. Each reads a value of the document or throws a DocumentProblem.
#ifndef ZR_DEVICES_SIMULATOR_PROFILE_VALUE_READERS_H
#define ZR_DEVICES_SIMULATOR_PROFILE_VALUE_READERS_H

#include <concepts>
#include <cstdint>
#include <optional>
#include <string>

#include "devices/simulator/profile/fault.h"
#include "devices/simulator/profile/number_range.h"
#include "input/json_reader.h"
#include "platform/error.h"
#include "platform/value.h"

namespace simulator {

using input::DocumentProblem;
using input::Json;
using input::JsonKey;
using input::JsonNode;
using input::readList;
using input::readNamed;
using input::readObject;

// false and null: the call succeeds; true: it fails without an error object; an object: it fails with
// that error.
Fault readFault(const JsonNode& node);

// {"domain", "code", "message"} and perhaps an "underlying" error; null for null.
platform::ErrorRef readError(const JsonNode& node);

// "10", "10-20", "10-". `what` the numbers count, for the message of an error.
NumberRange readRange(const JsonNode& node, const std::string& what);

// A number of at least `least`; nothing for null.
std::optional<std::uint64_t> readOptional(const JsonNode& node, std::uint64_t least = 0);

// What a device measures, in any unit: a number of a profile that is larger is a mistake.
constexpr double kLargestQuantity = 1e9;

// Numbers keep their kind: a whole one is the smallest of signed 32, signed 64 and unsigned 64 bits
// that holds it, others are doubles. null is a Value that holds nothing.
platform::Value readValue(const JsonNode& node);

// The same into a variable. null is an error for a type that has no such value.
inline void readInto(const JsonNode& node, bool& place) {
    place = node.asBool();
}
inline void readInto(const JsonNode& node, double& place) {
    place = node.asDouble(-kLargestQuantity, kLargestQuantity);
}
inline void readInto(const JsonNode& node, std::string& place) {
    place = node.asText();
}
inline void readInto(const JsonNode& node, Fault& place) {
    place = readFault(node);
}
inline void readInto(const JsonNode& node, platform::Value& place) {
    place = readValue(node);
}
inline void readInto(const JsonNode& node, std::optional<std::uint64_t>& place) {
    place = readOptional(node);
}
template <std::integral T>
void readInto(const JsonNode& node, T& place) {
    place = node.asInteger<T>();
}

// Into the member of an object: what most rows of a table of keys do.
template <class T, class Member>
T ownerOf(Member T::*member);
template <auto Member>
void readMember(const JsonNode& node, decltype(ownerOf(Member))& object) {
    readInto(node, object.*Member);
}

}  // namespace simulator

#endif
