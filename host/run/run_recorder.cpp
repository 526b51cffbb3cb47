#include "host/run/run_recorder.h"

#include <algorithm>
#include <cstddef>
#include <iterator>
#include <utility>

#include "host/record/plugin_data.h"

namespace host {

namespace {

// The log of a run with a line per frame must not grow without bound; further lines are counted.
constexpr std::size_t kMostLines = 5000;

// A rule that is broken at every frame is known well enough after these.
constexpr std::size_t kMostMisuses = 50;

// How many frames are handed on at a time, how often that may be behind, and for how long the device's thread
// then waits: less than a camera's interval between two frames.
constexpr std::size_t kFramesAtOnce = 32;
constexpr std::size_t kMostQueued = 8;
constexpr std::chrono::milliseconds kPatience(20);

std::optional<double> numberOf(const platform::Dictionary& metadata, std::string_view key) {
    const platform::Number* number = metadata[key].number();
    return number != nullptr ? std::optional(number->asDouble()) : std::nullopt;
}

}  // namespace

RunRecorder::RunRecorder(std::function<void(const LogRecord&)> lineLogged,
                         bool keepFrames,
                         FramesDelivered framesDelivered,
                         bool withDetails)
    : _lineLogged(std::move(lineLogged))
    , _keepFrames(keepFrames)
    , _framesDelivered(std::move(framesDelivered))
    , _withDetails(withDetails) {
    if (_framesDelivered) {
        _hold.emplace(_queue);
    }
}

RunRecorder::~RunRecorder() {
    const platform::MutexLock lock(_mutex);
    _awaitHandedOn();
}

platform::RunTag RunRecorder::begin() {
    _frameCount = 0;
    _imageCount = 0;
    const platform::MutexLock lock(_mutex);
    _began = std::chrono::steady_clock::now();
    _frames.clear();
    _toHandOn = {};
    _lostFrames = {};
    _current = ++_last;
    return _last;
}

void RunRecorder::takeFrames(RunRecord& run) {
    const platform::MutexLock lock(_mutex);
    _handOn();
    _awaitHandedOn();
    run.framesDelivered = _frameCount;
    run.framesLost = _lostFrames.count();
    run.imagesDelivered = _imageCount;
    std::vector<FrameRecord> frames = std::exchange(_frames, {});
    if (run.frames.empty()) {
        run.frames = std::move(frames);  // there may be very many
    } else {
        run.frames.insert(run.frames.end(), frames.begin(), frames.end());
    }
}

void RunRecorder::end(RunRecord& run) {
    takeFrames(run);
    const platform::MutexLock lock(_mutex);
    _current = 0;
    _awaitHandedOn();  // of what came since: nothing comes between two runs
    run.tag = _last;
    run.log = std::exchange(_log, {});
    if (_linesLeftOut > 0) {
        run.log.push_back({platform::Date::now(), platform::LogLevel::Default,
                           std::to_string(_linesLeftOut) + " further lines left out."});
        _linesLeftOut = 0;
    }
    for (std::string& what : _misuses) {
        run.failures.push_back({.part = Part::Experiment,
                                .step = kStepDevice,
                                .error = nullptr,
                                .message = std::move(what)});
    }
    _misuses.clear();
}

std::vector<std::pair<platform::RunTag, LogRecord>> RunRecorder::takeLateLines() {
    const platform::MutexLock lock(_mutex);
    return std::exchange(_lateLines, {});
}

void RunRecorder::write(const platform::LogLine& line) {
    LogRecord record{platform::Date::now(), line.level, std::string(line.message)};
    {
        const platform::MutexLock lock(_mutex);
        record.late = !_isWanted(line.run);
        if (record.late) {
            if (_lateLines.size() < kMostLines) {
                _lateLines.emplace_back(line.run, record);
            }
        } else if (_log.size() < kMostLines) {
            _log.push_back(record);
        } else {
            ++_linesLeftOut;
        }
    }
    _lineLogged(record);
}

void RunRecorder::frameDelivered(const observed::DeliveredFrame& frame) {
    if (!_isWanted(platform::currentRunTag())) {
        return;
    }
    ++_frameCount;
    const platform::Number* sensorNumber = frame.metadata[kSensorFrameNumber].number();
    FrameRecord record{.number = frame.number,
                       .sensorNumber = sensorNumber != nullptr
                                           ? std::optional(sensorNumber->as<std::int64_t>())
                                           : std::nullopt,
                       .presentation = frame.time.seconds(),
                       .delivered = 0,
                       .lightSource = std::nullopt,
                       .temperatures = {}};
    if (_keepFrames || _framesDelivered) {
        record.lightSource = numberOf(frame.metadata, kLightSource);
        std::transform(std::begin(kTemperatures), std::end(kTemperatures),
                       record.temperatures.begin(), [&frame](const TemperatureEntry& entry) {
                           return numberOf(frame.metadata, entry.key);
                       });
    }
    const platform::MutexLock lock(_mutex);
    _lostFrames.before(record.sensorNumber);
    record.delivered = _secondsSinceBegin(frame.delivered);
    if (_keepFrames) {
        _frames.push_back(record);
    }
    if (_framesDelivered) {
        _toHandOn.frames.reserve(kFramesAtOnce);
        _toHandOn.frames.push_back(record);
        if (_withDetails) {
            _toHandOn.metadata.reserve(kFramesAtOnce);
            _toHandOn.metadata.push_back(frame.metadata);
        }
        _handOnWhenMany();
    }
}

void RunRecorder::eventDelivered(const observed::DeliveredEvent& event) {
    if (!_withDetails || !_isWanted(platform::currentRunTag())) {
        return;
    }
    const platform::MutexLock lock(_mutex);
    _toHandOn.events.push_back({.code = event.code,
                                .info = event.info,
                                .presentation = event.time.seconds(),
                                .delivered = _secondsSinceBegin(event.delivered),
                                .framesBefore = _toHandOn.frames.size()});
    _handOnWhenMany();
}

double RunRecorder::_secondsSinceBegin(std::chrono::steady_clock::time_point moment) const {
    return std::chrono::duration<double>(moment - _began).count();
}

void RunRecorder::_handOnWhenMany() {
    if (_toHandOn.frames.size() + _toHandOn.events.size() < kFramesAtOnce) {
        return;
    }
    const auto deadline = std::chrono::steady_clock::now() + kPatience;
    while (_queued >= kMostQueued && std::chrono::steady_clock::now() < deadline) {
        _handedOn.waitUntil(_mutex, deadline);
    }
    _handOn();
}

void RunRecorder::_handOn() {
    if (_toHandOn.frames.empty() && _toHandOn.events.empty()) {
        return;
    }
    ++_queued;
    _queue.async([this, batch = std::make_shared<const FrameBatch>(std::exchange(_toHandOn, {}))] {
        _framesDelivered(*batch);
        const platform::MutexLock lock(_mutex);
        --_queued;
        _handedOn.notifyAll();
    });
}

void RunRecorder::_awaitHandedOn() {
    while (_queued > 0) {
        _handedOn.wait(_mutex);
    }
}

void RunRecorder::imageDelivered(std::uint64_t /*number*/) {
    _imageCount += _isWanted(platform::currentRunTag()) ? 1 : 0;
}

void RunRecorder::misused(std::string_view what) {
    const platform::RunTag run = platform::currentRunTag();
    if (!_isWanted(run)) {
        write({"zrlab", "device", platform::LogLevel::Error, what, run});
        return;
    }
    const platform::MutexLock lock(_mutex);
    if (_misuses.size() < kMostMisuses) {
        _misuses.emplace_back(what);
    }
}

}  // namespace host
