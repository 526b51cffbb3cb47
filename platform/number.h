// Number: a boxed numeric value that keeps the kind it was made with.
//
// Parameters, capture metadata and result values travel as numbers. A number is a small value:
// copy it. It may be absent; an absent number reads as zero in every conversion.
//
// Conversions are total, so that no input from a device or a host can be undefined behaviour:
//   integer or boolean to an integer of width n   modulo 2^n, as C converts between integers
//   floating point to an integer                  truncated toward zero, saturated at the target's
//                                                 limits; NaN gives 0
//   anything to double                            the nearest double
// A float and a double keep their bits, those of a NaN included.
#ifndef ZR_PLATFORM_NUMBER_H
#define ZR_PLATFORM_NUMBER_H

#include <bit>
#include <concepts>
#include <cstdint>
#include <limits>
#include <string>
#include <type_traits>

namespace platform {

template <class T, class... Types>
concept OneOf = (std::same_as<T, Types> || ...);

// What a Number can box. Characters are not numbers.
template <class T>
concept Arithmetic = std::is_arithmetic_v<T> && sizeof(T) <= 8 &&
                     !OneOf<T, char, wchar_t, char8_t, char16_t, char32_t>;

class Number {
  public:
    enum class Kind : std::uint8_t {
        Absent,
        Boolean,
        Int8,
        Int16,
        Int32,
        Int64,
        UInt8,
        UInt16,
        UInt32,
        UInt64,
        Float,
        Double,
    };

    // An absent number.
    constexpr Number() noexcept = default;

    // Boxes `value` and keeps its kind. Implicit: a plain value serves wherever a number is expected.
    template <Arithmetic T>
    constexpr Number(T value) noexcept : _bits(_bitsOf(value)), _kind(kindOf<T>()) {}

    constexpr Kind kind() const noexcept { return _kind; }
    constexpr bool isPresent() const noexcept { return _kind != Kind::Absent; }
    constexpr bool isFloating() const noexcept { return _kind >= Kind::Float; }
    constexpr bool isSigned() const noexcept { return _kind >= Kind::Int8 && _kind <= Kind::Int64; }

    // The value as an integer of type T, converted as the table above says.
    template <std::integral T>
    requires(!std::same_as<T, bool>) constexpr T as() const noexcept {
        return isFloating() ? _saturated<T>(asDouble()) : static_cast<T>(_bits);
    }

    constexpr double asDouble() const noexcept {
        if (_kind == Kind::Double) {
            return std::bit_cast<double>(_bits);
        }
        if (_kind == Kind::Float) {
            return static_cast<double>(asFloat());
        }
        return isSigned() ? static_cast<double>(static_cast<std::int64_t>(_bits))
                          : static_cast<double>(_bits);
    }

    // The value that was boxed as a float, bit by bit. For a number of another kind the nearest float.
    constexpr float asFloat() const noexcept {
        return _kind == Kind::Float ? std::bit_cast<float>(static_cast<std::uint32_t>(_bits))
                                    : static_cast<float>(asDouble());
    }

    // Truth value: any present number other than zero, NaN included.
    constexpr bool isTrue() const noexcept { return isFloating() ? asDouble() != 0.0 : _bits != 0; }

    // Plain decimal for integers, 1 and 0 for booleans, "(null)" when absent. For floating point:
    // plain decimal without a fraction when the value is integral and at most 2^53 in magnitude, else
    // the shortest text that reads back to the same value; "nan" for every NaN, "inf" and "-inf".
    std::string text() const;

    // Same kind and same value; a NaN equals nothing, absent equals absent.
    friend constexpr bool operator==(const Number& a, const Number& b) noexcept {
        return a._kind == b._kind && (a.isFloating() ? a.asDouble() == b.asDouble()  //
                                                     : a._bits == b._bits);
    }

    template <Arithmetic T>
    static constexpr Kind kindOf() noexcept {
        if constexpr (std::same_as<std::remove_cv_t<T>, bool>) {
            return Kind::Boolean;
        } else if constexpr (std::floating_point<T>) {
            return sizeof(T) == 4 ? Kind::Float : Kind::Double;
        } else {
            constexpr Kind kFirst = std::is_signed_v<T> ? Kind::Int8 : Kind::UInt8;
            return static_cast<Kind>(static_cast<int>(kFirst) + std::countr_zero(sizeof(T)));
        }
    }

  private:
    template <class T>
    static constexpr std::uint64_t _bitsOf(T value) noexcept {
        if constexpr (std::floating_point<T>) {
            using Bits = std::conditional_t<sizeof(T) == 4, std::uint32_t, std::uint64_t>;
            return std::bit_cast<Bits>(value);
        } else {
            return static_cast<std::uint64_t>(value);
        }
    }

    template <class T>
    static constexpr T _saturated(double value) noexcept {
        using Limits = std::numeric_limits<T>;
        constexpr double kPastMax = 2.0 * static_cast<double>(T{1} << (Limits::digits - 1));
        if (value != value) {
            return 0;
        }
        if (value >= kPastMax) {
            return Limits::max();
        }
        if (value <= static_cast<double>(Limits::min())) {
            return Limits::min();
        }
        return static_cast<T>(value);
    }

    // Integers: two's complement, extended to 64 bits. Floating point: the value's own bits.
    std::uint64_t _bits = 0;
    Kind _kind = Kind::Absent;
};

}  // namespace platform

#endif
