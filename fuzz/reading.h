// What a number reads as, worked out another way than the product does: from its text, in exact arithmetic
// (a long double holds every integer of 64 bits).
#ifndef ZR_FUZZ_READING_H
#define ZR_FUZZ_READING_H

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <limits>
#include <string>

#include "platform/number.h"

namespace fuzz {

static_assert(std::numeric_limits<long double>::digits >= 64);

inline long double exactly(const platform::Number& number) {
    const std::string text = number.isPresent() ? number.text() : "0";
    switch (number.kind()) {
        case platform::Number::Kind::Float:
            return std::strtof(text.c_str(), nullptr);
        case platform::Number::Kind::Double:
            return std::strtod(text.c_str(), nullptr);
        default:
            return std::strtold(text.c_str(), nullptr);
    }
}

// Floating point is truncated and kept within T, NaN is 0; integers wrap around.
template <class T>
T readAs(const platform::Number& number) {
    constexpr long double kLeast = std::numeric_limits<T>::min();
    constexpr long double kMost = std::numeric_limits<T>::max();
    constexpr long double kSpan = kMost - kLeast + 1;
    long double value = exactly(number);
    if (std::isnan(value)) {
        return 0;
    }
    if (number.isFloating()) {
        return static_cast<T>(std::clamp(std::trunc(value), kLeast, kMost));
    }
    value = std::fmod(value, kSpan);
    value += value < kLeast ? kSpan : value > kMost ? -kSpan : 0;
    return static_cast<T>(value);
}

}  // namespace fuzz

#endif
