#include "devices/faulty/damage.h"

#include <utility>

namespace faulty {

namespace {

using platform::Dictionary;
using platform::Value;

Value ofAnotherKind(const Value& value) {
    return value.string() != nullptr ? Value(1) : Value("of the wrong kind");
}

}  // namespace

Value damaged(const Value& value, Way way) {
    if (way == Way::AbsentValue) {
        return {};
    }
    if (way == Way::WrongKind) {
        return ofAnotherKind(value);
    }
    const Dictionary* dictionary = value.dictionary();
    if (dictionary == nullptr) {
        return value;
    }
    platform::MutableDictionary entries;
    if (way == Way::WrongEntries) {
        for (const auto& [key, entry] : *dictionary) {
            entries.set(key, ofAnotherKind(entry));
        }
    }
    return Dictionary(std::move(entries));
}

}  // namespace faulty
