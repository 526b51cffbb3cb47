// Formatting takes any argument, keeps every byte of a string, and writes numbers that read back to
// the same value in the same kind.
#include "platform/text_format.h"

#include <algorithm>
#include <bit>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <string>

#include "fuzz/expect.h"

namespace {

using fuzz::expect;

template <class T>
void expectReadsBack(T value, T readBack) {
    expect(value == readBack || (value != value && readBack != readBack), "a number's text");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    std::uint64_t bits = 0;
    std::memcpy(&bits, data, std::min(size, sizeof bits));
    const std::string text(reinterpret_cast<const char*>(data), size);
    const auto real = std::bit_cast<double>(bits);
    const auto shortReal = std::bit_cast<float>(static_cast<std::uint32_t>(bits));
    const auto whole = static_cast<std::int64_t>(bits);

    expectReadsBack(real, std::strtod(platform::Number(real).text().c_str(), nullptr));
    expectReadsBack(shortReal, std::strtof(platform::Number(shortReal).text().c_str(), nullptr));
    expect(platform::format("%d", whole) == std::to_string(whole), "a signed integer");
    expect(platform::format("%lu", bits) == std::to_string(bits), "an unsigned integer");
    expect(platform::format("%@", text) == text, "a string");
    const std::string all =
        platform::format("<%@|%lf|%d|%lu|%%|%@>", text, real, whole, bits, platform::Number(real));
    expect(all.starts_with("<" + text + "|") && all.ends_with(platform::Number(real).text() + ">"),
           "the rest of the text");
    return 0;
}
