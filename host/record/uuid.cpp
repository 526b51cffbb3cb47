#include "host/record/uuid.h"

#include <array>
#include <cerrno>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <system_error>

#include <sys/random.h>

namespace host {

std::string newUuid() {
    std::array<std::uint8_t, 16> bytes{};
    if (getrandom(bytes.data(), bytes.size(), 0) != static_cast<ssize_t>(bytes.size())) {
        throw std::system_error(errno, std::generic_category(), "no random bits");
    }
    const auto sinceEpoch = std::chrono::system_clock::now().time_since_epoch();
    auto milliseconds = static_cast<std::uint64_t>(
        std::chrono::duration_cast<std::chrono::milliseconds>(sinceEpoch).count());
    for (std::size_t at = 6; at-- > 0; milliseconds >>= 8) {
        bytes[at] = static_cast<std::uint8_t>(milliseconds);
    }
    bytes[6] = static_cast<std::uint8_t>((bytes[6] & 0x0f) | 0x70);  // version 7
    bytes[8] = static_cast<std::uint8_t>((bytes[8] & 0x3f) | 0x80);  // the variant of RFC 9562

    static constexpr char kDigits[] = "0123456789abcdef";
    std::string text;
    text.reserve(36);
    for (std::size_t at = 0; at < bytes.size(); ++at) {
        if (at == 4 || at == 6 || at == 8 || at == 10) {
            text += '-';
        }
        text += kDigits[bytes[at] >> 4];
        text += kDigits[bytes[at] & 0x0f];
    }
    return text;
}

bool isUuid(std::string_view text) {
    static constexpr std::string_view kForm = "xxxxxxxx-xxxx-xxxx-xxxx-xxxxxxxxxxxx";
    if (text.size() != kForm.size()) {
        return false;
    }
    for (std::size_t at = 0; at < text.size(); ++at) {
        const bool isDigit = std::string_view("0123456789abcdef").find(text[at]) != text.npos;
        if (kForm[at] == 'x' ? !isDigit : text[at] != '-') {
            return false;
        }
    }
    return true;
}

}  // namespace host
