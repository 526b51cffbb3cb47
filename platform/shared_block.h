// SharedBlock<T>: makes shared objects of one type, many of them in one allocation.
//
// Each is an object with references of its own, as from std::make_shared. A block's memory is released
// once none of its objects is referenced any more.
#ifndef ZR_PLATFORM_SHARED_BLOCK_H
#define ZR_PLATFORM_SHARED_BLOCK_H

#include <algorithm>
#include <cstddef>
#include <memory>
#include <utility>
#include <vector>

namespace platform {

template <class T>
class SharedBlock {
  public:
    // `count` objects per block; after that many another block follows.
    explicit SharedBlock(std::size_t count) : _count(std::max<std::size_t>(count, 1)) {}

    template <class... Args>
    std::shared_ptr<T> make(Args&&... args) {
        if (_objects == nullptr || _objects->size() == _objects->capacity()) {
            _objects = std::make_shared<std::vector<T>>();
            _objects->reserve(_count);
        }
        T& made = _objects->emplace_back(std::forward<Args>(args)...);
        return {_objects, &made};
    }

  private:
    std::size_t _count;
    std::shared_ptr<std::vector<T>> _objects;  // never reallocated
};

}  // namespace platform

#endif
