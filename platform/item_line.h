// ItemLine: the items of a work queue, first to last.
#ifndef ZR_PLATFORM_ITEM_LINE_H
#define ZR_PLATFORM_ITEM_LINE_H

#include <array>
#include <cstddef>
#include <memory>
#include <utility>

#include "platform/run_tag.h"
#include "platform/work_item.h"

namespace platform {

// An item with what it takes over from the thread that queued it.
struct Queued {
    WorkItem item;
    RunTag run = 0;
};

// Keeps items in chunks of 32, so that a long line moves no item twice, and keeps up to 32 chunks (80 kB) to
// use again, so that a line of up to 1,024 items allocates nothing once it has had as many. One thread at a
// time. It must be empty when it ends: a long chain of chunks would not end on the stack.
class ItemLine {
  public:
    ItemLine() = default;
    ItemLine(const ItemLine&) = delete;
    ItemLine& operator=(const ItemLine&) = delete;

    bool isEmpty() const { return _first == nullptr; }

    // Moves the item to where it will run.
    void add(WorkItem&& item, RunTag run) {
        if (_last == nullptr || _last->count == kItems) {
            std::unique_ptr<Chunk>& place = _last == nullptr ? _first : _last->next;
            place = _spare != nullptr ? _takeSpare() : std::make_unique<Chunk>();
            _last = place.get();
        }
        Queued& added = _last->items[_last->count++];
        added.item = std::move(item);
        added.run = run;
    }

    // Takes the items of the other line and gives it its spare room. This line must be empty.
    void takeAll(ItemLine& other) {
        std::swap(_first, other._first);
        std::swap(_last, other._last);
        std::swap(_spare, other._spare);
        std::swap(_spareCount, other._spareCount);
    }

    // Runs each item, under its tag, and lets go of what it captured before the next one starts. The line
    // is empty then.
    void run() {
        while (_first != nullptr) {
            for (std::size_t at = 0; at < _first->count; ++at) {
                auto& [item, run] = _first->items[at];
                const RunTagScope scope(run);
                item();
                item = WorkItem();
            }
            _first->count = 0;
            std::unique_ptr<Chunk> done = std::exchange(_first, std::move(_first->next));
            if (_spareCount < kMostSpare) {
                done->next = std::move(_spare);
                _spare = std::move(done);
                ++_spareCount;
            }
        }
        _last = nullptr;
    }

  private:
    static constexpr std::size_t kItems = 32;
    static constexpr std::size_t kMostSpare = 32;
    struct Chunk {
        std::array<Queued, kItems> items;
        std::size_t count = 0;
        std::unique_ptr<Chunk> next;
    };

    std::unique_ptr<Chunk> _takeSpare() {
        --_spareCount;
        return std::exchange(_spare, std::move(_spare->next));
    }

    std::unique_ptr<Chunk> _first;
    Chunk* _last = nullptr;
    std::unique_ptr<Chunk> _spare;
    std::size_t _spareCount = 0;
};

}  // namespace platform

#endif
