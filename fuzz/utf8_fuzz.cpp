// Whatever bytes a device calls a text: what reports show of it is UTF-8 that XML and HTML can carry, with
// every character that was one still there; a line cannot control a terminal; and only UTF-8 is alphanumeric.
//
// Input: the text.
#include <cctype>
#include <string>
#include <vector>

#include "frame/shared_helpers.h"
#include "fuzz/expect.h"
#include "fuzz/input.h"
#include "host/record/clean_text.h"

namespace {

using fuzz::expect;

struct Character {
    std::string bytes;
    bool isOne;  // or else a byte that is not a part of UTF-8
    std::uint32_t code = 0xFFFD;
};

// The text character by character, by encoding each candidate anew.
std::vector<Character> charactersOf(const std::string& text) {
    std::vector<Character> all;
    for (std::size_t at = 0; at < text.size(); at += all.back().bytes.size()) {
        all.push_back({text.substr(at, 1), false});
        for (std::size_t length = 1; length <= std::min<std::size_t>(4, text.size() - at);
             ++length) {
            std::uint32_t code =
                static_cast<unsigned char>(text[at]) & (length == 1 ? 0x7F : 0xFF >> (length + 1));
            for (std::size_t more = 1; more < length; ++more) {
                code = code << 6 | (static_cast<unsigned char>(text[at + more]) & 0x3F);
            }
            std::string encoded;
            for (std::size_t more = length; more-- > 1;) {
                encoded.insert(encoded.begin(),
                               static_cast<char>(0x80 | (code >> 6 * (length - 1 - more) & 0x3F)));
            }
            const std::uint32_t lead =
                length == 1 ? code : (0xF00 >> length & 0xFF) | code >> 6 * (length - 1);
            encoded.insert(encoded.begin(), static_cast<char>(lead));
            constexpr std::uint32_t kLeast[] = {0, 0x80, 0x800, 0x10000};
            const bool isAllowed =
                code >= kLeast[length - 1] && code <= 0x10FFFF && (code < 0xD800 || code > 0xDFFF);
            if (isAllowed && encoded == text.substr(at, length)) {
                all.back() = {encoded, true, code};
                break;
            }
        }
    }
    return all;
}

bool isXml(std::uint32_t code) {
    return code == 0xFFFD || code == '\t' || code == '\n' || code == '\r' ||
           (code >= 0x20 && code != 0xFFFE && code != 0xFFFF);
}

// With every run of what was replaced as one: how many bytes a replacement stands for is left open.
std::string merged(const std::vector<Character>& characters) {
    std::string text;
    bool wasReplaced = false;
    for (const Character& character : characters) {
        const bool isReplaced =
            !character.isOne || !isXml(character.code) || character.code == 0xFFFD;
        text += isReplaced ? (wasReplaced ? "" : "\xEF\xBF\xBD") : character.bytes;
        wasReplaced = isReplaced;
    }
    return text;
}

std::string unescaped(std::string text) {
    const std::pair<std::string, std::string> entities[] = {
        {"&lt;", "<"}, {"&gt;", ">"}, {"&quot;", "\""}, {"&#39;", "'"}, {"&amp;", "&"}};
    for (const auto& [entity, character] : entities) {
        for (std::size_t at = 0; (at = text.find(entity, at)) != std::string::npos; ++at) {
            text.replace(at, entity.size(), character);
        }
    }
    return text;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string text(reinterpret_cast<const char*>(data), size);
    const std::vector<Character> characters = charactersOf(text);

    const std::string clean = host::cleanText(text);
    for (const Character& character : charactersOf(clean)) {
        expect(character.isOne && isXml(character.code), "characters of XML");
    }
    expect(merged(charactersOf(clean)) == merged(characters), "every character that was one");
    expect(host::cleanText(clean) == clean, "clean text stays as it is");

    const std::string html = host::htmlText(text);
    expect(html.find_first_of("<>\"'") == std::string::npos && unescaped(html) == clean, "HTML");

    const std::string line = host::plainLine(text);
    expect(line.size() == size, "as long a line");
    bool isAlphaNumericEach = true;
    for (std::size_t at = 0; at < size; ++at) {
        const bool isControl = std::iscntrl(static_cast<unsigned char>(text[at])) != 0;
        expect(line[at] == (isControl ? '?' : text[at]), "a plain line");
    }
    for (const Character& character : characters) {
        const bool isOne = isAlphaNumeric(character.bytes);
        expect(character.code >= 0x80 ||
                   isOne == (std::isalnum(static_cast<int>(character.code)) != 0),
               "ASCII");
        expect(!isOne || character.isOne, "alphanumeric UTF-8");
        isAlphaNumericEach = isAlphaNumericEach && isOne;
    }
    expect(isAlphaNumeric(text) == isAlphaNumericEach, "alphanumeric as each character is");
    return 0;
}
