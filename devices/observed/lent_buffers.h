// LentBuffers: the image buffers that a client holds.
#ifndef ZR_DEVICES_OBSERVED_LENT_BUFFERS_H
#define ZR_DEVICES_OBSERVED_LENT_BUFFERS_H

#include <chrono>
#include <cstddef>
#include <memory>

#include "platform/image_buffer.h"
#include "platform/sync.h"

namespace observed {

struct DeviceWatch;
struct StreamWatch;

// Shared with every buffer that is out. Any thread.
class LentBuffers : public std::enable_shared_from_this<LentBuffers> {
  public:
    using TimePoint = std::chrono::steady_clock::time_point;

    // The same buffer, counted until the last reference to the result goes; the device has it back by
    // then. One allocation.
    platform::ImageBufferRef lend(platform::ImageBufferRef buffer,
                                  std::shared_ptr<const StreamWatch> stream,
                                  TimePoint now);

    std::size_t count() const;

    // The stream's buffers that were lent before `moment`.
    std::size_t countLentBefore(TimePoint moment, const StreamWatch& stream) const;

    // Waits until none of the device's buffers is out, at most until `deadline`. Returns how many are.
    std::size_t awaitReturn(const DeviceWatch& device, TimePoint deadline);

  private:
    // A buffer that is out: an entry of the list below, in the same block as its reference count.
    class Loan;

    void _add(Loan& loan);
    void _remove(Loan& loan);
    template <class Matches>
    std::size_t _count(Matches matches) const ZR_REQUIRES(_mutex);

    mutable platform::Mutex _mutex;
    platform::Condition _changed;
    Loan* _first ZR_GUARDED_BY(_mutex) = nullptr;
};

}  // namespace observed

#endif
