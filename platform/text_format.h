// Message formatting over the system's own format texts.
//
//   %@    the text form of an object: a string, a number (boxed or plain), anything with text(); a
//         null C string prints as (null)
//   %d    a signed integer in decimal
//   %lu   an unsigned integer in decimal
//   %lf   a double with six digits after the decimal point; nan, inf or -inf when it is not finite
//   %%    a per cent sign
//
// A text is checked against its arguments when it is compiled: a placeholder without an argument, an
// argument of another kind than its placeholder, or an unknown placeholder does not compile.
// Arguments beyond the last placeholder are allowed and ignored, so that the rows of one table may
// share one argument list.
#ifndef ZR_PLATFORM_TEXT_FORMAT_H
#define ZR_PLATFORM_TEXT_FORMAT_H

#include <concepts>
#include <cstddef>
#include <string>
#include <string_view>
#include <type_traits>

#include "platform/number.h"

namespace platform {

namespace detail {

enum class ArgumentKind { Signed, Unsigned, Floating, Object };

template <class T>
concept HasText = requires(const T& object) {
    { object.text() } -> std::convertible_to<std::string>;
};

template <class T>
consteval ArgumentKind argumentKind() {
    using Plain = std::remove_cvref_t<T>;
    if constexpr (std::floating_point<Plain>) {
        return ArgumentKind::Floating;
    } else if constexpr (std::integral<Plain>) {
        return std::is_signed_v<Plain> ? ArgumentKind::Signed : ArgumentKind::Unsigned;
    } else {
        static_assert(std::convertible_to<const Plain&, std::string_view> || HasText<Plain>,
                      "a format argument is a string, a number or has text()");
        return ArgumentKind::Object;
    }
}

// The conversions that a text may name; Percent takes no argument.
enum class Conversion { Percent, Object, Signed, Unsigned, Double };

struct Placeholder {
    Conversion conversion;
    std::size_t length;  // characters, the per cent sign included; 0 for an unknown placeholder
};

// Reads the placeholder at the start of `text`, which begins with a per cent sign.
constexpr Placeholder readPlaceholder(std::string_view text) {
    struct Known {
        std::string_view text;
        Conversion conversion;
    };
    constexpr Known kKnown[] = {
        {"%%", Conversion::Percent},   {"%@", Conversion::Object},  {"%d", Conversion::Signed},
        {"%lu", Conversion::Unsigned}, {"%lf", Conversion::Double},
    };
    for (const Known& known : kKnown) {
        if (text.starts_with(known.text)) {
            return {known.conversion, known.text.size()};
        }
    }
    return {Conversion::Percent, 0};
}

constexpr bool accepts(Conversion conversion, ArgumentKind kind) {
    switch (conversion) {
        case Conversion::Signed:
            return kind == ArgumentKind::Signed;
        case Conversion::Unsigned:
            return kind == ArgumentKind::Unsigned;
        case Conversion::Double:
            return kind == ArgumentKind::Floating;
        default:
            return true;
    }
}

// Where the check of a text ends when it fails. Not constexpr, so reaching one of these in a
// constant evaluation is a compile-time error that shows the name.
[[noreturn]] void unknownPlaceholder();
[[noreturn]] void placeholderWithoutArgument();
[[noreturn]] void argumentOfAnotherKind();

// One argument, not copied: valid for the full expression that formats it.
struct Argument {
    const void* object;
    void (*append)(std::string& out, const void* object, Conversion conversion);
};

void appendNumber(std::string& out, const Number& number, Conversion conversion);

template <class T>
Argument makeArgument(const T& object) {
    return {&object, [](std::string& out, const void* erased, Conversion conversion) {
                const T& value = *static_cast<const T*>(erased);
                if constexpr (std::is_arithmetic_v<T>) {
                    appendNumber(out, value, conversion);
                } else if constexpr (std::convertible_to<T, const char*> && !std::is_array_v<T>) {
                    const char* text = value;
                    out += text != nullptr ? text : "(null)";
                } else if constexpr (std::convertible_to<const T&, std::string_view>) {
                    out += std::string_view(value);
                } else {
                    out += value.text();
                }
            }};
}

void appendFormatted(std::string& out, std::string_view text, const Argument* arguments);

}  // namespace detail

// A format text for arguments of the given types, checked when compiled. Made from string literals
// only; holds a view of the literal, so copies are free.
template <class... Args>
class FormatText {
  public:
    template <std::size_t N>
    consteval FormatText(const char (&text)[N]) : _text(text, N - 1) {
        constexpr std::size_t kCount = sizeof...(Args);
        constexpr detail::ArgumentKind kKinds[kCount + 1] = {detail::argumentKind<Args>()...};
        std::size_t next = 0;
        for (std::size_t at = 0; at < _text.size(); ++at) {
            if (_text[at] != '%') {
                continue;
            }
            const detail::Placeholder placeholder = detail::readPlaceholder(_text.substr(at));
            if (placeholder.length == 0) {
                detail::unknownPlaceholder();
            }
            at += placeholder.length - 1;
            if (placeholder.conversion == detail::Conversion::Percent) {
                continue;
            }
            if (next == kCount) {
                detail::placeholderWithoutArgument();
            } else if (!detail::accepts(placeholder.conversion, kKinds[next])) {
                detail::argumentOfAnotherKind();
            }
            ++next;
        }
    }

    constexpr std::string_view view() const { return _text; }

  private:
    std::string_view _text;
};

// The text with its placeholders filled.
template <class... Args>
std::string format(FormatText<std::type_identity_t<Args>...> text, const Args&... args) {
    const detail::Argument arguments[sizeof...(Args) + 1] = {detail::makeArgument(args)...};
    std::string out;
    detail::appendFormatted(out, text.view(), arguments);
    return out;
}

}  // namespace platform

#endif
