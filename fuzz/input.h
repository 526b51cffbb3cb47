// A fuzzer's input as a text that a target reads piece by piece. At its end everything reads as zero or
// empty, so that any input is a whole one. Corpora are written by hand in this form.
#ifndef ZR_FUZZ_INPUT_H
#define ZR_FUZZ_INPUT_H

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>

#include "platform/value.h"

namespace fuzz {

class Input {
  public:
    Input(const std::uint8_t* data, std::size_t size)
        : _rest(reinterpret_cast<const char*>(data), size) {}

    bool isAtEnd() const { return _rest.empty(); }
    std::string_view rest() const { return _rest; }

    // One of the letters: the next byte, or what it stands for when it is another one.
    char letter(std::string_view letters) {
        const std::uint8_t byte = _byte();
        const bool isOne = letters.find(static_cast<char>(byte)) != std::string_view::npos;
        return isOne ? static_cast<char>(byte) : letters[byte % letters.size()];
    }
    // From 0 to count - 1; a digit is itself where the count divides 48.
    std::size_t below(std::size_t count) { return _byte() % count; }

    // Up to the next `end`, which is taken too.
    std::string text(char end) {
        const std::string_view found = _rest.substr(0, _rest.find(end));
        _rest.remove_prefix(std::min(found.size() + 1, _rest.size()));
        return std::string(found);
    }

    // A letter for the kind and what it holds: "i-5;" "d1e300;" "b1;" "sany text;" "[i1;i2;]"
    // "{key=i1;}". Lists and dictionaries are at most four deep.
    platform::Value value(int depth = 0) {
        switch (letter(depth < 4 ? "chilCHILfdbsno[{" : "chilCHILfdbsno")) {
            case 'c':
                return static_cast<std::int8_t>(_signed());
            case 'h':
                return static_cast<std::int16_t>(_signed());
            case 'i':
                return static_cast<std::int32_t>(_signed());
            case 'l':
                return _signed();
            case 'C':
                return static_cast<std::uint8_t>(_unsigned());
            case 'H':
                return static_cast<std::uint16_t>(_unsigned());
            case 'I':
                return static_cast<std::uint32_t>(_unsigned());
            case 'L':
                return _unsigned();
            case 'f':
                return std::strtof(text(';').c_str(), nullptr);
            case 'd':
                return std::strtod(text(';').c_str(), nullptr);
            case 'b':
                return _unsigned() != 0;
            case 's':
                return text(';');
            case 'o':
                return platform::Value::opaque(0);
            case '[': {
                platform::MutableList list;
                while (!_ends(']')) {
                    list.push_back(value(depth + 1));
                }
                return platform::List(std::move(list));
            }
            case '{':
                return dictionary('}', depth + 1);
            default:
                return {};
        }
    }

    // Pairs "key=VALUE", up to `end` or the end of the input. A later value replaces an earlier one.
    platform::Dictionary dictionary(char end, int depth = 0) {
        platform::MutableDictionary entries;
        while (!_ends(end)) {
            const std::string key = text('=');
            entries.set(key, value(depth));
        }
        return entries;
    }

  private:
    std::uint8_t _byte() {
        const std::uint8_t byte = _rest.empty() ? 0 : static_cast<std::uint8_t>(_rest.front());
        _rest.remove_prefix(_rest.empty() ? 0 : 1);
        return byte;
    }
    std::int64_t _signed() { return std::strtoll(text(';').c_str(), nullptr, 10); }
    std::uint64_t _unsigned() { return std::strtoull(text(';').c_str(), nullptr, 10); }
    bool _ends(char end) {
        while (!_rest.empty() && _rest.front() == '\n') {
            _rest.remove_prefix(1);
        }
        const bool ends = _rest.empty() || _rest.front() == end;
        _rest.remove_prefix(ends && !_rest.empty() ? 1 : 0);
        return ends;
    }

    std::string_view _rest;
};

}  // namespace fuzz

#endif
