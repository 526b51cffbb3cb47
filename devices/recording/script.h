// Script: what a replay answers and delivers, made from a recording.
#ifndef ZR_DEVICES_RECORDING_SCRIPT_H
#define ZR_DEVICES_RECORDING_SCRIPT_H

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <map>
#include <string>
#include <utility>
#include <vector>

#include "devices/recording/recording.h"
#include "platform/sync.h"

namespace recording {

// The domain of the error about a call that was not recorded; its code is 1, and its description names the call.
inline constexpr std::string_view kReplayErrorDomain = "replay";

// What was delivered after one start() of a stream, or one scheduleWithRunLoop() of a sensor, in its order.
struct Deliveries {
    std::vector<Content>
        contents;  // frames and events, or reports and perhaps that the sensor vanished
    // When each came: after the call of start(), those from `beforeStop` on after the call of stop(). A sensor's,
    // after it was scheduled.
    std::vector<Microseconds> offsets;
    std::size_t beforeStop = 0;  // how many came before the call of stop(); all of a sensor's
};

// Threads  Any. The deliveries do not change.
class Script {
  public:
    // `speed`: recorded seconds per real second.
    Script(const Recording& recording, double speed);

    // The answer to this call of the object: the next one that was recorded for a call with these arguments. Its error
    // is stored in the slot, which may be null. When there is none, the result is absent, the error is of
    // kReplayErrorDomain, and a line of the log says so too: not every call has a slot.
    platform::Value take(Operation operation,
                         ObjectId object,
                         const platform::Value& arguments,
                         platform::ErrorSlot error);

    // What a stream delivered after its start() of that number, a sensor after being scheduled so often.
    const Deliveries& deliveries(ObjectId object, std::uint32_t start) const;

    // The calls so far that had no answer.
    std::uint64_t unanswered() const { return _unanswered.load(); }

    double speed() const { return _speed; }

  private:
    struct Answer {
        platform::Value result;
        platform::ErrorRef error;
    };
    struct Answers {
        std::vector<Answer> recorded;
        std::size_t taken = 0;
    };
    using CallKey = std::pair<ObjectId, std::string>;     // the text of the call
    using StartKey = std::pair<ObjectId, std::uint32_t>;  // from 1

    void _addDeliveries(const Recording& recording);

    const double _speed;
    std::atomic<std::uint64_t> _unanswered{0};  // by any thread, read by any
    std::map<StartKey, Deliveries> _deliveries;

    platform::Mutex _mutex;
    std::map<CallKey, Answers> _answers ZR_GUARDED_BY(_mutex);
};

}  // namespace recording

#endif
