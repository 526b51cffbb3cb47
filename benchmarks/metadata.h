// The contenders for a frame's metadata: Dictionary with ZRVantorFrameDescription, and maps and JSON values
// that an engineer would use instead. Each is built from the same entries, shared, and described by the same
// look-ups and one allocation.
#ifndef ZR_BENCHMARKS_METADATA_H
#define ZR_BENCHMARKS_METADATA_H

#include <array>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <unordered_map>
#include <utility>
#include <variant>
#include <vector>

#include <absl/container/flat_hash_map.h>
#include <rapidjson/document.h>

#include <nlohmann/json.hpp>

#include "platform/number.h"
#include "platform/value.h"
#include "vantor_fault/frame_description.h"

namespace metadata {

using platform::Number;
using Entries = std::vector<std::pair<std::string, Number>>;

inline constexpr std::size_t kColumns = 18;

// The metadata keys that a description reads, as the header of its table names them.
inline const std::array<std::string, kColumns>& columns() {
    static const auto names = [] {
        std::array<std::string, kColumns> found;
        std::string header = ZRVantorFrameDescription::csvRepresentationHeader();
        header.pop_back();  // the line feed
        for (std::size_t column = kColumns; column-- > 0;) {
            const std::size_t comma = header.rfind(',');
            found[column] = header.substr(comma + 1);
            header.resize(comma);
        }
        return found;
    }();
    return names;
}

// Thirty entries in no order: those that a description reads, and others.
inline Entries frameEntries() {
    Entries entries;
    for (const std::string& key : columns()) {
        const bool temperature = key.find("Temperature") != std::string::npos;
        entries.emplace_back(key, temperature ? Number(27.4) : Number(1));
    }
    for (int other = 0; entries.size() < 30; ++other) {
        entries.emplace_back("MetaDataExposure" + std::to_string(other), other);
    }
    // By a fixed rule, so that every run and every contender has the same order.
    for (std::size_t at = 0; at < entries.size(); ++at) {
        std::swap(entries[at], entries[(at * 17 + 5) % entries.size()]);
    }
    return entries;
}

struct Here {
    static constexpr const char* kName = "here";
    using Metadata = platform::Dictionary;

    static Metadata build(const Entries& entries) {
        platform::MutableDictionary growing;
        growing.reserve(entries.size());
        for (const auto& [key, value] : entries) {
            growing.set(key, value);
        }
        return growing;
    }
    static std::shared_ptr<ZRVantorFrameDescription> describe(std::uint64_t frame,
                                                              platform::MediaTime time,
                                                              const Metadata& metadata) {
        return ZRVantorFrameDescription::descriptionWithMonotonicCount(frame, time, metadata);
    }
};

// What a description holds, in a struct.
struct PlainDescription {
    std::uint64_t monotonicCount;
    platform::MediaTime presentationTime;
    platform::Date creationDate = platform::Date::now();
    std::array<Number, kColumns> numbers;

    const Number& infraredLightSource() const { return numbers[1]; }
};

// `number(key)`: the number under a key, absent without one.
template <class Find>
std::shared_ptr<PlainDescription> describePlainly(std::uint64_t frame,
                                                  platform::MediaTime time,
                                                  const Find& number) {
    constexpr std::size_t kOptionalColumn = 10;
    static const auto& keys = columns();
    auto description = std::make_shared<PlainDescription>();
    description->monotonicCount = frame;
    description->presentationTime = time;
    for (std::size_t column = 0; column < kColumns; ++column) {
        description->numbers[column] = number(std::string_view(keys[column]));
        if (!description->numbers[column].isPresent() && column != kOptionalColumn) {
            return nullptr;
        }
    }
    return description;
}

using PlainValue = std::variant<std::monostate, Number, std::string>;

template <class Map>
struct MapMetadata {
    using Metadata = std::shared_ptr<const Map>;

    static Metadata build(const Entries& entries) {
        auto map = std::make_shared<Map>();
        if constexpr (requires { map->reserve(entries.size()); }) {
            map->reserve(entries.size());
        }
        for (const auto& [key, value] : entries) {
            map->try_emplace(key, value);
        }
        return map;
    }
    static std::shared_ptr<PlainDescription> describe(std::uint64_t frame,
                                                      platform::MediaTime time,
                                                      const Metadata& metadata) {
        return describePlainly(frame, time, [&map = *metadata](std::string_view key) {
            const auto found = map.find(key);
            const Number* number =
                found != map.end() ? std::get_if<Number>(&found->second) : nullptr;
            return number != nullptr ? *number : Number();
        });
    }
};

struct TextHash {
    using is_transparent = void;
    std::size_t operator()(std::string_view text) const {
        return std::hash<std::string_view>()(text);
    }
};
struct TreeMap : MapMetadata<std::map<std::string, PlainValue, std::less<>>> {
    static constexpr const char* kName = "std::map";
};
struct HashMap
    : MapMetadata<std::unordered_map<std::string, PlainValue, TextHash, std::equal_to<>>> {
    static constexpr const char* kName = "std::unordered_map";
};
// Its own hash, for the text type that Debian's build of the library does not know.
struct AbslTextHash {
    using is_transparent = void;
    std::size_t operator()(std::string_view text) const {
        return absl::Hash<absl::string_view>()({text.data(), text.size()});
    }
};
template <class T>
using FlatTextMap = absl::flat_hash_map<std::string, T, AbslTextHash, std::equal_to<>>;
struct FlatHashMap : MapMetadata<FlatTextMap<PlainValue>> {
    static constexpr const char* kName = "absl::flat_hash_map";
};

struct RapidJson {
    static constexpr const char* kName = "RapidJSON";
    using Metadata = std::shared_ptr<const rapidjson::Document>;

    static Metadata build(const Entries& entries) {
        auto document = std::make_shared<rapidjson::Document>(rapidjson::kObjectType);
        auto& memory = document->GetAllocator();
        for (const auto& [key, value] : entries) {
            rapidjson::Value name(key.data(), static_cast<rapidjson::SizeType>(key.size()), memory);
            document->AddMember(name,
                                value.isFloating() ? rapidjson::Value(value.asDouble())
                                                   : rapidjson::Value(value.as<std::int32_t>()),
                                memory);
        }
        return document;
    }
    static std::shared_ptr<PlainDescription> describe(std::uint64_t frame,
                                                      platform::MediaTime time,
                                                      const Metadata& metadata) {
        return describePlainly(frame, time, [&document = *metadata](std::string_view key) {
            const rapidjson::Value name(
                rapidjson::StringRef(key.data(), static_cast<rapidjson::SizeType>(key.size())));
            const auto found = document.FindMember(name);
            if (found == document.MemberEnd() || !found->value.IsNumber()) {
                return Number();
            }
            return found->value.IsInt() ? Number(found->value.GetInt())
                                        : Number(found->value.GetDouble());
        });
    }
};

struct Nlohmann {
    static constexpr const char* kName = "nlohmann::json";
    using Metadata = std::shared_ptr<const nlohmann::json>;

    static Metadata build(const Entries& entries) {
        auto object = std::make_shared<nlohmann::json>(nlohmann::json::object());
        for (const auto& [key, value] : entries) {
            object->emplace(key, value.isFloating() ? nlohmann::json(value.asDouble())
                                                    : nlohmann::json(value.as<std::int32_t>()));
        }
        return object;
    }
    static std::shared_ptr<PlainDescription> describe(std::uint64_t frame,
                                                      platform::MediaTime time,
                                                      const Metadata& metadata) {
        return describePlainly(frame, time, [&object = *metadata](std::string_view key) {
            const auto found = object.find(key);
            if (found == object.end() || !found->is_number()) {
                return Number();
            }
            return found->is_number_integer() ? Number(found->get<std::int32_t>())
                                              : Number(found->get<double>());
        });
    }
};

}  // namespace metadata

#endif
