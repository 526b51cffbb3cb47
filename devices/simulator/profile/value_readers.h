// What several parts of a device profile are made of: faults, error objects, ranges, values of any
// kind. Each reads a value of the document or throws a DocumentProblem.
#ifndef ZR_DEVICES_SIMULATOR_PROFILE_VALUE_READERS_H
#define ZR_DEVICES_SIMULATOR_PROFILE_VALUE_READERS_H

#include <concepts>
#include <cstdint>
#include <optional>
#include <string>
#include <utility>

#include "devices/simulator/profile/fault.h"
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

// {"domain", "code", "message"} and perhaps an "underlying" error; null is no error object.
platform::ErrorRef readError(const JsonNode& node);

// "10", "10-20", "10-": numbers from 1, the last one included. `what` they number.
std::pair<std::uint64_t, std::uint64_t> readRange(const JsonNode& node, const std::string& what);

// A number of at least `least`; null is none.
std::optional<std::uint64_t> readOptional(const JsonNode& node, std::uint64_t least = 0);

// What a device measures, in any unit: beyond this a number of the profile is a slip.
constexpr double kLargestQuantity = 1e9;

// Numbers keep their kind: a whole one is the smallest of signed 32, signed 64 and unsigned 64 bits
// that holds it, others are doubles. null holds nothing.
platform::Value readValue(const JsonNode& node);

// The same into a place of its kind; a null that the kind has no room for is an error.
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
