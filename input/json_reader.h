// A strict JSON document (RFC 8259) and what readers of one need: every value knows where it stands,
// and whatever is wrong with it becomes one line.
//
// For the simulator's own sources; the parser behind it is nlohmann/json.
#ifndef ZR_INPUT_JSON_READER_H
#define ZR_INPUT_JSON_READER_H

#include <algorithm>
#include <concepts>
#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <iterator>
#include <limits>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <nlohmann/json.hpp>

namespace input {

// What is wrong with a document, in one line: a JSON pointer (RFC 6901) where there is one, and the
// reason.
class DocumentProblem : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

// Objects keep the order of their keys.
using Json = nlohmann::ordered_json;

// The document in `text`. Throws a DocumentProblem when it is no JSON, when an object has a key twice or
// when values are nested more than 64 deep.
Json parseJson(const std::string& text);

// A value of a document. Valid as long as the document.
class JsonNode {
  public:
    explicit JsonNode(const Json& document) : _json(&document) {}

    // Throws a DocumentProblem about this value.
    [[noreturn]] void fail(const std::string& reason) const;

    const Json& json() const { return *_json; }
    bool isNull() const { return _json->is_null(); }
    bool isObject() const { return _json->is_object(); }

    // The value under `key` of an object, or the entry of an array: there must be one.
    JsonNode operator[](const std::string& key) const;
    JsonNode operator[](std::size_t index) const;

    // What the value holds; a DocumentProblem when it is something else or out of range.
    bool asBool() const;
    std::string asText() const;
    double asDouble(double least = std::numeric_limits<double>::lowest(),
                    double most = std::numeric_limits<double>::max()) const;
    template <std::integral T>
    T asInteger(T least = std::numeric_limits<T>::min(),
                T most = std::numeric_limits<T>::max()) const;

    // Calls `visit` with each entry of an array.
    template <class Visit>
    void forEachEntry(const Visit& visit) const {
        _require(_json->is_array(), "not an array");
        for (std::size_t index = 0; index < _json->size(); ++index) {
            visit((*this)[index]);
        }
    }

    // Calls `visit` with each key of an object and the value under it.
    template <class Visit>
    void forEachKey(const Visit& visit) const {
        _require(_json->is_object(), "not an object");
        for (const auto& [key, value] : _json->items()) {
            visit(key, (*this)[key]);
        }
    }

  private:
    JsonNode(const Json& json, std::string pointer) : _json(&json), _pointer(std::move(pointer)) {}
    void _require(bool condition, const char* reason) const;

    const Json* _json;
    std::string _pointer;  // of the value within its document
};

template <std::integral T>
T JsonNode::asInteger(T least, T most) const {
    _require(_json->is_number_integer(), "not an integer");
    const auto within = [&](auto value) {
        return std::cmp_greater_equal(value, least) && std::cmp_less_equal(value, most);
    };
    const bool inRange = _json->is_number_unsigned() ? within(_json->get<std::uint64_t>())
                                                     : within(_json->get<std::int64_t>());
    if (!inRange) {
        fail("not from " + std::to_string(least) + " to " + std::to_string(most));
    }
    return _json->get<T>();
}

// Says that `key` of an object is none of `known`, and which one may have been meant.
[[noreturn]] void failUnknownKey(const JsonNode& value,
                                 std::string_view key,
                                 const std::vector<std::string>& known);

// Says that there is no `kind` of that name, and which one may have been meant; a new one would need
// `key`.
[[noreturn]] void failUnknownName(const JsonNode& value,
                                  std::string_view name,
                                  const std::vector<std::string>& known,
                                  const std::string& kind,
                                  std::string_view key);

// A key that an object of kind T may have, and how its value gets into the object.
template <class T>
struct JsonKey {
    std::string_view name;
    void (*read)(const JsonNode& value, T& object);
};

// Reads the keys that the object has; changes nothing else. Every key must be in the table.
template <class T, std::size_t N>
void readObject(const JsonNode& node, const JsonKey<T> (&keys)[N], T& object) {
    node.forEachKey([&](const std::string& key, const JsonNode& value) {
        for (const JsonKey<T>& known : keys) {
            if (known.name == key) {
                known.read(value, object);
                return;
            }
        }
        std::vector<std::string> names;
        for (const JsonKey<T>& known : keys) {
            names.emplace_back(known.name);
        }
        failUnknownKey(value, key, names);
    });
}

// An array of objects as a whole: there is no way to name one of them.
template <class T, std::size_t N>
std::vector<T> readList(const JsonNode& node, const JsonKey<T> (&keys)[N]) {
    std::vector<T> list;
    node.forEachEntry([&](const JsonNode& entry) { readObject(entry, keys, list.emplace_back()); });
    return list;
}

// Reads objects that are named by their keys into a list, whose entries `nameOf` tells the names of:
// null takes the entry of that name away, an object changes it. An object of a new name is `make`d from
// it and appended, then read; it needs the `required` keys, or else the name is a slip. `kind` is what
// an entry is called.
template <class T, std::size_t N, class NameOf, class Make>
void readNamed(const JsonNode& node,
               const JsonKey<T> (&keys)[N],
               std::vector<T>& list,
               const std::string& kind,
               std::initializer_list<std::string_view> required,
               const NameOf& nameOf,
               const Make& make) {
    node.forEachKey([&](const std::string& name, const JsonNode& value) {
        auto entry = std::find_if(list.begin(), list.end(),
                                  [&](const T& each) { return nameOf(each) == name; });
        if (entry == list.end()) {
            std::vector<std::string> names;
            std::transform(list.begin(), list.end(), std::back_inserter(names), nameOf);
            for (const std::string_view key : required) {
                if (!value.isObject() || !value.json().contains(key)) {
                    failUnknownName(value, name, names, kind, key);
                }
            }
            entry = list.insert(entry, make(name, value));
        } else if (value.isNull()) {
            list.erase(entry);
            return;
        }
        readObject(value, keys, *entry);
    });
}

}  // namespace input

#endif
