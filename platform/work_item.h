// WorkItem: what a work queue runs once: a callable with no arguments.
#ifndef ZR_PLATFORM_WORK_ITEM_H
#define ZR_PLATFORM_WORK_ITEM_H

#include <concepts>
#include <cstddef>
#include <memory>
#include <new>
#include <type_traits>
#include <utility>

namespace platform {

// Owns what the callable captured; up to 64 bytes of that need no allocation. Unlike std::function it
// takes a callable that cannot be copied.
class WorkItem {
  public:
    WorkItem() = default;  // empty; must not be run

    template <class Callable>
    requires(!std::same_as<Callable, WorkItem> && std::invocable<Callable&>)
        WorkItem(Callable callable) {
        if constexpr (kFitsInside<Callable>) {
            ::new (static_cast<void*>(_inside)) Callable(std::move(callable));
            _operations = &kOperationsOf<Callable>;
        } else {
            *this =
                WorkItem([kept = std::make_unique<Callable>(std::move(callable))] { (*kept)(); });
        }
    }

    WorkItem(WorkItem&& other) noexcept { _take(other); }
    WorkItem& operator=(WorkItem&& other) noexcept {
        if (this != &other) {
            _drop();
            _take(other);
        }
        return *this;
    }
    ~WorkItem() { _drop(); }

    void operator()() { _operations->run(_inside); }

  private:
    static constexpr std::size_t kInside = 64;  // bytes
    static constexpr std::size_t kAlignment = alignof(void*);

    // What depends on the callable's type.
    struct Operations {
        void (*run)(void* callable);
        void (*move)(void* to, void* from) noexcept;  // and destroys what was moved from
        void (*destroy)(void* callable) noexcept;
    };

    template <class Kept>
    static constexpr bool kFitsInside = std::is_nothrow_move_constructible_v<Kept> &&
                                        sizeof(Kept) <= kInside && alignof(Kept) <= kAlignment;

    template <class Kept>
    static constexpr Operations kOperationsOf{
        [](void* callable) { (*static_cast<Kept*>(callable))(); },
        [](void* to, void* from) noexcept {
            ::new (to) Kept(std::move(*static_cast<Kept*>(from)));
            static_cast<Kept*>(from)->~Kept();
        },
        [](void* callable) noexcept { static_cast<Kept*>(callable)->~Kept(); }};

    void _take(WorkItem& other) noexcept {
        if (other._operations != nullptr) {
            other._operations->move(_inside, other._inside);
            _operations = std::exchange(other._operations, nullptr);
        }
    }
    void _drop() noexcept {
        if (_operations != nullptr) {
            std::exchange(_operations, nullptr)->destroy(_inside);
        }
    }

    const Operations* _operations = nullptr;
    alignas(kAlignment) std::byte _inside[kInside];
};

}  // namespace platform

#endif
