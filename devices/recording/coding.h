// Entries as bytes, and back. docs/recordings.md describes the format.
//
// Both directions keep tables (of texts, and of the keys and kinds of dictionaries of numbers), so that what
// comes again takes little room. So an entry can only be decoded after all that were encoded before it.
#ifndef ZR_DEVICES_RECORDING_CODING_H
#define ZR_DEVICES_RECORDING_CODING_H

#include <cstddef>
#include <map>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include <nlohmann/json.hpp>

#include "devices/recording/entry.h"
#include "platform/number.h"

namespace recording {

// What the file begins with: its kind and the version of its format, in one line of text.
inline constexpr std::string_view kFileStart = "zrlab recording 1\n";

// An entry's bytes are its length, four bytes with the lowest first, and so many bytes of MessagePack.
inline constexpr std::size_t kLengthSize = 4;
inline constexpr std::size_t kLongestEntry = std::size_t{1} << 20U;
// Of lists and dictionaries in one another.
inline constexpr int kDeepest = 64;

using Json = nlohmann::json;

// A dictionary's keys, each with the kind of its number; Absent for a value of any other kind.
using Shape = std::vector<std::pair<std::string, platform::Number::Kind>>;

class Encoder {
  public:
    // The entry's bytes, length included. Empty for an entry that is longer or deeper than the format allows.
    std::string encode(const Entry& entry);

  private:
    friend struct ContentWriter;
    Json _text(std::string_view text);
    Json _value(const platform::Value& value);
    Json _dictionary(const platform::Dictionary& dictionary);
    Json _error(const platform::ErrorRef& error);

    std::map<std::string, std::size_t, std::less<>> _texts;
    std::map<Shape, std::size_t> _shapes;
};

// Bytes that no encoder has written.
class Damage : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

class Decoder {
  public:
    // The entry of these bytes, without their length. Throws a Damage.
    Entry decode(std::string_view bytes);

  private:
    friend class ContentReader;
    std::string _text(const Json& json);
    platform::Value _value(const Json& json);
    platform::Value _dictionary(const Json& json);
    const Shape& _shape(const Json& json);
    platform::ErrorRef _error(const Json& json);

    std::vector<std::string> _texts;
    std::vector<Shape> _shapes;
};

}  // namespace recording

#endif
