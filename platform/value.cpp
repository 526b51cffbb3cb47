#include "platform/value.h"

namespace platform {

namespace {

// The one value that holds nothing, for look-ups that find nothing. Never destroyed: a work item may
// still look something up while the process exits.
const Value& nothing() {
    static const Value& value = *new Value;
    return value;
}

template <class Entries>
std::shared_ptr<const Entries> noEntries() {
    static const auto& entries = *new std::shared_ptr<const Entries>(new Entries);
    return entries;
}

}  // namespace

List::List() : _entries(noEntries<MutableList>()) {}
List::List(MutableList entries)
    : _entries(std::make_shared<const MutableList>(std::move(entries))) {}
List::List(std::initializer_list<Value> entries) : List(MutableList(entries)) {}

std::size_t List::size() const {
    return _entries->size();
}
const Value& List::operator[](std::size_t index) const {
    return (*_entries)[index];
}
const Value* List::begin() const {
    return _entries->data();
}
const Value* List::end() const {
    return _entries->data() + _entries->size();
}

bool operator==(const List& a, const List& b) {
    return a._entries == b._entries || *a._entries == *b._entries;
}

Dictionary::Dictionary() : _entries(noEntries<MutableDictionary>()) {}
Dictionary::Dictionary(MutableDictionary entries)
    : _entries(std::make_shared<const MutableDictionary>(std::move(entries))) {}
Dictionary::Dictionary(std::initializer_list<std::pair<std::string_view, Value>> entries) {
    MutableDictionary growing;
    growing.reserve(entries.size());
    for (const auto& [key, value] : entries) {
        growing.set(key, value);
    }
    _entries = std::make_shared<const MutableDictionary>(std::move(growing));
}

const Value& Dictionary::operator[](std::string_view key) const {
    const Value* found = _entries->find(key);
    return found != nullptr ? *found : nothing();
}
Number Dictionary::number(std::string_view key) const {
    return (*this)[key].asNumber();
}
bool Dictionary::contains(std::string_view key) const {
    return _entries->contains(key);
}

bool operator==(const Dictionary& a, const Dictionary& b) {
    return a._entries == b._entries || *a._entries == *b._entries;
}

Value::Value(const Number& number) {
    if (number.isPresent()) {
        _content = number;
    }
}
Value::Value(std::string text) : _content(std::make_shared<const std::string>(std::move(text))) {}

const std::string* Value::string() const {
    const auto* held = std::get_if<std::shared_ptr<const std::string>>(&_content);
    return held != nullptr ? held->get() : nullptr;
}

const Value& Value::operator[](std::string_view key) const {
    const Dictionary* entries = dictionary();
    return entries != nullptr ? (*entries)[key] : nothing();
}

bool operator==(const Value& a, const Value& b) {
    if (a.string() != nullptr && b.string() != nullptr) {
        return *a.string() == *b.string();
    }
    return a._content == b._content;
}

}  // namespace platform
