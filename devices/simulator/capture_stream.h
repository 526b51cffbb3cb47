// A stream of the simulated capture service.
#ifndef ZR_DEVICES_SIMULATOR_CAPTURE_STREAM_H
#define ZR_DEVICES_SIMULATOR_CAPTURE_STREAM_H

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <string_view>
#include <thread>
#include <utility>

#include "devices/simulator/capture_service.h"
#include "platform/sync.h"
#include "platform/welkin/capture.h"

namespace simulator {

// What a plug-in, its devices and their streams share.
struct CaptureContext {
    CaptureProfile profile;
    double speed;
    std::shared_ptr<StreamProgress> progress;
};

// Owner    Its device and the client; while it delivers also its delivery thread, so the last reference
//          may go there.
// Threads  Any; no lock is held while a handler runs.
class SimulatedStream final : public WLRylCaptureStream,
                              public std::enable_shared_from_this<SimulatedStream> {
  public:
    // `profile` lies in the context.
    SimulatedStream(std::shared_ptr<const CaptureContext> context, const StreamProfile& profile)
        : _context(std::move(context)), _profile(profile) {}

    platform::Value valueForProperty(std::string_view property, platform::ErrorSlot error) override;
    bool setValue(const platform::Value& value,
                  std::string_view forProperty,
                  platform::ErrorSlot error) override;
    bool start(platform::ErrorSlot error) override;

    // Waits for a handler in progress, unless a handler calls it.
    bool stop(platform::ErrorSlot error) override;

    bool grantControl(platform::ErrorSlot error);

    // Ends the stream for good and drops its handlers. invalidate() waits for a handler in progress,
    // unless a handler calls it; abandon() never waits.
    void invalidate();
    void abandon();

  private:
    enum class State { Idle, Running, Stopping, Stopped, Invalid };
    using TimePoint = std::chrono::steady_clock::time_point;

    bool _isUsable(bool needsControl);
    platform::Value _end() ZR_REQUIRES(_mutex);
    void _waitForHandler() ZR_REQUIRES(_mutex);

    // The delivery thread.
    void _deliver(std::uint64_t run, double rate);
    TimePoint _dueTime(std::uint64_t frame, double rate, TimePoint started) const;
    bool _awaitTurn(std::uint64_t run, TimePoint due);
    void _endTurn();
    void _handOver(std::uint64_t frame, std::uint64_t microseconds);
    platform::Value _handlers();
    platform::ImageBufferRef _makeBuffer(const platform::Value& metadata);
    void _bufferCameBack();

    const std::shared_ptr<const CaptureContext> _context;
    const StreamProfile& _profile;

    platform::Mutex _mutex;
    platform::Condition _changed;
    State _state ZR_GUARDED_BY(_mutex) = State::Idle;
    bool _controlled ZR_GUARDED_BY(_mutex) = false;
    platform::MutableDictionary _properties ZR_GUARDED_BY(_mutex);
    std::uint64_t _run ZR_GUARDED_BY(_mutex) = 0;  // the delivery thread of another run ends
    std::uint64_t _framesAfterStop ZR_GUARDED_BY(_mutex) = 0;
    std::size_t _buffersOut ZR_GUARDED_BY(_mutex) = 0;
    std::thread::id _inHandler ZR_GUARDED_BY(_mutex);  // the thread that is delivering, or none
};

}  // namespace simulator

#endif
