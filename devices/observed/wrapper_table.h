// WrapperTable: the wrappers of objects that a device hands out again and again.
#ifndef ZR_DEVICES_OBSERVED_WRAPPER_TABLE_H
#define ZR_DEVICES_OBSERVED_WRAPPER_TABLE_H

#include <memory>
#include <vector>

#include "platform/sync.h"

namespace observed {

// An object has one wrapper while that is held, and one State as long as the object lives: what is
// known of it outlives its wrapper. A Wrapper is made from the object and its state. The table keeps
// neither objects nor wrappers alive. Any thread.
template <class Object, class State, class Wrapper>
class WrapperTable {
  public:
    // The object's wrapper. makeState() makes the state of an object that is new; null for null.
    template <class MakeState>
    std::shared_ptr<Object> wrap(const std::shared_ptr<Object>& object, MakeState makeState) {
        if (object == nullptr) {
            return nullptr;
        }
        const platform::MutexLock lock(_mutex);
        Entry& entry = _entryOf(object, makeState);
        auto wrapper = entry.wrapper.lock();
        if (wrapper == nullptr) {
            wrapper = std::make_shared<Wrapper>(object, entry.state);
            entry.wrapper = wrapper;
        }
        return wrapper;
    }

  private:
    struct Entry {
        const Object* address;  // several objects may have one owner
        std::weak_ptr<Object> object;
        std::shared_ptr<State> state;
        std::weak_ptr<Wrapper> wrapper;
    };

    // Objects are compared by their owners, without a reference to them: the last reference to an
    // object must not go while the lock is held.
    static bool _isOf(const Entry& entry, const std::shared_ptr<Object>& object) {
        return entry.address == object.get() && !entry.object.owner_before(object) &&
               !object.owner_before(entry.object);
    }

    template <class MakeState>
    Entry& _entryOf(const std::shared_ptr<Object>& object, MakeState makeState)
        ZR_REQUIRES(_mutex) {
        std::erase_if(_entries, [](const Entry& entry) { return entry.object.expired(); });
        for (Entry& entry : _entries) {
            if (_isOf(entry, object)) {
                return entry;
            }
        }
        return _entries.emplace_back(Entry{object.get(), object, makeState(), {}});
    }

    platform::Mutex _mutex;
    std::vector<Entry> _entries ZR_GUARDED_BY(_mutex);
};

// The objects with those behind the wrappers among them, each a Wrapper with inner(), in their place.
template <class Wrapper, class Object>
std::vector<std::shared_ptr<Object>> unwrapped(std::vector<std::shared_ptr<Object>> objects) {
    for (auto& object : objects) {
        if (const auto* wrapper = dynamic_cast<const Wrapper*>(object.get())) {
            object = wrapper->inner();
        }
    }
    return objects;
}

}  // namespace observed

#endif
