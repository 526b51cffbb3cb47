#include "platform/number.h"

#include <charconv>
#include <cmath>

namespace platform {

namespace {

constexpr std::size_t kLongestText = 32;  // a double's has up to 24 characters

std::string integerText(std::integral auto value) {
    char buffer[kLongestText];
    return {buffer, std::to_chars(buffer, buffer + sizeof buffer, value).ptr};
}

std::string floatingText(std::floating_point auto value) {
    if (std::isnan(value)) {
        return "nan";
    }
    constexpr decltype(value) kLargestPlain = 0x1p53;
    char buffer[kLongestText];
    const bool isPlain = std::abs(value) <= kLargestPlain && std::trunc(value) == value;
    const auto end =
        isPlain ? std::to_chars(buffer, buffer + sizeof buffer, value, std::chars_format::fixed)
                : std::to_chars(buffer, buffer + sizeof buffer, value);
    return {buffer, end.ptr};
}

}  // namespace

std::string Number::text() const {
    switch (_kind) {
        case Kind::Absent:
            return "(null)";
        case Kind::Float:
            return floatingText(asFloat());
        case Kind::Double:
            return floatingText(asDouble());
        default:
            return isSigned() ? integerText(as<std::int64_t>()) : integerText(_bits);
    }
}

}  // namespace platform
