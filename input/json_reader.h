// A strict JSON document (RFC 8259) as objects in memory, in both directions: tables of keys say how the
// value of each key is read and written. Every value that is read knows where it stands, and whatever is
// wrong with it becomes one line.
//
// The parser behind it is nlohmann/json.
#ifndef ZR_INPUT_JSON_READER_H
#define ZR_INPUT_JSON_READER_H

#include <algorithm>
#include <array>
#include <cmath>
#include <concepts>
#include <cstddef>
#include <cstdint>
#include <functional>
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

// The document in `text`. Throws a DocumentProblem when it is not JSON, when an object has a key twice, when
// a number is larger than a double can be and when values are nested more than 64 deep.
Json parseJson(const std::string& text);

// A value of a document. Valid as long as the document and the list of problems.
class JsonNode {
  public:
    // The whole document. Visits of its entries and keys append what is wrong with them to `problems`.
    JsonNode(const Json& document, std::vector<std::string>& problems)
        : _json(&document), _problems(&problems) {}

    // Throws a DocumentProblem about this value.
    [[noreturn]] void fail(const std::string& reason) const;

    const Json& json() const { return *_json; }
    bool isNull() const { return _json->is_null(); }
    bool isObject() const { return _json->is_object(); }

    // The value under `key` of an object, or the entry of an array: there must be one.
    JsonNode operator[](const std::string& key) const;
    JsonNode operator[](std::size_t index) const;

    // Throws a DocumentProblem unless the value is an object with all of these keys.
    void requireKeys(std::initializer_list<std::string_view> keys, const std::string& reason) const;

    // What the value holds; a DocumentProblem when it is something else or out of range. A number without
    // a fraction is an integer, however it is written: 2.0 is 2.
    bool asBool() const;
    std::string asText() const;
    double asDouble(double least = std::numeric_limits<double>::lowest(),
                    double most = std::numeric_limits<double>::max()) const;
    template <std::integral T>
    T asInteger(T least = std::numeric_limits<T>::min(),
                T most = std::numeric_limits<T>::max()) const;

    // Calls `visit` with each entry of an array. An entry that throws a DocumentProblem adds it to the list
    // of problems, and the visit goes on with the next one.
    template <class Visit>
    void forEachEntry(const Visit& visit) const {
        _require(_json->is_array(), "not an array");
        for (std::size_t index = 0; index < _json->size(); ++index) {
            _collect([&] { visit((*this)[index]); });
        }
    }

    // Calls `visit` with each key of an object and the value under it; with problems as above.
    template <class Visit>
    void forEachKey(const Visit& visit) const {
        _require(_json->is_object(), "not an object");
        for (const auto& [key, value] : _json->items()) {
            _collect([&, &name = key] { visit(name, (*this)[name]); });
        }
    }

  private:
    JsonNode(const Json& json, std::vector<std::string>& problems, std::string pointer)
        : _json(&json), _problems(&problems), _pointer(std::move(pointer)) {}
    void _require(bool condition, const char* reason) const;

    template <class Call>
    void _collect(const Call& call) const {
        try {
            call();
        } catch (const DocumentProblem& problem) {
            _problems->emplace_back(problem.what());
        }
    }

    const Json* _json;
    std::vector<std::string>* _problems;
    std::string _pointer;  // of the value within its document
};

template <std::integral T>
T JsonNode::asInteger(T least, T most) const {
    const bool isFloat = _json->is_number_float();
    const double number = isFloat ? _json->get<double>() : 0;
    _require(_json->is_number() && number == std::trunc(number), "not an integer");
    const bool isConvertible = number > -0x1p63 && number < 0x1p64;
    const bool isUnsigned = isFloat ? number >= 0 : _json->is_number_unsigned();
    const auto within = [&](auto value) {
        return std::cmp_greater_equal(value, least) && std::cmp_less_equal(value, most);
    };
    if (!isConvertible ||
        !(isUnsigned ? within(_json->get<std::uint64_t>()) : within(_json->get<std::int64_t>()))) {
        fail("not from " + std::to_string(least) + " to " + std::to_string(most));
    }
    return _json->get<T>();
}

// Says that `key` of an object is none of `known`, and which one may have been meant.
[[noreturn]] void failUnknownKey(const JsonNode& value,
                                 std::string_view key,
                                 const std::vector<std::string>& known);

// Says that there is no `kind` of that name, and which one may have been meant, or else how a new one is
// made.
[[noreturn]] void failUnknownName(const JsonNode& value,
                                  std::string_view name,
                                  const std::vector<std::string>& known,
                                  const std::string& kind,
                                  const std::string& howNew);

// A key that an object of kind T may have: how its value gets into the object, and the value that stands for
// what the object holds. What one takes, the other gives. A key that says nothing about the object is
// written as kNotWritten. Objects that are only read need no write.
template <class T>
struct JsonKey {
    using Object = T;

    std::string_view name;
    void (*read)(const JsonNode& value, T& object);
    Json (*write)(const T& object) = nullptr;
};

template <class Pointer>
struct MemberPointer;
template <class T, class M>
struct MemberPointer<M T::*> {
    using Owner = T;
};
// The class of the objects that have this member.
template <auto Member>
using OwnerOf = typename MemberPointer<decltype(Member)>::Owner;

inline constexpr Json::value_t kNotWritten = Json::value_t::discarded;

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

// An object with every key of the table.
template <class T, std::size_t N>
Json writeObject(const JsonKey<T> (&keys)[N], const T& object) {
    Json json = Json::object();
    for (const JsonKey<T>& key : keys) {
        if (Json value = key.write(object); !value.is_discarded()) {
            json[std::string(key.name)] = std::move(value);
        }
    }
    return json;
}

// An array of objects as a whole: there is no way to name one of them.
template <class T, std::size_t N>
std::vector<T> readList(const JsonNode& node, const JsonKey<T> (&keys)[N]) {
    std::vector<T> list;
    node.forEachEntry([&](const JsonNode& entry) { readObject(entry, keys, list.emplace_back()); });
    return list;
}

template <class T, std::size_t N>
Json writeList(const JsonKey<T> (&keys)[N], const std::vector<T>& list) {
    Json json = Json::array();
    for (const T& entry : list) {
        json.push_back(writeObject(keys, entry));
    }
    return json;
}

// Objects that are named by their keys, as a list whose entries hold their names.
template <class T>
struct JsonNames {
    std::string_view kind;  // what an entry is called
    std::string T::*name;
    std::array<std::string_view, 2> required;  // what a new one needs, or else its name is a slip
    T (*make)(const JsonNode& node);           // a new one, before its keys are read
};

// null removes the entry of that name, an object changes it. An object of a new name is made, appended and
// then read.
template <class T, std::size_t N>
void readNamed(const JsonNode& node,
               const JsonKey<T> (&keys)[N],
               const JsonNames<T>& names,
               std::vector<T>& list) {
    node.forEachKey([&](const std::string& name, const JsonNode& value) {
        auto entry = std::find_if(list.begin(), list.end(),
                                  [&](const T& each) { return each.*names.name == name; });
        if (entry == list.end()) {
            std::vector<std::string> known;
            std::transform(list.begin(), list.end(), std::back_inserter(known),
                           std::mem_fn(names.name));
            for (const std::string_view key : names.required) {
                if (!key.empty() && (!value.isObject() || !value.json().contains(key))) {
                    failUnknownName(value, name, known, std::string(names.kind),
                                    "a new one needs \"" + std::string(key) + "\"");
                }
            }
            entry = list.insert(entry, names.make(value));
            (*entry).*names.name = name;
        } else if (value.isNull()) {
            list.erase(entry);
            return;
        }
        readObject(value, keys, *entry);
    });
}

template <class T, std::size_t N>
Json writeNamed(const JsonKey<T> (&keys)[N],
                const JsonNames<T>& names,
                const std::vector<T>& list) {
    Json json = Json::object();
    for (const T& entry : list) {
        json[entry.*names.name] = writeObject(keys, entry);
    }
    return json;
}

}  // namespace input

#endif
