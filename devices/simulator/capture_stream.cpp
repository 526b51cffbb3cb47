#include "devices/simulator/capture_stream.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include <pthread.h>

#include "devices/simulator/due_time.h"
#include "devices/simulator/frame_metadata.h"
#include "devices/written_handlers.h"

namespace simulator {

namespace {

using platform::MutexLock;
using platform::Value;
using Clock = std::chrono::steady_clock;

constexpr std::size_t kImageBuffers = 16;
constexpr double kDefaultRate = 30;  // frames per second
constexpr double kLowestRate = 1;
constexpr double kHighestRate = 1000;

std::uint64_t microsecondsAt(std::uint64_t frame, double rate) {
    return static_cast<std::uint64_t>(std::llround(static_cast<double>(frame) * 1e6 / rate));
}

// The rate that was written, within what the sensor can do.
double sensorRate(const Value* configured) {
    const double rate = configured != nullptr ? configured->asNumber().asDouble() : kDefaultRate;
    return rate > kLowestRate ? std::min(rate, kHighestRate) : kLowestRate;
}

}  // namespace

Value SimulatedStream::valueForProperty(std::string_view property, platform::ErrorSlot error) {
    const Fault* fault = _profile.propertyFaults.find(property);
    if (!_isUsable(false) || (fault != nullptr && fault->strikes(error))) {
        return {};
    }
    if (property == kRylCaptureStreamProperty_PortType) {
        return _profile.portType;
    }
    if (property == kRylCaptureStreamProperty_ErrorCounters) {
        return _profile.errorCounters;
    }
    const MutexLock lock(_mutex);
    const Value* written = _properties.find(property);
    return written != nullptr ? *written : Value();
}

bool SimulatedStream::setValue(const Value& value,
                               std::string_view forProperty,
                               platform::ErrorSlot error) {
    const Fault* fault = _profile.propertyFaults.find(forProperty);
    if (!_isUsable(true) || (fault != nullptr && fault->strikes(error))) {
        return false;
    }
    const MutexLock lock(_mutex);
    _properties.set(forProperty, value);
    return true;
}

bool SimulatedStream::grantControl(platform::ErrorSlot error) {
    if (!_isUsable(false) || _profile.control.strikes(error)) {
        return false;
    }
    const MutexLock lock(_mutex);
    _controlled = true;
    return true;
}

bool SimulatedStream::start(platform::ErrorSlot error) {
    if (!_isUsable(true) || _profile.start.strikes(error)) {
        return false;
    }
    const MutexLock lock(_mutex);
    const Value* handlers = _properties.find(kRylCaptureStreamProperty_VideoOutputHandlers);
    const Value* rate = _properties.find(kRylCaptureStreamProperty_MaximumFrameRate);
    if (_state == State::Running || handlers == nullptr ||
        devices::frameHandlerIn(*handlers) == nullptr) {
        return false;
    }
    std::thread([self = shared_from_this(), run = ++_run, rate = sensorRate(rate)] {
        self->_deliver(run, rate);
    }).detach();
    _state = State::Running;
    return true;
}

bool SimulatedStream::stop(platform::ErrorSlot error) {
    const MutexLock lock(_mutex);
    if (_state != State::Running || _profile.stop.strikes(error)) {
        return false;
    }
    _state = State::Stopping;
    _waitForHandler();
    if (_state == State::Stopping) {
        _state = State::Stopped;
        _framesAfterStop = _profile.framesAfterStop;
    }
    _changed.notifyAll();
    return true;
}

void SimulatedStream::invalidate() {
    Value handlers;  // dropped without the lock: they may own the last reference to anything
    const MutexLock lock(_mutex);
    handlers = _end();
    _waitForHandler();
}

void SimulatedStream::abandon() {
    Value handlers;
    const MutexLock lock(_mutex);
    handlers = _end();
}

bool SimulatedStream::_isUsable(bool needsControl) {
    const MutexLock lock(_mutex);
    return _state != State::Invalid && (_controlled || !needsControl);
}

// Returns the handlers, for the caller to drop.
Value SimulatedStream::_end() {
    _state = State::Invalid;
    ++_run;
    _changed.notifyAll();
    const Value* handlers = _properties.find(kRylCaptureStreamProperty_VideoOutputHandlers);
    Value dropped = handlers != nullptr ? *handlers : Value();
    _properties = {};
    return dropped;
}

void SimulatedStream::_waitForHandler() {
    while (_inHandler != std::thread::id() && _inHandler != std::this_thread::get_id()) {
        _changed.wait(_mutex);
    }
}

void SimulatedStream::_deliver(std::uint64_t run, double rate) {
    pthread_setname_np(pthread_self(), "capture stream");
    const Clock::time_point started = Clock::now();
    for (std::uint64_t frame = 1; _awaitTurn(run, _dueTime(frame, rate, started)); ++frame) {
        const std::uint64_t elapsed = microsecondsAt(frame, rate);
        _context->progress->microseconds += elapsed - microsecondsAt(frame - 1, rate);
        _handOver(frame, elapsed);
        _endTurn();
    }
}

// When the frame is delivered; never, once the sensor has stalled.
Clock::time_point SimulatedStream::_dueTime(std::uint64_t frame,
                                            double rate,
                                            Clock::time_point started) const {
    if (_profile.stallAfterFrame.has_value() && frame > *_profile.stallAfterFrame) {
        return Clock::time_point::max();
    }
    const double elapsed = static_cast<double>(frame) / rate + frameDelay(_profile, frame);
    return dueTime(started, elapsed, _context->speed);
}

// Waits until the frame is due and a buffer is free; holds the turn then, until _endTurn(). False when
// the run is over.
bool SimulatedStream::_awaitTurn(std::uint64_t run, Clock::time_point due) {
    const bool never = due == Clock::time_point::max();
    const MutexLock lock(_mutex);
    for (;;) {
        if (_run != run || (_state == State::Stopped && (_framesAfterStop == 0 || never))) {
            return false;
        }
        if (_state != State::Stopping && Clock::now() < due) {
            _changed.waitUntil(_mutex, due);
        } else if (_state == State::Stopping || _buffersOut == kImageBuffers) {
            _changed.wait(_mutex);
        } else {
            if (_state == State::Stopped) {
                --_framesAfterStop;
            }
            _inHandler = std::this_thread::get_id();
            return true;
        }
    }
}

void SimulatedStream::_endTurn() {
    const MutexLock lock(_mutex);
    _inHandler = {};
    _changed.notifyAll();
}

Value SimulatedStream::_handlers() {
    const MutexLock lock(_mutex);
    const Value* handlers = _properties.find(kRylCaptureStreamProperty_VideoOutputHandlers);
    return handlers != nullptr ? *handlers : Value();
}

void SimulatedStream::_handOver(std::uint64_t frame, std::uint64_t microseconds) {
    const platform::MediaTime time{.value = static_cast<std::int64_t>(microseconds),
                                   .timescale = 1'000'000};
    // Each call looks the handlers up: the one before may have invalidated the device.
    for (const FrameEvent& event : _profile.events) {
        if (event.frame == frame) {
            const Value handlers = _handlers();
            if (const auto* handler = devices::eventHandlerIn(handlers)) {
                (*handler)(event.code, time, event.info);
            }
        }
    }
    const Value handlers = _handlers();
    const auto* handler = devices::frameHandlerIn(handlers);
    if (handler == nullptr || isDropped(_profile, frame)) {
        return;
    }
    const double seconds = static_cast<double>(microseconds) * 1e-6;
    ++_context->progress->frames;
    (*handler)(_makeBuffer(frameMetadata(_profile, frame, seconds)), time);
}

platform::ImageBufferRef SimulatedStream::_makeBuffer(const Value& metadata) {
    platform::MutableDictionary attachments;
    if (metadata.isPresent()) {
        attachments.set(kRylCaptureSampleBufferAttachmentKey_MetadataDictionary, metadata);
    }
    {
        const MutexLock lock(_mutex);
        ++_buffersOut;
    }
    return {new platform::ImageBuffer(std::move(attachments)),
            [self = shared_from_this()](const platform::ImageBuffer* buffer) {
                delete buffer;
                self->_bufferCameBack();
            }};
}

void SimulatedStream::_bufferCameBack() {
    const MutexLock lock(_mutex);
    if (_buffersOut-- == kImageBuffers) {
        _changed.notifyAll();
    }
}

}  // namespace simulator
