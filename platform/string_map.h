// StringMap<T>: a growable map from strings to values with one owner.
//
// Entries lie in one block, sorted by key (byte order), so iteration is in that order and a look-up
// is a binary search that allocates nothing. Meant for dictionaries of up to a few thousand entries
// that are filled once and read often.
#ifndef ZR_PLATFORM_STRING_MAP_H
#define ZR_PLATFORM_STRING_MAP_H

#include <algorithm>
#include <cstddef>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace platform {

template <class T>
class StringMap {
  public:
    using Entry = std::pair<std::string, T>;

    StringMap() = default;

    void reserve(std::size_t entries) { _entries.reserve(entries); }

    // Stores `value` under `key`; a value already there is replaced.
    void set(std::string_view key, T value) {
        const auto place = _lowerBound(key);
        if (place != _entries.end() && place->first == key) {
            place->second = std::move(value);
        } else {
            _entries.emplace(place, std::string(key), std::move(value));
        }
    }

    // Takes the entry under `key` away, if there is one.
    void remove(std::string_view key) {
        const auto place = _lowerBound(key);
        if (place != _entries.end() && place->first == key) {
            _entries.erase(place);
        }
    }

    // The value under `key`, or null. Valid until the map changes.
    const T* find(std::string_view key) const {
        const auto place = _lowerBound(key);
        return place != _entries.end() && place->first == key ? &place->second : nullptr;
    }

    bool contains(std::string_view key) const { return find(key) != nullptr; }
    std::size_t size() const { return _entries.size(); }
    bool empty() const { return _entries.empty(); }
    auto begin() const { return _entries.begin(); }
    auto end() const { return _entries.end(); }

    // Not defaulted: clang would instantiate T's comparison here, and T may be incomplete.
    friend bool operator==(const StringMap& a, const StringMap& b) {
        return a._entries == b._entries;
    }

  private:
    static bool _before(const Entry& entry, std::string_view key) { return entry.first < key; }
    auto _lowerBound(std::string_view key) const {
        return std::lower_bound(_entries.begin(), _entries.end(), key, _before);
    }
    auto _lowerBound(std::string_view key) {
        return std::lower_bound(_entries.begin(), _entries.end(), key, _before);
    }

    std::vector<Entry> _entries;
};

}  // namespace platform

#endif
