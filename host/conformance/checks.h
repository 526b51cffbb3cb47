// Checks: what came of the promises of one interface. The tables of promises stand beside the sessions that check
// them, one for each service.
#ifndef ZR_HOST_CONFORMANCE_CHECKS_H
#define ZR_HOST_CONFORMANCE_CHECKS_H

#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "platform/error.h"
#include "platform/sync.h"
#include "platform/text_format.h"
#include "platform/value.h"

namespace host {

// A promise of an interface's header, under the name of the broken device that it is there to find.
struct Promise {
    std::string_view check;  // "handler called after invalidation"
    std::string_view text;   // "After invalidate() no handler is called any more"
    // Whether a recording of the device shows it. What else a replay keeps, it keeps by itself.
    bool isRecorded = true;
};

// Of every service that has calls with an error slot.
inline constexpr Promise kSlotPromise = {"error slot written on success",
                                         "A call that succeeds leaves the error slot alone"};

enum class Finding { NotChecked, Kept, Broken };

struct CheckRecord {
    Promise promise;
    Finding finding = Finding::NotChecked;
    std::uint64_t times = 0;  // how often it was seen broken
    std::string detail = {};  // how it was broken first, or why it was not checked
};

// Threads  Any: devices call handlers on threads of their own.
class Checks {
  public:
    // `unanswered`: see devices::Device; empty for a device that answers every call. Any other is a recording.
    Checks(std::span<const Promise> promises, std::function<std::uint64_t()> unanswered);

    // The check at that place of the table was made. One that was broken stays so.
    void kept(std::size_t check);
    void broken(std::size_t check, std::string_view how);
    void decide(std::size_t check, bool isKept, std::string_view how) {
        isKept ? kept(check) : broken(check, how);
    }
    // Why the checks that are not made yet cannot be made: the first reason holds.
    void giveUp(std::string_view why);
    void notChecked(std::size_t check, std::string_view why);

    // Makes calls; returns whether the device answered all of them, which a recording does not when they were
    // not recorded.
    template <class Calls>
    bool answered(const Calls& calls) const {
        const std::uint64_t before = _unanswered ? _unanswered() : 0;
        calls();
        return !_unanswered || _unanswered() == before;
    }

    // The same for calls that one check alone needs: when they are not answered it is not checked.
    template <class Calls>
    bool answered(std::size_t check, const Calls& calls) {
        const bool isAnswered = answered(calls);
        if (!isAnswered) {
            notChecked(check, "the device has no answer to this call");
        }
        return isAnswered;
    }

    // Makes a call with a slot, and checks at `slotCheck` that it leaves the slot alone when it succeeds. Returns
    // its result; a failure is the reason of giveUp().
    template <class Call>
    auto call(std::size_t slotCheck, std::string_view operation, const Call& make) {
        platform::ErrorRef error;
        auto result = make(&error);
        if (_isSuccess(result)) {
            decide(slotCheck, error == nullptr,
                   platform::format("%@ succeeded and stored an error", operation));
        } else {
            giveUp(error != nullptr
                       ? platform::format("%@ failed: %@", operation, error->localizedDescription())
                       : platform::format("%@ failed", operation));
        }
        return result;
    }

    // In the order of the table.
    std::vector<CheckRecord> records() const;

  private:
    template <class Result>
    static bool _isSuccess(const Result& result) {
        return static_cast<bool>(result);
    }
    static bool _isSuccess(const platform::Value& result) { return result.isPresent(); }

    const std::function<std::uint64_t()> _unanswered;

    mutable platform::Mutex _mutex;
    std::vector<CheckRecord> _records ZR_GUARDED_BY(_mutex);
};

}  // namespace host

#endif
