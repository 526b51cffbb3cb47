#include "platform/text_format.h"

#include <charconv>
#include <cmath>

namespace platform::detail {

void appendNumber(std::string& out, const Number& number, Conversion conversion) {
    const double value = number.asDouble();
    if (conversion != Conversion::Double || std::isnan(value)) {
        out += number.text();
        return;
    }
    constexpr int kDecimals = 6;
    char buffer[352];  // the largest double has 309 digits before the decimal point
    // Not printf: its decimal point is the process's locale's.
    out.append(buffer, std::to_chars(buffer, buffer + sizeof buffer, value,
                                     std::chars_format::fixed, kDecimals)
                           .ptr);
}

void appendFormatted(std::string& out, std::string_view text, const Argument* arguments) {
    while (!text.empty()) {
        const std::size_t literal = text.find('%');
        out += text.substr(0, literal);
        if (literal == std::string_view::npos) {
            return;
        }
        text.remove_prefix(literal);
        const Placeholder placeholder = readPlaceholder(text);
        text.remove_prefix(placeholder.length);
        if (placeholder.conversion == Conversion::Percent) {
            out += '%';
        } else {
            arguments->append(out, arguments->object, placeholder.conversion);
            ++arguments;
        }
    }
}

}  // namespace platform::detail
