// Value, List, Dictionary: what parameters, metadata, properties and results are made of.
//
// A Value holds nothing, a number, a string, a list, a dictionary or an opaque object (a handler,
// say). Strings, lists, dictionaries and objects are immutable and shared: copying a Value copies a
// reference, and any thread may read it. What still grows has one owner and another type:
// MutableList and MutableDictionary; turning one into a List or a Dictionary moves its entries.
//
// Absence. Asking a Value for something that it does not hold yields null; looking up a key that is
// missing, or any key of a Value that is not a dictionary, yields a Value that holds nothing. So a path
// of look-ups needs no checks on the way.
#ifndef ZR_PLATFORM_VALUE_H
#define ZR_PLATFORM_VALUE_H

#include <any>
#include <cstddef>
#include <initializer_list>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

#include "platform/number.h"
#include "platform/string_map.h"

namespace platform {

class Value;
using MutableList = std::vector<Value>;
using MutableDictionary = StringMap<Value>;

// An immutable, shared, ordered list of values.
class List {
  public:
    List();
    List(MutableList entries);
    List(std::initializer_list<Value> entries);

    std::size_t size() const;
    bool empty() const { return size() == 0; }
    const Value& operator[](std::size_t index) const;  // index below size()
    const Value* begin() const;
    const Value* end() const;

    friend bool operator==(const List& a, const List& b);

  private:
    std::shared_ptr<const MutableList> _entries;
};

// An immutable, shared map from strings to values. Iterates over pairs of key and value in byte order
// of the keys.
class Dictionary {
  public:
    Dictionary();
    Dictionary(MutableDictionary entries);
    Dictionary(std::initializer_list<std::pair<std::string_view, Value>> entries);

    // The value under `key`; one that holds nothing when the key is missing. Valid as long as the
    // dictionary.
    const Value& operator[](std::string_view key) const;
    // The number under `key`; absent when the key is missing or its value is not a number.
    Number number(std::string_view key) const;
    bool contains(std::string_view key) const;

    std::size_t size() const { return entries().size(); }
    bool empty() const { return entries().empty(); }
    auto begin() const { return entries().begin(); }
    auto end() const { return entries().end(); }
    const MutableDictionary& entries() const { return *_entries; }

    friend bool operator==(const Dictionary& a, const Dictionary& b);

  private:
    std::shared_ptr<const MutableDictionary> _entries;
};

class Value {
  public:
    Value() = default;
    Value(const Number& number);  // an absent number makes a Value that holds nothing
    template <Arithmetic T>
    Value(T value) : Value(Number(value)) {}
    Value(std::string text);
    Value(std::string_view text) : Value(std::string(text)) {}
    Value(const char* text) : Value(std::string(text)) {}  // not null
    Value(List list) : _content(std::move(list)) {}
    Value(Dictionary dictionary) : _content(std::move(dictionary)) {}

    // A Value that carries `object` of a type of the caller's; object<T>() gets it back.
    template <class T>
    static Value opaque(T object) {
        Value value;
        value._content = std::make_shared<const std::any>(std::move(object));
        return value;
    }

    bool isPresent() const { return !std::holds_alternative<std::monostate>(_content); }

    // What the Value holds, or null when it holds something else. Valid as long as the Value.
    const Number* number() const { return std::get_if<Number>(&_content); }
    const std::string* string() const;
    const List* list() const { return std::get_if<List>(&_content); }
    const Dictionary* dictionary() const { return std::get_if<Dictionary>(&_content); }
    template <class T>
    const T* object() const {
        const auto* held = std::get_if<std::shared_ptr<const std::any>>(&_content);
        return held != nullptr ? std::any_cast<T>(held->get()) : nullptr;
    }

    // The number, or an absent one.
    Number asNumber() const { return number() != nullptr ? *number() : Number(); }

    // The entry under `key` of a dictionary; a Value that holds nothing in every other case. Valid as
    // long as this Value.
    const Value& operator[](std::string_view key) const;

    // Numbers by kind and value, strings by text, lists and dictionaries entry by entry, objects by
    // identity.
    friend bool operator==(const Value& a, const Value& b);

  private:
    std::variant<std::monostate,
                 Number,
                 std::shared_ptr<const std::string>,
                 List,
                 Dictionary,
                 std::shared_ptr<const std::any>>
        _content;
};

}  // namespace platform

#endif
