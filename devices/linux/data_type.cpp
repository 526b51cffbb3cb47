#include "devices/linux/data_type.h"

#include <algorithm>
#include <bit>

namespace linux_device {

namespace {

struct NamedType {
    const char* name;
    DataType type;
};

using Form = DataType::Form;

constexpr NamedType kTypes[] = {
    {"u8", {Form::Unsigned, 1}},
    {"i8", {Form::Signed, 1}},
    {"u16", {Form::Unsigned, 2}},
    {"i16", {Form::Signed, 2}},
    {"u32", {Form::Unsigned, 4}},
    {"i32", {Form::Signed, 4}},
    {"u64", {Form::Unsigned, 8}},
    {"i64", {Form::Signed, 8}},
    {"f32", {Form::Float, 4}},
    {"f64", {Form::Float, 8}},
    {"u16be", {Form::Unsigned, 2, true}},
    {"i16be", {Form::Signed, 2, true}},
    {"u32be", {Form::Unsigned, 4, true}},
    {"i32be", {Form::Signed, 4, true}},
    {"u64be", {Form::Unsigned, 8, true}},
    {"i64be", {Form::Signed, 8, true}},
    {"f32be", {Form::Float, 4, true}},
    {"f64be", {Form::Float, 8, true}},
};

constexpr unsigned kBitsPerByte = 8;

// Where the byte of that worth stands.
std::size_t placeOf(std::size_t worth, const DataType& type) {
    return type.isBigEndian ? type.size - 1 - worth : worth;
}

}  // namespace

std::vector<std::string> dataTypeNames() {
    std::vector<std::string> names;
    for (const NamedType& type : kTypes) {
        names.emplace_back(type.name);
    }
    return names;
}

std::optional<DataType> dataTypeOf(const std::string& name) {
    for (const NamedType& type : kTypes) {
        if (name == type.name) {
            return type.type;
        }
    }
    return std::nullopt;
}

platform::Number numberIn(std::span<const std::byte> bytes, const DataType& type) {
    if (bytes.size() < type.size) {
        return {};
    }
    std::uint64_t bits = 0;
    for (std::size_t worth = 0; worth < std::min(type.size, sizeof bits); ++worth) {
        bits |= std::to_integer<std::uint64_t>(bytes[placeOf(worth, type)])
                << (kBitsPerByte * worth);
    }
    switch (type.form) {
        case Form::Unsigned:
            return bits;
        case Form::Signed: {
            const std::size_t used = std::clamp<std::size_t>(type.size, 1, sizeof bits);
            const auto unused = static_cast<unsigned>(kBitsPerByte * (sizeof bits - used));
            return static_cast<std::int64_t>(bits << unused) >> unused;
        }
        default:
            return type.size == sizeof(float)
                       ? platform::Number(std::bit_cast<float>(static_cast<std::uint32_t>(bits)))
                       : platform::Number(std::bit_cast<double>(bits));
    }
}

std::vector<std::byte> bytesOf(std::int64_t number, const DataType& type) {
    std::vector<std::byte> bytes(type.size);
    for (std::size_t worth = 0; worth < type.size; ++worth) {
        bytes[placeOf(worth, type)] =
            static_cast<std::byte>(static_cast<std::uint64_t>(number) >> (kBitsPerByte * worth));
    }
    return bytes;
}

}  // namespace linux_device
