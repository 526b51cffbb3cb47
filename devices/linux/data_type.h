// Numbers in bytes.
#ifndef ZR_DEVICES_LINUX_DATA_TYPE_H
#define ZR_DEVICES_LINUX_DATA_TYPE_H

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "platform/number.h"

namespace linux_device {

struct DataType {
    enum class Form : std::uint8_t { Unsigned, Signed, Float };

    Form form = Form::Unsigned;
    std::size_t size = 1;  // bytes: 1, 2, 4 or 8
    bool isBigEndian = false;
};

// The names of the types, in a fixed order: "u8", "i8", "u16", "u16be" and so on.
std::vector<std::string> dataTypeNames();

// The type of that name; nothing when there is none.
std::optional<DataType> dataTypeOf(const std::string& name);

// The number at the front of the bytes; absent when they are too few.
platform::Number numberIn(std::span<const std::byte> bytes, const DataType& type);

// The bytes of an integer, cut to the size of the type.
std::vector<std::byte> bytesOf(std::int64_t number, const DataType& type);

}  // namespace linux_device

#endif
