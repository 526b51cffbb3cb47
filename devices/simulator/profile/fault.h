// Fault: whether a call on the simulated device fails, and with which error object, if any.
#ifndef ZR_DEVICES_SIMULATOR_PROFILE_FAULT_H
#define ZR_DEVICES_SIMULATOR_PROFILE_FAULT_H

#include <utility>

#include "platform/error.h"

namespace simulator {

class Fault {
  public:
    // A call that succeeds.
    Fault() = default;

    // A call that fails and reports `error`; null fails without an error object.
    static Fault failing(platform::ErrorRef error) {
        Fault fault;
        fault._fails = true;
        fault._error = std::move(error);
        return fault;
    }

    bool fails() const { return _fails; }
    const platform::ErrorRef& error() const { return _error; }  // null: none, or the call succeeds

    // Returns whether the call fails. If it does and there is an error object, stores it in the slot
    // (which may be null).
    bool strikes(platform::ErrorSlot slot) const {
        if (_fails) {
            static_cast<void>(platform::failWith(slot, _error));
        }
        return _fails;
    }

  private:
    bool _fails = false;
    platform::ErrorRef _error;
};

}  // namespace simulator

#endif
