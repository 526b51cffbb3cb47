#include "devices/recording/recorder.h"

#include <string>

#include "devices/recording/coding.h"
#include "devices/recording/recorded.h"

namespace recording {

namespace {

bool isDelivery(const Content& content) {
    return std::holds_alternative<Frame>(content) || std::holds_alternative<Event>(content) ||
           std::holds_alternative<Report>(content);
}

bool isEmpty(const Hole& hole) {
    return hole.deliveries == 0 && hole.calls == 0;
}

void count(bool delivery, Hole& hole) {
    ++(delivery ? hole.deliveries : hole.calls);
}

}  // namespace

RecorderRef Recorder::start(Session session, Write write) {
    auto recorder = std::make_shared<Recorder>(std::move(write));
    {
        const platform::MutexLock lock(recorder->_mutex);
        recorder->_queue.push_back({.at = Microseconds(0), .content = std::move(session)});
    }
    platform::startThread([recorder] { recorder->_writeAll(); });
    return recorder;
}

Microseconds Recorder::now() const {
    return std::chrono::duration_cast<Microseconds>(std::chrono::steady_clock::now() - _start);
}

void Recorder::add(Microseconds at, Content content) {
    const bool delivery = isDelivery(content);
    const platform::MutexLock lock(_mutex);
    if (_isEnding) {
        return;
    }
    const bool hasRoom =
        delivery ? _deliveries < kMostDeliveries : _queue.size() - _deliveries < kMostCalls;
    if (!hasRoom) {
        count(delivery, _hole);
        return;
    }
    if (!isEmpty(_hole)) {
        _queue.push_back({.at = at, .content = std::exchange(_hole, {})});
    }
    _queue.push_back({.at = at, .content = std::move(content)});
    _deliveries += delivery ? 1 : 0;
    _changed.notifyAll();
}

Hole Recorder::finish() {
    const Microseconds at = now();
    const platform::MutexLock lock(_mutex);
    if (!_isEnding) {
        _isEnding = true;
        if (!isEmpty(_hole)) {
            _queue.push_back({.at = at, .content = std::exchange(_hole, {})});
        }
        _queue.push_back({.at = at, .content = End()});
        _changed.notifyAll();
    }
    while (!_hasEnded) {
        _changed.wait(_mutex);
    }
    return _lost;
}

void Recorder::_writeAll() {
    Encoder encoder;
    std::string bytes(kFileStart);
    Hole lost;
    for (bool ends = false; !ends;) {
        std::vector<Entry> entries;
        {
            const platform::MutexLock lock(_mutex);
            while (_queue.empty()) {
                _changed.wait(_mutex);
            }
            entries.swap(_queue);
            _deliveries = 0;
        }
        for (const Entry& entry : entries) {
            if (const auto* hole = std::get_if<Hole>(&entry.content)) {
                lost.deliveries += hole->deliveries;
                lost.calls += hole->calls;
            }
            std::string encoded = encoder.encode(entry);
            if (encoded.empty()) {
                Hole one;
                count(isDelivery(entry.content), one);
                count(isDelivery(entry.content), lost);
                encoded = encoder.encode({.at = entry.at, .content = one});
            }
            bytes += encoded;
            ends = std::holds_alternative<End>(entry.content);
        }
        _write(bytes);
        bytes.clear();
    }
    const platform::MutexLock lock(_mutex);
    _lost = lost;
    _hasEnded = true;
    _changed.notifyAll();
}

platform::Services Recorder::record(platform::Services device) {
    const RecorderRef self = shared_from_this();
    device.capture = recordCapture(std::move(device.capture), self);
    device.meterix = recordMeterix(std::move(device.meterix), self);
    device.hid = recordHid(std::move(device.hid), self);
    device.display = recordDisplay(std::move(device.display), self);
    device.registry = recordRegistry(std::move(device.registry), self);
    return device;
}

}  // namespace recording
