#include "platform/number.h"

#include <charconv>

namespace platform {

namespace {

template <class T>
std::string decimal(T value) {
    char buffer[32];  // the longest shortest double form has 24 characters
    const auto end = std::to_chars(buffer, buffer + sizeof buffer, value).ptr;
    return {buffer, end};
}

}  // namespace

std::string Number::text() const {
    switch (_kind) {
        case Kind::Absent:
            return "(null)";
        case Kind::Float:
            return decimal(static_cast<float>(asDouble()));
        case Kind::Double:
            return decimal(asDouble());
        default:
            return isSigned() ? decimal(as<std::int64_t>()) : decimal(_bits);
    }
}

}  // namespace platform
