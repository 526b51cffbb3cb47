// Recorder: writes what a device gives to its client.
#ifndef ZR_DEVICES_RECORDING_RECORDER_H
#define ZR_DEVICES_RECORDING_RECORDER_H

#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <string_view>
#include <utility>
#include <vector>

#include "devices/recording/entry.h"
#include "platform/services.h"
#include "platform/sync.h"

namespace recording {

// Entries are queued where they come up and written by a thread of the recorder's own: a capture thread takes a
// lock for a moment and never waits for the file. When the file is too slow the queue is full, and what comes
// then is lost: the recording has a hole there, which says how much. Calls have room of their own, so that the
// frames of a fast camera never crowd them out.
//
// Owner    Its maker, and everything that is recorded. It works until finish().
// Threads  Any.
class Recorder : public std::enable_shared_from_this<Recorder> {
  public:
    // Takes the next bytes of the file, on the recorder's thread. Must not throw.
    using Write = std::function<void(std::string_view bytes)>;

    // Entries that wait to be written, of each sort.
    static constexpr std::size_t kMostDeliveries = 4096;
    static constexpr std::size_t kMostCalls = 4096;

    // Begins a recording of a device. Throws std::system_error when no thread can be started.
    static std::shared_ptr<Recorder> start(Session session, Write write);

    explicit Recorder(Write write) : _write(std::move(write)) {}
    Recorder(const Recorder&) = delete;
    Recorder& operator=(const Recorder&) = delete;
    ~Recorder() = default;

    // The device's services, recorded. A null service stays null. Call it once.
    platform::Services record(platform::Services device);

    // Notes that a run begins.
    void beginRun(Run run) { add(now(), std::move(run)); }

    // Ends the recording and waits until all of it is written. What is recorded goes on working; what comes later is
    // not recorded. Returns what was lost.
    Hole finish();

    // What the decorators use.

    // Since the recording began.
    Microseconds now() const;
    // The number of an object that is new.
    ObjectId newObject() { return ++_lastObject; }
    void add(Microseconds at, Content content);

    // Makes a call of the device and records it. describe(result) is the result as a value. The error that the device
    // stores is recorded and handed on.
    template <class Inner, class Describe>
    auto call(Operation operation,
              ObjectId object,
              platform::Value arguments,
              platform::ErrorSlot error,
              Inner inner,
              Describe describe) {
        const Microseconds began = now();
        platform::ErrorRef stored;
        auto result = inner(&stored);
        add(began, Call{operation, object, std::move(arguments), describe(result), stored});
        if (error != nullptr && stored != nullptr) {
            *error = std::move(stored);
        }
        return result;
    }
    // A call whose result is a number.
    template <class Inner>
    auto call(Operation operation,
              ObjectId object,
              platform::Value arguments,
              platform::ErrorSlot error,
              Inner inner) {
        return call(operation, object, std::move(arguments), error, inner,
                    [](auto result) { return platform::Value(result); });
    }

  private:
    void _writeAll();

    const std::chrono::steady_clock::time_point _start = std::chrono::steady_clock::now();
    const Write _write;
    // Any thread may come across an object.
    std::atomic<ObjectId> _lastObject{0};

    platform::Mutex _mutex;
    platform::Condition _changed;
    std::vector<Entry> _queue ZR_GUARDED_BY(_mutex);
    std::size_t _deliveries ZR_GUARDED_BY(_mutex) = 0;  // in the queue
    Hole _hole ZR_GUARDED_BY(_mutex);                   // at the queue's end
    Hole _lost ZR_GUARDED_BY(_mutex);                   // in all
    bool _isEnding ZR_GUARDED_BY(_mutex) = false;
    bool _hasEnded ZR_GUARDED_BY(_mutex) = false;
};

using RecorderRef = std::shared_ptr<Recorder>;

}  // namespace recording

#endif
