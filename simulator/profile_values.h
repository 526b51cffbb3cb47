// What several parts of a device profile are made of: faults, error objects, ranges, values of any
// kind. Each reads a value of the document or throws a DocumentProblem.
#ifndef ZR_SIMULATOR_PROFILE_VALUES_H
#define ZR_SIMULATOR_PROFILE_VALUES_H

#include <cstdint>
#include <optional>
#include <string>
#include <utility>

#include "platform/error.h"
#include "platform/value.h"
#include "simulator/fault.h"
#include "simulator/json_reader.h"

namespace simulator {

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

// The member `M` of an object from a value of its kind: what most rows of a table of keys are.
template <auto M>
struct ReadMember;
template <class T, class Member, Member T::*M>
struct ReadMember<M> {
    static void read(const JsonNode& node, T& object) { object.*M = convert(node, object.*M); }

  private:
    static bool convert(const JsonNode& node, bool /*kind*/) { return node.asBool(); }
    static double convert(const JsonNode& node, double /*kind*/) {
        return node.asDouble(-kLargestQuantity, kLargestQuantity);
    }
    static std::string convert(const JsonNode& node, const std::string& /*kind*/) {
        return node.asText();
    }
    static Fault convert(const JsonNode& node, const Fault& /*kind*/) { return readFault(node); }
    static platform::Value convert(const JsonNode& node, const platform::Value& /*kind*/) {
        return readValue(node);
    }
    static std::optional<std::uint64_t> convert(const JsonNode& node,
                                                const std::optional<std::uint64_t>& /*kind*/) {
        return readOptional(node);
    }
    template <std::integral I>
    static I convert(const JsonNode& node, I /*kind*/) {
        return node.asInteger<I>();
    }
};
template <auto M>
constexpr auto readMember = &ReadMember<M>::read;

}  // namespace simulator

#endif
