#include "platform/value.h"

#include <algorithm>

namespace platform {

namespace {

// The one value that holds nothing, for look-ups that find nothing. Never destroyed: a work item may
// still look something up while the process exits.
const Value& nothing() {
    static const Value& value = *new Value;
    return value;
}

const std::shared_ptr<const MutableDictionary>& noEntries() {
    static const auto& entries =
        *new std::shared_ptr<const MutableDictionary>(new MutableDictionary);
    return entries;
}

}  // namespace

const std::shared_ptr<const List::Entries>& List::_none() {
    static const auto& entries =
        *new std::shared_ptr<const Entries>(new EntriesIn<MutableList>(MutableList()));
    return entries;
}

List::List() : _entries(_none()) {}
List::List(MutableList entries)
    : _entries(std::make_shared<const EntriesIn<MutableList>>(std::move(entries))) {}
List::List(std::initializer_list<Value> entries) : List(MutableList(entries)) {}

bool operator==(const List& a, const List& b) {
    return a._entries == b._entries ||
           (a.size() == b.size() && std::equal(a.begin(), a.end(), b.begin()));
}

Dictionary::Dictionary() : _entries(noEntries()) {}
Dictionary::Dictionary(MutableDictionary entries)
    : _entries(std::make_shared<const MutableDictionary>(std::move(entries))) {}
Dictionary::Dictionary(std::initializer_list<std::pair<std::string_view, Value>> entries) {
    std::size_t keyBytes = 0;
    for (const auto& entry : entries) {
        keyBytes += entry.first.size();
    }
    MutableDictionary growing;
    growing.reserve(entries.size(), keyBytes);
    for (const auto& [key, value] : entries) {
        growing.set(key, value);
    }
    _entries = std::make_shared<const MutableDictionary>(std::move(growing));
}

const Value& Dictionary::operator[](const StringKey& key) const {
    const Value* found = _entries->find(key);
    return found != nullptr ? *found : nothing();
}

bool operator==(const Dictionary& a, const Dictionary& b) {
    return a._entries == b._entries || *a._entries == *b._entries;
}

Value::Value(std::string text) : _content(std::make_shared<const std::string>(std::move(text))) {}

const std::string* Value::string() const& {
    const auto* held = std::get_if<std::shared_ptr<const std::string>>(&_content);
    return held != nullptr ? held->get() : nullptr;
}

const Value& Value::operator[](const StringKey& key) const {
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
