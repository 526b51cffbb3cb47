#include "host/record/clean_text.h"

#include <algorithm>
#include <cstddef>

#include <nlohmann/json.hpp>

namespace host {

namespace {

constexpr std::string_view kReplacement = "\xEF\xBF\xBD";

// The text with what is not UTF-8 replaced; the library's writer does that.
std::string asUtf8(std::string_view text) {
    using nlohmann::json;
    return json::parse(json(text).dump(-1, ' ', false, json::error_handler_t::replace))
        .get<std::string>();
}

}  // namespace

std::string cleanText(std::string_view text) {
    const std::string utf8 = asUtf8(text);
    const std::string_view rest = utf8;
    std::string clean;
    clean.reserve(utf8.size());
    for (std::size_t at = 0; at < utf8.size(); ++at) {
        const auto byte = static_cast<unsigned char>(utf8[at]);
        const std::string_view three = rest.substr(at, 3);
        if (three == "\xEF\xBF\xBE" || three == "\xEF\xBF\xBF") {  // U+FFFE, U+FFFF
            clean += kReplacement;
            at += 2;
        } else if (byte < 0x20 && byte != '\t' && byte != '\n' && byte != '\r') {
            clean += kReplacement;
        } else {
            clean += utf8[at];
        }
    }
    return clean;
}

std::string htmlText(std::string_view text) {
    std::string out;
    for (const char c : cleanText(text)) {
        switch (c) {
            case '&':
                out += "&amp;";
                break;
            case '<':
                out += "&lt;";
                break;
            case '>':
                out += "&gt;";
                break;
            case '"':
                out += "&quot;";
                break;
            case '\'':
                out += "&#39;";
                break;
            default:
                out += c;
        }
    }
    return out;
}

std::string plainLine(std::string_view text) {
    std::string line(text);
    std::replace_if(
        line.begin(), line.end(), [](unsigned char c) { return c < 0x20 || c == 0x7F; }, '?');
    return line;
}

std::size_t widthOf(std::string_view text) {
    return static_cast<std::size_t>(
        std::count_if(text.begin(), text.end(), [](char c) { return (c & 0xC0) != 0x80; }));
}

}  // namespace host
