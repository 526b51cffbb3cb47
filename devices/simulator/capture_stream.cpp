#include "devices/simulator/capture_stream.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include <pthread.h>

#include "devices/simulator/frame_metadata.h"
#include "platform/deadline.h"
#include "platform/text_format.h"

namespace simulator {

namespace {

using platform::MutexLock;
using platform::Value;
using Clock = std::chrono::steady_clock;

constexpr std::size_t kImageBuffers = 16;
constexpr std::chrono::seconds kStarvation{5};
constexpr double kDefaultRate = 30;  // frames a second
constexpr double kLowestRate = 1;
constexpr double kHighestRate = 1000;

std::uint64_t microsecondsAt(std::uint64_t frame, double rate) {
    return static_cast<std::uint64_t>(std::llround(static_cast<double>(frame) * 1e6 / rate));
}

template <class Handler>
const Handler* handlerIn(const Value& handlers, std::string_view key) {
    return handlers[kRylCaptureStreamVideoOutputID_PrimaryScaler][key].object<Handler>();
}

const WLRylFrameHandler* frameHandlerIn(const Value& handlers) {
    return handlerIn<WLRylFrameHandler>(handlers,
                                        kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler);
}

const WLRylEventHandler* eventHandlerIn(const Value& handlers) {
    return handlerIn<WLRylEventHandler>(handlers,
                                        kRylCaptureStreamVideoOutputHandlerKey_EventHandler);
}

// The rate that was written, within what the sensor can do.
double sensorRate(const Value* configured) {
    const double rate = configured != nullptr ? configured->asNumber().asDouble() : kDefaultRate;
    return rate > kLowestRate ? std::min(rate, kHighestRate) : kLowestRate;
}

}  // namespace

std::size_t LiveBuffers::count() const {
    const MutexLock lock(_mutex);
    return _count;
}
void LiveBuffers::add() {
    const MutexLock lock(_mutex);
    ++_count;
}
void LiveBuffers::remove() {
    const MutexLock lock(_mutex);
    --_count;
    _changed.notifyAll();
}
std::size_t LiveBuffers::drain(Clock::time_point deadline) {
    const MutexLock lock(_mutex);
    while (_count > 0 && Clock::now() < deadline) {
        _changed.waitUntil(_mutex, deadline);
    }
    return _count;
}

void CaptureContext::misused(std::string_view what) const {
    if (const auto told = observer.lock()) {
        told->misused(what);
    }
}

Value SimulatedStream::valueForProperty(std::string_view property, platform::ErrorSlot error) {
    const Fault* fault = _profile.propertyFaults.find(property);
    if (!_isUsable("read", property, false) || (fault != nullptr && fault->strikes(error))) {
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
    if (!_isUsable("written", forProperty, true) || (fault != nullptr && fault->strikes(error))) {
        return false;
    }
    const MutexLock lock(_mutex);
    _properties.set(forProperty, value);
    return true;
}

bool SimulatedStream::grantControl(platform::ErrorSlot error) {
    if (!_isUsable("requested", "control", false) || _profile.control.strikes(error)) {
        return false;
    }
    const MutexLock lock(_mutex);
    _controlled = true;
    return true;
}

bool SimulatedStream::start(platform::ErrorSlot error) {
    if (!_isUsable("asked", "start", true) || _profile.start.strikes(error)) {
        return false;
    }
    std::string_view misuse;
    {
        const MutexLock lock(_mutex);
        const Value* handlers = _properties.find(kRylCaptureStreamProperty_VideoOutputHandlers);
        const Value* rate = _properties.find(kRylCaptureStreamProperty_MaximumFrameRate);
        if (_state == State::Running) {
            misuse = "a stream was started that runs already";
        } else if (handlers == nullptr || frameHandlerIn(*handlers) == nullptr) {
            misuse = "a stream was started without a frame handler";
        } else {
            std::thread([self = shared_from_this(), run = ++_run, rate = sensorRate(rate)] {
                self->_deliver(run, rate);
            }).detach();
            _state = State::Running;
            return true;
        }
    }
    _context->misused(misuse);
    return false;
}

bool SimulatedStream::stop(platform::ErrorSlot error) {
    if (!_isUsable("asked", "stop", false)) {
        return false;
    }
    {
        const MutexLock lock(_mutex);
        if (_state == State::Running) {
            if (_profile.stop.strikes(error)) {
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
    }
    _context->misused("a stream was stopped that does not run");
    return false;
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

// Whether the operation may go on; a misuse is reported.
bool SimulatedStream::_isUsable(std::string_view operation,
                                std::string_view what,
                                bool needsControl) {
    std::string_view when;
    {
        const MutexLock lock(_mutex);
        if (_state == State::Invalid) {
            when = "after its device was invalidated";
        } else if (needsControl && !_controlled) {
            when = "without control of the stream";
        } else {
            return true;
        }
    }
    _context->misused(platform::format("%@ was %@ %@", what, operation, when));
    return false;
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
    bool starvationTold = false;
    for (std::uint64_t frame = 1;; ++frame) {
        const Clock::time_point due = _dueTime(frame, rate, started);
        Turn turn;
        while ((turn = _awaitTurn(run, due)) == Turn::Starved) {
            if (!std::exchange(starvationTold, true)) {
                _context->misused("no image buffer was given back for five seconds");
            }
        }
        if (turn == Turn::Over) {
            return;
        }
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
    const double speed = _context->speed;
    if (!(speed > 0) || std::isinf(speed)) {
        return started;
    }
    const double real = (static_cast<double>(frame) / rate + frameDelay(_profile, frame)) / speed;
    return started +
           std::chrono::duration_cast<Clock::duration>(std::chrono::duration<double>(real));
}

// Waits until the frame is due and a buffer is free; holds the turn then, until _endTurn().
SimulatedStream::Turn SimulatedStream::_awaitTurn(std::uint64_t run, Clock::time_point due) {
    constexpr Clock::time_point kNever = Clock::time_point::max();
    Clock::time_point starved = kNever;
    const MutexLock lock(_mutex);
    for (;;) {
        const Clock::time_point now = Clock::now();
        if (_run != run || (_state == State::Stopped && (_framesAfterStop == 0 || due == kNever))) {
            return Turn::Over;
        }
        if (_state == State::Stopping) {
            _changed.wait(_mutex);
        } else if (now < due) {
            _changed.waitUntil(_mutex, due);
        } else if (_buffersOut < kImageBuffers) {
            if (_state == State::Stopped) {
                --_framesAfterStop;
            }
            _inHandler = std::this_thread::get_id();
            return Turn::Deliver;
        } else if (now < starved) {
            starved = std::min(starved, now + kStarvation);
            _changed.waitUntil(_mutex, starved);
        } else {
            return Turn::Starved;
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
    const Value handlers = _handlers();
    const platform::MediaTime time{.value = static_cast<std::int64_t>(microseconds),
                                   .timescale = 1'000'000};
    for (const FrameEvent& event : _profile.events) {
        const auto* handler = eventHandlerIn(handlers);
        if (event.frame == frame && handler != nullptr) {
            (*handler)(event.code, time, event.info);
        }
    }
    const auto* handler = frameHandlerIn(handlers);
    if (handler == nullptr || isDropped(_profile, frame)) {
        return;
    }
    const Value metadata = frameMetadata(_profile, frame, static_cast<double>(microseconds) * 1e-6);
    ++_context->progress->frames;
    const Clock::time_point delivered = Clock::now();
    (*handler)(_makeBuffer(metadata), time);
    if (const auto observer = _context->observer.lock()) {
        const platform::Dictionary* dictionary = metadata.dictionary();
        observer->frameDelivered(
            {.number = frame,
             .time = time,
             .delivered = delivered,
             .metadata = dictionary != nullptr ? *dictionary : platform::Dictionary()});
    }
}

platform::ImageBufferRef SimulatedStream::_makeBuffer(const Value& metadata) {
    platform::MutableDictionary attachments;
    if (metadata.isPresent()) {
        attachments.set(kRylCaptureSampleBufferAttachmentKey_MetadataDictionary, metadata);
    }
    _context->liveBuffers.add();
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
    _context->liveBuffers.remove();
    const MutexLock lock(_mutex);
    --_buffersOut;
    _changed.notifyAll();
}

}  // namespace simulator
