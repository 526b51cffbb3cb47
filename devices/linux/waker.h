// Waker: what a thread that sleeps in poll() is woken by.
#ifndef ZR_DEVICES_LINUX_WAKER_H
#define ZR_DEVICES_LINUX_WAKER_H

#include <cstdint>

#include <sys/eventfd.h>

#include "devices/linux/file_descriptor.h"
#include "devices/linux/system_problem.h"

namespace linux_device {

// Any thread. Once woken, its descriptor stays readable. Throws a SystemProblem when the process has no more
// descriptors.
class Waker {
  public:
    Waker() : _event(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
        if (!_event.isOpen()) {
            failWithErrno("eventfd");
        }
    }

    void wake() const {
        constexpr std::uint64_t kOne = 1;
        // Can only fail by being readable already.
        static_cast<void>(::write(_event.number(), &kOne, sizeof kOne));
    }

    int descriptor() const { return _event.number(); }

  private:
    FileDescriptor _event;
};

}  // namespace linux_device

#endif
