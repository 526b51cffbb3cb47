// StringKey: the key of a look-up together with its hash.
//
// Made from any text on the spot, so that a map is asked for a literal, a string or a view alike. Made
// once as a constant it spares the look-ups the hashing:
//     constexpr platform::StringKey kCount("count");
// A view: it keeps no copy of the text.
#ifndef ZR_PLATFORM_STRING_KEY_H
#define ZR_PLATFORM_STRING_KEY_H

#include <bit>
#include <concepts>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string_view>
#include <type_traits>

namespace platform {

class StringKey {
  public:
    template <std::convertible_to<std::string_view> Text>
    constexpr StringKey(const Text& text) : _text(text), _hash(_hashOf(_text)) {}

    constexpr std::string_view text() const { return _text; }
    constexpr std::uint32_t hash() const { return _hash; }

  private:
    static constexpr std::size_t kWord = sizeof(std::uint64_t);

    static constexpr std::uint64_t _wordOf(const char* bytes, std::size_t count = kWord) {
        std::uint64_t word = 0;
        if (count == kWord && std::endian::native == std::endian::little &&
            !std::is_constant_evaluated()) {
            std::memcpy(&word, bytes, kWord);
            return word;
        }
        for (std::size_t at = 0; at < count; ++at) {
            word |= std::uint64_t{static_cast<unsigned char>(bytes[at])} << (8 * at);
        }
        return word;
    }

    // A multiplication per eight bytes; the last word overlaps the one before it.
    static constexpr std::uint32_t _hashOf(std::string_view text) {
        std::uint64_t hash = text.size();
        const auto mix = [&hash](std::uint64_t word) {
            hash = (hash ^ word) * 0x9E3779B97F4A7C15U;
            hash ^= hash >> 32U;
        };
        const std::size_t size = text.size();
        if (size < kWord) {
            mix(_wordOf(text.data(), size));
        } else {
            for (std::size_t at = 0; at + kWord < size; at += kWord) {
                mix(_wordOf(text.data() + at));
            }
            mix(_wordOf(text.data() + size - kWord));
        }
        return static_cast<std::uint32_t>(hash);
    }

    std::string_view _text;
    std::uint32_t _hash;
};

}  // namespace platform

#endif
