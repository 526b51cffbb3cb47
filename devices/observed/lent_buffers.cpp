#include "devices/observed/lent_buffers.h"

#include <utility>

#include "devices/observed/capture_watch.h"

namespace observed {

class LentBuffers::Loan {
  public:
    Loan(std::shared_ptr<LentBuffers> list,
         platform::ImageBufferRef lent,
         std::shared_ptr<const StreamWatch> from,
         TimePoint now)
        : buffer(std::move(lent)), stream(std::move(from)), since(now), _list(std::move(list)) {
        _list->_add(*this);
    }
    Loan(const Loan&) = delete;
    Loan& operator=(const Loan&) = delete;

    // First the device gets its buffer back, without a lock of ours.
    ~Loan() {
        buffer = nullptr;
        _list->_remove(*this);
    }

    platform::ImageBufferRef buffer;
    const std::shared_ptr<const StreamWatch> stream;
    const TimePoint since;
    Loan* previous = nullptr;  // these two are guarded by the list's mutex
    Loan* next = nullptr;

  private:
    const std::shared_ptr<LentBuffers> _list;
};

platform::ImageBufferRef LentBuffers::lend(platform::ImageBufferRef buffer,
                                           std::shared_ptr<const StreamWatch> stream,
                                           TimePoint now) {
    const auto loan =
        std::make_shared<Loan>(shared_from_this(), std::move(buffer), std::move(stream), now);
    return {loan, loan->buffer.get()};
}

std::size_t LentBuffers::count() const {
    const platform::MutexLock lock(_mutex);
    return _count([](const Loan& /*loan*/) { return true; });
}

std::size_t LentBuffers::countLentBefore(TimePoint moment, const StreamWatch& stream) const {
    const platform::MutexLock lock(_mutex);
    return _count(
        [&](const Loan& loan) { return loan.stream.get() == &stream && loan.since < moment; });
}

std::size_t LentBuffers::awaitReturn(const DeviceWatch& device, TimePoint deadline) {
    const auto isOfDevice = [&](const Loan& loan) { return loan.stream->device.get() == &device; };
    const platform::MutexLock lock(_mutex);
    for (;;) {
        const std::size_t out = _count(isOfDevice);
        if (out == 0 || std::chrono::steady_clock::now() >= deadline) {
            return out;
        }
        _changed.waitUntil(_mutex, deadline);
    }
}

void LentBuffers::_add(Loan& loan) {
    const platform::MutexLock lock(_mutex);
    loan.next = _first;
    if (_first != nullptr) {
        _first->previous = &loan;
    }
    _first = &loan;
}

void LentBuffers::_remove(Loan& loan) {
    const platform::MutexLock lock(_mutex);
    (loan.previous != nullptr ? loan.previous->next : _first) = loan.next;
    if (loan.next != nullptr) {
        loan.next->previous = loan.previous;
    }
    _changed.notifyAll();
}

template <class Matches>
std::size_t LentBuffers::_count(Matches matches) const {
    std::size_t count = 0;
    for (const Loan* loan = _first; loan != nullptr; loan = loan->next) {
        count += matches(*loan) ? 1 : 0;
    }
    return count;
}

}  // namespace observed
