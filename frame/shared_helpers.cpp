#include "frame/shared_helpers.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <iterator>
#include <optional>

namespace {

constexpr std::string_view kSubsystem = "net.zerith-bench.diagnostics";
constexpr std::string_view kCategory = "zerith";

struct CodePointRange {
    char32_t first;
    char32_t last;
};

constexpr CodePointRange kAlphanumericRanges[] = {
#include "frame/alphanumeric_ranges.inc"
};

bool isAlphaNumericCodePoint(char32_t codePoint) {
    const auto* const after = std::upper_bound(
        std::begin(kAlphanumericRanges), std::end(kAlphanumericRanges), codePoint,
        [](char32_t code, const CodePointRange& range) { return code < range.first; });
    return after != std::begin(kAlphanumericRanges) && codePoint <= std::prev(after)->last;
}

// Takes the first code point off `text`; nothing when its bytes are not UTF-8 (RFC 3629).
std::optional<char32_t> takeCodePoint(std::string_view& text) {
    struct Form {
        unsigned char mask, lead;
        char32_t
            least;  // the smallest code point of that length: anything less is an overlong form
    };
    constexpr Form kForms[] = {
        {0x80, 0x00, 0}, {0xE0, 0xC0, 0x80}, {0xF0, 0xE0, 0x800}, {0xF8, 0xF0, 0x10000}};
    const auto lead = static_cast<unsigned char>(text.front());
    for (std::size_t more = 0; more < std::size(kForms); ++more) {
        const Form& form = kForms[more];
        if ((lead & form.mask) != form.lead) {
            continue;
        }
        if (text.size() <= more) {
            return std::nullopt;
        }
        char32_t codePoint = lead & static_cast<unsigned char>(~form.mask);
        for (std::size_t at = 1; at <= more; ++at) {
            const auto next = static_cast<unsigned char>(text[at]);
            if ((next & 0xC0) != 0x80) {
                return std::nullopt;
            }
            codePoint = (codePoint << 6) | (next & 0x3F);
        }
        text.remove_prefix(more + 1);
        return codePoint >= form.least ? std::optional(codePoint) : std::nullopt;
    }
    return std::nullopt;
}

}  // namespace

platform::Dictionary dictionaryRepresentation(const platform::Error& error) {
    platform::MutableDictionary entries;
    entries.set("message", error.localizedDescription());
    entries.set("code", error.code());
    entries.set("domain", error.domain());
    if (error.underlyingError() != nullptr) {
        entries.set("underlying-error", dictionaryRepresentation(*error.underlyingError()));
    }
    return entries;
}

bool isAlphaNumeric(std::string_view text) {
    while (!text.empty()) {
        const std::optional<char32_t> codePoint = takeCodePoint(text);
        if (!codePoint.has_value() || !isAlphaNumericCodePoint(*codePoint)) {
            return false;
        }
    }
    return true;
}

const platform::Log& ZRLogHandle() {
    // Never destroyed: a time-out item may log while the process exits.
    static const auto& handle = *new platform::Log(std::string(kSubsystem), std::string(kCategory));
    return handle;
}
