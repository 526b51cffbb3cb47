#include "host/record/mask_passwords.h"

#include <algorithm>
#include <cctype>
#include <cstddef>

namespace host {

namespace {

constexpr std::string_view kMask = "***";
constexpr std::string_view kKey = "password";

bool isBlank(char c) {
    return std::isspace(static_cast<unsigned char>(c)) != 0;
}

// "SCHEME://USER:PASSWORD@": the password ends at the last "@", because one in it needs no escape.
std::string withoutUserPassword(std::string_view text) {
    const std::size_t scheme = text.find("://");
    const std::size_t at = text.rfind('@');
    if (scheme == std::string_view::npos || at == std::string_view::npos || at < scheme) {
        return std::string(text);
    }
    const std::size_t colon = text.find(':', scheme + 3);
    if (colon >= at) {
        return std::string(text);
    }
    std::string masked(text.substr(0, colon + 1));
    masked += kMask;
    masked += text.substr(at);
    return masked;
}

// Where the value ends that begins at `from`. In a connection string it is quoted or ends at a blank, and a
// backslash escapes; as a parameter of an address it ends at "&".
std::size_t endOfValue(std::string_view text, std::size_t from, bool isParameter) {
    if (isParameter) {
        return std::min(text.find('&', from), text.size());
    }
    const bool isQuoted = from < text.size() && text[from] == '\'';
    std::size_t at = isQuoted ? from + 1 : from;
    while (at < text.size() && (isQuoted ? text[at] != '\'' : !isBlank(text[at]))) {
        at += text[at] == '\\' ? 2 : 1;
    }
    return std::min(isQuoted ? at + 1 : at, text.size());
}

}  // namespace

std::string maskPasswords(std::string_view text) {
    const std::string rest = withoutUserPassword(text);
    std::string lower = rest;
    std::transform(lower.begin(), lower.end(), lower.begin(),
                   [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    std::string masked;
    std::size_t done = 0;
    for (std::size_t key = lower.find(kKey); key != std::string::npos;
         key = lower.find(kKey, std::max(key + 1, done))) {
        std::size_t from = key + kKey.size();
        while (from < rest.size() && isBlank(rest[from])) {
            ++from;
        }
        if (from == rest.size() || rest[from] != '=') {
            continue;
        }
        ++from;
        const std::size_t name = lower.find_last_not_of("abcdefghijklmnopqrstuvwxyz", key);
        const bool isParameter =
            name != std::string::npos && (rest[name] == '?' || rest[name] == '&');
        while (!isParameter && from < rest.size() && isBlank(rest[from])) {
            ++from;
        }
        const std::size_t end = endOfValue(rest, from, isParameter);
        masked.append(rest, done, from - done);
        masked += end > from ? kMask : "";
        done = end;
    }
    return masked.append(rest, done);
}

}  // namespace host
