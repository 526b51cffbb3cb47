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
#include <array>
#include <cstddef>
#include <initializer_list>
#include <iterator>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

#include "platform/number.h"
#include "platform/string_key.h"
#include "platform/string_map.h"

namespace platform {

class Value;
using MutableList = std::vector<Value>;
using MutableDictionary = StringMap<Value>;

// An immutable, shared, ordered list of values.
//
// Indexing and iterating yield values, not references into the list: what number(), list() and so on
// point to in such a Value lives as long as that Value. What a list or a dictionary in it holds is shared
// and lives as long as the outer list too.
class List {
  public:
    class Iterator;

    List();
    List(MutableList entries);
    List(std::initializer_list<Value> entries);
    // Numbers of one kind. They are kept as they are, four bytes for a 32-bit one, and boxed when asked
    // for.
    template <Arithmetic T, std::size_t N>
    explicit List(const std::array<T, N>& numbers)
        : _entries(std::make_shared<const EntriesIn<std::array<T, N>>>(numbers)) {}

    std::size_t size() const { return _entries->size(); }
    bool empty() const { return size() == 0; }
    Value operator[](std::size_t index) const;  // index below size()
    Iterator begin() const;
    Iterator end() const;

    // Entry by entry, however they are kept.
    friend bool operator==(const List& a, const List& b);

  private:
    struct Entries {
        virtual ~Entries() = default;
        virtual std::size_t size() const = 0;
        virtual Value at(std::size_t index) const = 0;
    };
    template <class Sequence>
    struct EntriesIn final : Entries {
        explicit EntriesIn(Sequence entries) : sequence(std::move(entries)) {}
        std::size_t size() const override { return sequence.size(); }
        Value at(std::size_t index) const override;
        const Sequence sequence;
    };

    static const std::shared_ptr<const Entries>& _none();

    std::shared_ptr<const Entries> _entries;
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
    const Value& operator[](const StringKey& key) const;
    // The number under `key`; absent when the key is missing or its value is not a number.
    Number number(const StringKey& key) const;
    bool contains(const StringKey& key) const { return entries().contains(key); }

    std::size_t size() const { return entries().size(); }
    bool empty() const { return entries().empty(); }
    MutableDictionary::Iterator begin() const { return entries().begin(); }
    MutableDictionary::Iterator end() const { return entries().end(); }
    const MutableDictionary& entries() const { return *_entries; }

    friend bool operator==(const Dictionary& a, const Dictionary& b);

  private:
    std::shared_ptr<const MutableDictionary> _entries;
};

class Value {
  public:
    Value() = default;
    // An absent number makes a Value that holds nothing.
    Value(const Number& number) {
        if (number.isPresent()) {
            _content.emplace<Number>(number);
        }
    }
    template <Arithmetic T>
    Value(T value) : _content(std::in_place_type<Number>, value) {}
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

    // What the Value holds, or null when it holds something else. Valid as long as the Value, so a
    // temporary cannot be asked.
    const Number* number() const& { return std::get_if<Number>(&_content); }
    const std::string* string() const&;
    const List* list() const& { return std::get_if<List>(&_content); }
    const Dictionary* dictionary() const& { return std::get_if<Dictionary>(&_content); }
    const Number* number() const&& = delete;
    const std::string* string() const&& = delete;
    const List* list() const&& = delete;
    const Dictionary* dictionary() const&& = delete;
    template <class T>
    const T* object() const {
        const auto* held = std::get_if<std::shared_ptr<const std::any>>(&_content);
        return held != nullptr ? std::any_cast<T>(held->get()) : nullptr;
    }

    // The number, or an absent one.
    Number asNumber() const { return number() != nullptr ? *number() : Number(); }

    // The entry under `key` of a dictionary; a Value that holds nothing in every other case. Valid as
    // long as this Value.
    const Value& operator[](const StringKey& key) const;

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

// Goes through the entries in their order.
class List::Iterator {
  public:
    using iterator_category = std::input_iterator_tag;
    using difference_type = std::ptrdiff_t;
    using value_type = Value;
    using reference = Value;
    using pointer = void;

    Value operator*() const { return _entries->at(_at); }
    Iterator& operator++() {
        ++_at;
        return *this;
    }
    Iterator operator++(int) { return {*_entries, _at++}; }
    friend bool operator==(const Iterator& a, const Iterator& b) = default;

  private:
    friend class List;
    Iterator(const Entries& entries, std::size_t at) : _entries(&entries), _at(at) {}

    const Entries* _entries;
    std::size_t _at;
};

template <class Sequence>
Value List::EntriesIn<Sequence>::at(std::size_t index) const {
    return sequence[index];
}
inline Value List::operator[](std::size_t index) const {
    return _entries->at(index);
}
inline List::Iterator List::begin() const {
    return {*_entries, 0};
}
inline List::Iterator List::end() const {
    return {*_entries, size()};
}

inline Number Dictionary::number(const StringKey& key) const {
    const Value* found = entries().find(key);
    return found != nullptr ? found->asNumber() : Number();
}

}  // namespace platform

#endif
