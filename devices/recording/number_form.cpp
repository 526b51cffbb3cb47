#include "devices/recording/number_form.h"

#include <bit>
#include <cstdint>
#include <limits>
#include <utility>

#include "devices/recording/coding.h"

namespace recording {

namespace {

using Kind = platform::Number::Kind;

template <class T>
T narrowed(const Json& json) {
    const auto fits = [](auto value) {
        return std::cmp_greater_equal(value, std::numeric_limits<T>::min()) &&
               std::cmp_less_equal(value, std::numeric_limits<T>::max());
    };
    const bool isUnsigned = json.is_number_unsigned();
    if (isUnsigned ? !fits(json.get<std::uint64_t>())
                   : !json.is_number_integer() || !fits(json.get<std::int64_t>())) {
        throw Damage("a number does not fit its kind");
    }
    return static_cast<T>(isUnsigned ? json.get<std::uint64_t>()
                                     : static_cast<std::uint64_t>(json.get<std::int64_t>()));
}

}  // namespace

Json payloadOf(const platform::Number& number) {
    switch (number.kind()) {
        case Kind::Absent:
            return nullptr;
        case Kind::Boolean:
            return number.isTrue();
        case Kind::Float:
            return std::bit_cast<std::uint32_t>(number.asFloat());
        case Kind::Double:
            return number.asDouble();
        default:
            return number.isSigned() ? Json(number.as<std::int64_t>())
                                     : Json(number.as<std::uint64_t>());
    }
}

platform::Number numberOf(Kind kind, const Json& payload) {
    switch (kind) {
        case Kind::Boolean:
            if (payload.is_boolean()) {
                return payload.get<bool>();
            }
            break;
        case Kind::Int8:
            return narrowed<std::int8_t>(payload);
        case Kind::Int16:
            return narrowed<std::int16_t>(payload);
        case Kind::Int32:
            return narrowed<std::int32_t>(payload);
        case Kind::Int64:
            return narrowed<std::int64_t>(payload);
        case Kind::UInt8:
            return narrowed<std::uint8_t>(payload);
        case Kind::UInt16:
            return narrowed<std::uint16_t>(payload);
        case Kind::UInt32:
            return narrowed<std::uint32_t>(payload);
        case Kind::UInt64:
            return narrowed<std::uint64_t>(payload);
        case Kind::Float:
            return std::bit_cast<float>(narrowed<std::uint32_t>(payload));
        case Kind::Double:
            if (payload.is_number_float()) {
                return payload.get<double>();
            }
            break;
        case Kind::Absent:
            break;
    }
    throw Damage("a number is not of its kind");
}

}  // namespace recording
