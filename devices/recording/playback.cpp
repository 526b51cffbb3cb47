#include "devices/recording/playback.h"

#include <pthread.h>

namespace recording {

using platform::MutexLock;
using Clock = std::chrono::steady_clock;

Playback::Playback(const Deliveries& deliveries, double speed, Deliver deliver)
    : _deliveries(deliveries)
    , _speed(speed)
    , _deliver(std::move(deliver))
    , _allowed(deliveries.beforeStop) {}

void Playback::start() {
    {
        const MutexLock lock(_mutex);
        _started = Clock::now();
    }
    platform::startThread([self = shared_from_this()] {
        pthread_setname_np(pthread_self(), "replay");
        self->_play();
    });
}

void Playback::stop() {
    const MutexLock lock(_mutex);
    _hurry();
}

void Playback::stopped() {
    const MutexLock lock(_mutex);
    _stopped = Clock::now();
    _allowed = _deliveries.contents.size();
    _changed.notifyAll();
}

void Playback::finish() {
    const MutexLock lock(_mutex);
    _hurry();
    _isOver = true;
    _changed.notifyAll();
}

void Playback::abandon() {
    const MutexLock lock(_mutex);
    _isOver = true;
    _changed.notifyAll();
}

void Playback::_hurry() {
    _hurried = _allowed;
    _changed.notifyAll();
    const std::size_t until = _allowed;
    while (!_isOver && _done < until && _thread != std::this_thread::get_id()) {
        _changed.wait(_mutex);
    }
}

void Playback::_play() {
    {
        const MutexLock lock(_mutex);
        _thread = std::this_thread::get_id();
    }
    for (std::size_t index = 0; index < _deliveries.contents.size() && _awaitTurn(index); ++index) {
        _deliver(index);
        const MutexLock lock(_mutex);
        _done = index + 1;
        _changed.notifyAll();
    }
    const MutexLock lock(_mutex);
    _thread = {};
}

// Waits until the delivery is due; false when there is none any more.
bool Playback::_awaitTurn(std::size_t index) {
    const MutexLock lock(_mutex);
    for (;;) {
        if (_isOver) {
            return false;
        }
        if (index >= _allowed) {
            _changed.wait(_mutex);
        } else if (index >= _hurried && Clock::now() < _dueTime(index)) {
            _changed.waitUntil(_mutex, _dueTime(index));
        } else {
            return true;
        }
    }
}

Playback::TimePoint Playback::_dueTime(std::size_t index) const {
    const auto offset =
        std::chrono::duration<double, std::micro>(_deliveries.offsets[index]) / _speed;
    const TimePoint from = index < _deliveries.beforeStop ? _started : _stopped;
    // A damaged recording may name any time; a century is never.
    constexpr std::chrono::hours kNever{24 * 365 * 100};
    return from + (offset < kNever ? std::chrono::duration_cast<Clock::duration>(offset)
                                   : Clock::duration(kNever));
}

}  // namespace recording
