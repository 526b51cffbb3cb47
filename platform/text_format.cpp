#include "platform/text_format.h"

#include <charconv>

namespace platform::detail {

void appendNumber(std::string& out, const Number& number, Conversion conversion) {
    if (conversion != Conversion::Double) {
        out += number.text();
        return;
    }
    constexpr int kDecimals = 6;
    char buffer[352];  // the largest double has 309 digits before the decimal point
    // Not printf: its decimal point is the process's locale's.
    const auto [end, problem] = std::to_chars(buffer, buffer + sizeof buffer, number.asDouble(),
                                              std::chars_format::fixed, kDecimals);
    std::string_view text(buffer, static_cast<std::size_t>(end - buffer));
    if (text.starts_with("-nan")) {
        text.remove_prefix(1);  // a NaN has no sign worth telling
    }
    out += text;
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
