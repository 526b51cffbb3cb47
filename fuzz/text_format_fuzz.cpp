// Formatting fills any text with any arguments as printf would, keeps every byte of a string, and writes numbers
// that read back to the same value in the same kind.
//
// Input: the pieces of a text, each a letter and what it holds up to a semicolon: "n" literal bytes, "@" a string,
// "d", "u" and "f" a number, "%" nothing. Its first eight bytes are the bits of a number besides.
#include "platform/text_format.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <deque>
#include <string>
#include <variant>
#include <vector>

#include "fuzz/expect.h"
#include "fuzz/input.h"

namespace {

using fuzz::expect;

template <class T>
void expectReadsBack(T value, T readBack) {
    expect(value == readBack || (value != value && readBack != readBack), "a number's text");
}

std::string printed(double value) {
    char buffer[400];
    std::snprintf(buffer, sizeof buffer, "%f", value);
    return std::isnan(value) ? "nan" : buffer;  // printf shows a sign
}

// A text that the compiler would take, its arguments, and what it comes to.
struct Filled {
    std::string text;
    std::deque<std::variant<std::string, std::int64_t, std::uint64_t, double>> arguments;
    std::string expected;

    template <class T>
    void add(std::string_view placeholder, const T& argument, const std::string& shown) {
        text += placeholder;
        arguments.emplace_back(argument);
        expected += shown;
    }
};

Filled filledText(fuzz::Input input) {
    Filled filled;
    while (!input.isAtEnd()) {
        const char kind = input.letter("n@duf%");
        std::string held = kind != '%' ? input.text(';') : "";
        if (kind == '@') {
            filled.add("%@", held, held);
        } else if (kind == 'd') {
            const std::int64_t number = std::strtoll(held.c_str(), nullptr, 10);
            filled.add("%d", number, std::to_string(number));
        } else if (kind == 'u') {
            const std::uint64_t number = std::strtoull(held.c_str(), nullptr, 10);
            filled.add("%lu", number, std::to_string(number));
        } else if (kind == 'f') {
            const double number = std::strtod(held.c_str(), nullptr);
            filled.add("%lf", number, printed(number));
        } else {
            // A per cent sign that stands for itself is written twice.
            std::erase(held, '%');
            filled.text += kind == '%' ? "%%" : held;
            filled.expected += kind == '%' ? "%" : held;
        }
    }
    return filled;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    std::uint64_t bits = 0;
    std::memcpy(&bits, data, std::min(size, sizeof bits));
    const auto real = std::bit_cast<double>(bits);
    const auto shortReal = std::bit_cast<float>(static_cast<std::uint32_t>(bits));
    expectReadsBack(real, std::strtod(platform::Number(real).text().c_str(), nullptr));
    expectReadsBack(shortReal, std::strtof(platform::Number(shortReal).text().c_str(), nullptr));
    expect(platform::format("%lf|%d|%lu", real, static_cast<std::int64_t>(bits), bits) ==
               printed(real) + "|" + std::to_string(static_cast<std::int64_t>(bits)) + "|" +
                   std::to_string(bits),
           "numbers of these bits");

    const Filled filled = filledText(fuzz::Input(data, size));
    std::vector<platform::detail::Argument> arguments;
    for (const auto& argument : filled.arguments) {
        std::visit(
            [&](const auto& held) { arguments.push_back(platform::detail::makeArgument(held)); },
            argument);
    }
    std::string out;
    platform::detail::appendFormatted(out, filled.text, arguments.data());
    expect(out == filled.expected, "the filled text");
    return 0;
}
