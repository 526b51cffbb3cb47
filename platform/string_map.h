// StringMap<T>: a growable map from strings to values with one owner.
//
// Setting and looking up cost the same for any number of entries: the entries lie in the order in which
// they came, found through a hash index. Iteration is in byte order of the keys, whatever the order in
// which they came; begin() sorts for it. Entries, index and keys share one allocation.
//
// Looking up and iterating change nothing, so threads may share a map that does not change any more.
#ifndef ZR_PLATFORM_STRING_MAP_H
#define ZR_PLATFORM_STRING_MAP_H

#include <algorithm>
#include <bit>
#include <concepts>
#include <cstddef>
#include <cstdint>
#include <iterator>
#include <limits>
#include <memory>
#include <new>
#include <string_view>
#include <type_traits>
#include <utility>
#include <vector>

#include "platform/string_key.h"

namespace platform {

template <class T>
class StringMap {
  public:
    // What iteration yields. Views of the map, valid until it changes.
    using Entry = std::pair<std::string_view, const T&>;
    class Iterator;

    StringMap() = default;
    StringMap(const StringMap& other) : StringMap() {
        reserve(other._size, other._liveKeysSize());
        for (std::size_t at = 0; at < other._size; ++at) {
            _place(other._keyOf(other._block.entries[at]), T(other._block.entries[at].value));
        }
        _enterAll(other._block);
    }
    StringMap(StringMap&& other) noexcept { _swap(other); }
    StringMap& operator=(StringMap other) noexcept {
        _swap(other);
        return *this;
    }
    ~StringMap() { std::destroy_n(_block.entries, _size); }

    // Makes room for that many entries, whose keys have `keyBytes` bytes in all.
    void reserve(std::size_t entries, std::size_t keyBytes) {
        if (entries > _block.capacity || keyBytes > _block.keysCapacity) {
            _moveTo(std::max(entries, _block.capacity), std::max(keyBytes, _block.keysCapacity));
        }
    }
    void reserve(std::size_t entries) { reserve(entries, entries * kUsualKeySize); }

    // Stores `value`, or what T makes of it, under `key`; a value already there is replaced. Both may be
    // parts of this map.
    template <std::convertible_to<T> U = T>
    void set(const StringKey& key, U&& value) {
        if (Stored* stored = _find(key)) {
            stored->value = T(std::forward<U>(value));
        } else if (_size < _block.capacity &&
                   key.text().size() <= _block.keysCapacity - _keysSize) {
            _place(key.text(), std::forward<U>(value));
            _enter(key.hash(), _size);
        } else {
            T made(std::forward<U>(value));  // before what it may be part of moves
            const Block before = _grow(key.text().size());
            _place(key.text(), std::move(made));
            _enter(key.hash(), _size);
        }
    }

    // Takes the entry under `key` away, if there is one.
    void remove(const StringKey& key) {
        if (Stored* removed = _find(key)) {
            Stored* last = _block.entries + _size - 1;
            if (removed != last) {
                *removed = std::move(*last);
            }
            std::destroy_at(last);
            --_size;
            _index();
        }
    }

    // The value under `key`, or null. Valid until the map changes.
    const T* find(const StringKey& key) const {
        const Stored* stored = _find(key);
        return stored != nullptr ? &stored->value : nullptr;
    }

    bool contains(const StringKey& key) const { return _find(key) != nullptr; }
    std::size_t size() const { return _size; }
    bool empty() const { return _size == 0; }

    // In byte order of the keys. begin() sorts what it visits into memory of its own.
    Iterator begin() const { return Iterator(*this); }
    Iterator end() const { return Iterator(_size); }

    // The same keys with equal values.
    friend bool operator==(const StringMap& a, const StringMap& b) {
        const auto isInB = [&](const Stored& stored) {
            const T* other = b.find(a._keyOf(stored));
            return other != nullptr && stored.value == *other;
        };
        return a._size == b._size &&
               std::all_of(a._block.entries, a._block.entries + a._size, isInB);
    }

  private:
    static constexpr std::size_t kFirstCapacity = 8;
    static constexpr std::size_t kUsualKeySize = 24;
    static constexpr std::size_t kSmall = 64;

    // An entry; its key is in the block's keys.
    struct Stored {
        T value;
        std::uint32_t keyAt;
        std::uint32_t keySize;
    };

    // Where the entry of a hash lies: one past its place, 0 in a free slot. An entry that finds its slot
    // taken goes to the next free one.
    struct Slot {
        std::uint32_t hash;
        std::uint32_t next;
    };

    // The one allocation.
    struct Block {
        Block() = default;
        Block(std::size_t entryCount, std::size_t keyBytes)
            : capacity(entryCount), keysCapacity(keyBytes) {
            static_assert(alignof(Stored) <= __STDCPP_DEFAULT_NEW_ALIGNMENT__ &&
                          sizeof(Stored) % alignof(Slot) == 0);
            if (std::max(entryCount, keyBytes) >= std::numeric_limits<std::uint32_t>::max()) {
                throw std::bad_alloc();
            }
            slotCount = std::bit_ceil(entryCount + entryCount / 2 + 1);
            const std::size_t slotsAt = entryCount * sizeof(Stored);
            const std::size_t keysAt = slotsAt + slotCount * sizeof(Slot);
            memory.reset(new std::byte[keysAt + keyBytes]);
            entries = reinterpret_cast<Stored*>(memory.get());
            slots = new (memory.get() + slotsAt) Slot[slotCount]{};
            keys = reinterpret_cast<char*>(memory.get() + keysAt);
        }

        std::unique_ptr<std::byte[]> memory;
        Stored* entries = nullptr;
        Slot* slots = nullptr;
        char* keys = nullptr;
        std::size_t capacity = 0;
        std::size_t keysCapacity = 0;
        std::size_t slotCount = 0;  // a power of two, more than `capacity`
    };

    std::string_view _keyOf(const Stored& stored) const {
        return {_block.keys + stored.keyAt, stored.keySize};
    }

    Stored* _find(const StringKey& key) const {
        if (_size == 0) {
            return nullptr;
        }
        for (std::size_t at = key.hash();; ++at) {
            const Slot& slot = _block.slots[at & (_block.slotCount - 1)];
            if (slot.next == 0) {
                return nullptr;
            }
            Stored* stored = _block.entries + slot.next - 1;
            if (slot.hash == key.hash() && _keyOf(*stored) == key.text()) {
                return stored;
            }
        }
    }

    // Makes room for another entry with a key of that size. Returns the old block, which the key may be a
    // view of.
    Block _grow(std::size_t keySize) {
        const std::size_t capacity = _size < _block.capacity ? _block.capacity : _nextCapacity();
        return _moveTo(capacity,
                       std::max(2 * (_liveKeysSize() + keySize), capacity * kUsualKeySize));
    }

    // A small map quadruples: a dictionary of some thirty keys moves its entries once.
    std::size_t _nextCapacity() const {
        return std::max(kFirstCapacity, (_size < kSmall ? 4 : 2) * _size);
    }

    // Stores an entry that has room, but does not enter it in the index.
    template <class U>
    void _place(std::string_view key, U&& value) {
        std::copy_n(key.data(), key.size(), _block.keys + _keysSize);
        ::new (static_cast<void*>(_block.entries + _size))
            Stored{T(std::forward<U>(value)), static_cast<std::uint32_t>(_keysSize),
                   static_cast<std::uint32_t>(key.size())};
        _keysSize += key.size();
        ++_size;
    }

    void _enter(std::uint32_t hash, std::size_t next) {
        std::size_t at = hash;
        while (_block.slots[at & (_block.slotCount - 1)].next != 0) {
            ++at;
        }
        _block.slots[at & (_block.slotCount - 1)] = {hash, static_cast<std::uint32_t>(next)};
    }

    // Enters what another block's index holds; the entries lie in the same places.
    void _enterAll(const Block& other) {
        for (std::size_t at = 0; at < other.slotCount; ++at) {
            if (other.slots[at].next != 0) {
                _enter(other.slots[at].hash, other.slots[at].next);
            }
        }
    }

    // Makes the index anew.
    void _index() {
        std::fill_n(_block.slots, _block.slotCount, Slot{});
        for (std::size_t at = 0; at < _size; ++at) {
            _enter(StringKey(_keyOf(_block.entries[at])).hash(), at + 1);
        }
    }

    std::size_t _liveKeysSize() const {
        std::size_t bytes = 0;
        for (std::size_t at = 0; at < _size; ++at) {
            bytes += _block.entries[at].keySize;
        }
        return bytes;
    }

    // Moves the entries, and the keys that are still used, to a block of that size. Returns the old one.
    Block _moveTo(std::size_t capacity, std::size_t keysCapacity) {
        static_assert(std::is_nothrow_move_constructible_v<T>);
        Block old(capacity, keysCapacity);
        std::swap(old, _block);
        _keysSize = 0;
        const std::size_t count = std::exchange(_size, 0);
        for (std::size_t at = 0; at < count; ++at) {
            Stored& stored = old.entries[at];
            _place({old.keys + stored.keyAt, stored.keySize}, std::move(stored.value));
            std::destroy_at(&stored);
        }
        _enterAll(old);
        return old;
    }

    void _swap(StringMap& other) noexcept {
        std::swap(_block, other._block);
        std::swap(_size, other._size);
        std::swap(_keysSize, other._keysSize);
    }

    Block _block;
    std::size_t _size = 0;
    std::size_t _keysSize = 0;  // of all keys, those that were removed included
};

// Goes through the entries once, in byte order of their keys. Copies share what begin() sorted.
template <class T>
class StringMap<T>::Iterator {
  public:
    using iterator_category = std::input_iterator_tag;
    using difference_type = std::ptrdiff_t;
    using value_type = Entry;
    using reference = Entry;
    using pointer = void;

    Entry operator*() const {
        const auto& [key, value] = (*_sorted)[_at];
        return {key, *value};
    }
    Iterator& operator++() {
        ++_at;
        return *this;
    }
    Iterator operator++(int) {
        Iterator before = *this;
        ++_at;
        return before;
    }
    friend bool operator==(const Iterator& a, const Iterator& b) { return a._at == b._at; }

  private:
    friend class StringMap;
    using Sorted = std::vector<std::pair<std::string_view, const T*>>;

    explicit Iterator(std::size_t at) : _at(at) {}
    explicit Iterator(const StringMap& map) : _sorted(std::make_shared<Sorted>()) {
        _sorted->reserve(map._size);
        for (std::size_t at = 0; at < map._size; ++at) {
            const Stored& stored = map._block.entries[at];
            _sorted->emplace_back(map._keyOf(stored), &stored.value);
        }
        std::sort(_sorted->begin(), _sorted->end(),
                  [](const auto& a, const auto& b) { return a.first < b.first; });
    }

    std::shared_ptr<Sorted> _sorted;
    std::size_t _at = 0;
};

}  // namespace platform

#endif
