#include "devices/linux/capture_stream.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cmath>
#include <linux/videodev2.h>
#include <string>
#include <system_error>

#include <poll.h>
#include <pthread.h>

#include "devices/linux/device_log.h"
#include "devices/linux/frame_metadata.h"
#include "devices/written_handlers.h"

namespace linux_device {

namespace {

using platform::ErrorSlot;
using platform::MutexLock;
using platform::Number;
using platform::Value;
using Clock = std::chrono::steady_clock;

template <std::size_t N>
std::string shortNameOf(std::string_view name, const ShortName (&names)[N]) {
    for (const ShortName& known : names) {
        if (known.name == name) {
            return std::string(known.shortName);
        }
    }
    throw SystemProblem(std::string(name) + ": the device has no such property", ENOENT);
}

platform::MediaTime mediaTime(std::int64_t microseconds) {
    return {.value = microseconds, .timescale = 1'000'000};
}

// How a description names the values of a map.
std::string writtenText(const Number& number) {
    return number.kind() == Number::Kind::Boolean ? (number.isTrue() ? "true" : "false")
                                                  : number.text();
}

std::int64_t convertedValue(const PropertyTarget& property, const Value& value) {
    const Number number = value.asNumber();
    const std::string written = writtenText(number);
    if (!property.values.empty()) {
        const auto found = property.values.find(written);
        if (found == property.values.end()) {
            throw SystemProblem(property.name + ": the description has no value for " + written,
                                EINVAL);
        }
        return found->second;
    }
    if (!number.isPresent()) {
        throw SystemProblem(property.name + ": not a number", EINVAL);
    }
    return property.scale == 1 && property.add == 0
               ? number.as<std::int64_t>()
               : Number(std::round(number.asDouble() * property.scale + property.add))
                     .as<std::int64_t>();
}

// Ends the kernel's stream. An unplugged camera cannot do that, which is not worth a line of the log.
void stopKernel(const Camera& camera) {
    for (const auto& node : {camera.video, camera.metadata}) {
        try {
            if (node != nullptr) {
                node->streamOff();
            }
        } catch (const SystemProblem& problem) {
            if (problem.code() != ENODEV) {
                logProblem(problem.what());
            }
        }
    }
}

// Milliseconds for poll(); rounded up, so that it does not return before the time.
int pollTimeout(Clock::time_point until) {
    if (until == Clock::time_point::max()) {
        return -1;
    }
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(until - Clock::now()).count();
    return static_cast<int>(std::clamp<std::int64_t>(left, 0, 60'000));
}

}  // namespace

struct CaptureStream::Progress {
    Progress(const StreamDescription& described, const Machine& machine, const Camera& camera)
        : pairs(camera.metadata != nullptr), metadata(described.metadata, machine, camera.video) {}

    // Numbers the picture from 1, and returns how many were lost before it. The kernel counts modulo 2^32, from any
    // number on.
    std::uint32_t count(const FilledBuffer& picture) {
        if (picture.microseconds == 0) {
            return 0;  // it was given back without having been filled
        }
        const std::uint32_t step = hasFirst ? picture.sequence - lastSequence : 1;
        number += step;
        hasFirst = true;
        lastSequence = picture.sequence;
        numbers[picture.index] = number;
        return step > 0 && step < kBackwards ? step - 1 : 0;
    }

    static constexpr std::uint32_t kBackwards = 1U << 31U;

    FramePairs pairs;
    FrameMetadata metadata;
    std::array<std::uint64_t, VIDEO_MAX_FRAME> numbers = {};  // by the index of the buffer
    bool hasFirst = false;
    std::uint32_t lastSequence = 0;
    std::uint64_t number = 0;  // of the last picture
};

Value CaptureStream::valueForProperty(std::string_view property, ErrorSlot error) {
    if (property == kRylCaptureStreamProperty_PortType) {
        const MutexLock lock(_mutex);
        return _state == State::Invalid ? Value() : Value(_described.portType);
    }
    if (property == kRylCaptureStreamProperty_ErrorCounters) {
        try {
            return _errorCounters();
        } catch (const SystemProblem& problem) {
            static_cast<void>(platform::failWith(error, errorOf(problem)));
            return {};
        }
    }
    const MutexLock lock(_mutex);
    const Value* written = _properties.find(property);
    return written != nullptr ? *written : Value();
}

bool CaptureStream::setValue(const Value& value, std::string_view forProperty, ErrorSlot error) {
    return attempt(error, [&] {
        const Camera camera = _camera();
        _writeAll(*camera.video, forProperty, value);
        Value before;  // dropped without the lock: a handler may own the last reference to anything
        const MutexLock lock(_mutex);
        if (const Value* written = _properties.find(forProperty)) {
            before = *written;
        }
        _properties.set(forProperty, value);
        return true;
    });
}

bool CaptureStream::grantControl(ErrorSlot error) {
    return attempt(error, [this] {
        const Camera camera = _context->open(_context->machine, _described);
        const MutexLock lock(_mutex);
        if (_state == State::Invalid) {
            throw SystemProblem(_described.name + ": the device was invalidated", ENODEV);
        }
        if (_opened.video == nullptr) {
            _opened = camera;
        }
        return true;
    });
}

// The nodes, once control of the stream was granted.
Camera CaptureStream::_camera() {
    const MutexLock lock(_mutex);
    if (_opened.video == nullptr) {
        throw SystemProblem(_described.name + ": no control of the stream", EPERM);
    }
    return _opened;
}

void CaptureStream::_writeAll(VideoDevice& video, std::string_view property, const Value& value) {
    if (property == kRylCaptureStreamProperty_VideoOutputHandlers) {
        return;
    }
    if (property != kRylCaptureStreamProperty_InfraredLightSourceConfiguration) {
        _write(video, _targetOf(shortNameOf(property, kProperties)), value);
        return;
    }
    if (value.dictionary() == nullptr) {
        throw SystemProblem("lightSource: not a dictionary", EINVAL);
    }
    for (const auto& [key, part] : *value.dictionary()) {
        _write(video, _targetOf("lightSource." + shortNameOf(key, kLightSourceKeys)), part);
    }
}

const PropertyTarget& CaptureStream::_targetOf(std::string_view name) const {
    for (const PropertyTarget& property : _described.properties) {
        if (property.name == name) {
            return property;
        }
    }
    throw SystemProblem(std::string(name) + ": the description does not say what sets it", ENOENT);
}

void CaptureStream::_write(VideoDevice& video, const PropertyTarget& property, const Value& value) {
    const auto& target = property.target;
    if (std::holds_alternative<FrameInterval>(target)) {
        video.setFrameRate(value.asNumber().asDouble());
    } else if (std::holds_alternative<FormatChoice>(target)) {
        const auto index = value.asNumber().as<std::uint64_t>();
        if (index >= _described.formats.size()) {
            throw SystemProblem("formatIndex: " + std::to_string(index) + " is none of " +
                                    std::to_string(_described.formats.size()) + " formats",
                                EINVAL);
        }
        video.setFormat(_described.formats[index]);
    } else if (const auto* control = std::get_if<Control>(&target)) {
        video.setControl(video.findControl(*control), convertedValue(property, value));
    } else if (const auto* unit = std::get_if<ExtensionUnit>(&target)) {
        video.setExtensionUnit(*unit, convertedValue(property, value));
    }
}

Value CaptureStream::_errorCounters() {
    const Camera camera = _camera();
    platform::MutableDictionary counters;
    for (std::size_t index = 0; index < _described.errorCounters.size(); ++index) {
        const NumberSource& source = _described.errorCounters[index];
        const auto* count = std::get_if<StreamCount>(&source.source);
        Number number =
            count == nullptr ? readSource(source, _context->machine, *camera.video) : Number();
        const MutexLock lock(_mutex);
        if (count != nullptr) {
            number = source.conversion.apply(*count == StreamCount::LostFrames ? _lostFrames
                                                                               : _errorBuffers);
        } else if (source.sinceStart && index < _countersAtStart.size()) {
            number = number.as<std::int64_t>() - _countersAtStart[index].as<std::int64_t>();
        }
        counters.set(source.name, number);
    }
    return platform::Dictionary(std::move(counters));
}

bool CaptureStream::start(ErrorSlot error) {
    return attempt(error, [this] {
        const Camera camera = _camera();
        _beginStart();
        try {
            _startThread(_startKernel(camera));
        } catch (const SystemProblem&) {
            stopKernel(camera);
            const MutexLock lock(_mutex);
            if (_state == State::Starting) {
                _state = State::Idle;
            }
            throw;
        }
        return true;
    });
}

void CaptureStream::_beginStart() {
    const MutexLock lock(_mutex);
    while (_isCapturing && !_isCaptureThread() && _state == State::Idle) {
        _changed.wait(_mutex);
    }
    const Value* handlers = _properties.find(kRylCaptureStreamProperty_VideoOutputHandlers);
    if (_state != State::Idle || _isCapturing) {
        throw SystemProblem(_described.name + ": cannot start now", EBUSY);
    }
    if (handlers == nullptr || devices::frameHandlerIn(*handlers) == nullptr) {
        throw SystemProblem(_described.name + ": no frame handler", EINVAL);
    }
    _state = State::Starting;
    _lostFrames = 0;
    _errorBuffers = 0;
}

CaptureStream::RunRef CaptureStream::_startKernel(const Camera& camera) {
    VideoDevice& video = *camera.video;
    for (const ControlSetting& setting : _described.beforeStart) {
        video.setControl(video.findControl(setting.control), setting.value);
    }
    auto run = std::make_shared<Run>();
    run->camera = camera;
    run->buffers = std::make_shared<ImageBuffers>(camera.video);
    for (const EventRule& rule : _described.events) {
        if (rule.cause == EventCause::ControlChanged) {
            run->controlEvents.emplace_back(video.findControl(rule.control).id, rule.code);
        }
        if (rule.cause == EventCause::ControlChanged || rule.cause == EventCause::SourceChanged) {
            video.subscribe(rule);
        }
    }
    std::vector<Number> counters;
    for (const NumberSource& source : _described.errorCounters) {
        counters.push_back(source.sinceStart ? readSource(source, _context->machine, video)
                                             : Number());
    }
    if (camera.metadata != nullptr) {
        camera.metadata->setMetadataFormat(_described.metadataFormat);
        camera.metadata->makeBuffers(BufferKind::Metadata, _described.buffers);
    }
    video.makeBuffers(BufferKind::Picture, _described.buffers);
    // Before the kernel's counters start anew: a count that is read in between belongs to the stream before.
    ++*_context->starts;
    if (camera.metadata != nullptr) {
        camera.metadata->streamOn();
    }
    video.streamOn();
    const MutexLock lock(_mutex);
    _countersAtStart = std::move(counters);
    return run;
}

void CaptureStream::_startThread(const RunRef& run) {
    // Frames that are there before start() returns wait for the lock.
    const MutexLock lock(_mutex);
    if (_state != State::Starting) {
        throw SystemProblem(_described.name + ": the device was invalidated", ENODEV);
    }
    try {
        platform::startThread([self = shared_from_this(), run] { self->_capture(run); });
    } catch (const std::system_error& problem) {
        throw SystemProblem(_described.name + ": " + problem.what(), problem.code().value());
    }
    _state = State::Running;
    _run = run;
    _isCapturing = true;
}

bool CaptureStream::stop(ErrorSlot error) {
    const MutexLock lock(_mutex);
    if (_state == State::Broken) {
        _state = State::Idle;
        return platform::failWith(error, _breakage);
    }
    if (_state != State::Running) {
        return platform::fail(error, kLinuxErrorDomain, EINVAL, nullptr, "%@: not streaming",
                              _described.name);
    }
    _state = State::Idle;
    _run->end.wake();
    _run = nullptr;
    _waitForHandler();
    return true;
}

void CaptureStream::invalidate() {
    std::pair<Value, Camera>
        dropped;  // without the lock: a handler may own the last reference to anything
    const MutexLock lock(_mutex);
    dropped = _end();
    _waitForHandler();
    while (_isCapturing && !_isCaptureThread()) {
        _changed.wait(_mutex);
    }
}

void CaptureStream::abandon() {
    std::pair<Value, Camera> dropped;
    const MutexLock lock(_mutex);
    dropped = _end();
}

// Returns the handlers and the nodes, for the caller to drop.
std::pair<Value, Camera> CaptureStream::_end() {
    _state = State::Invalid;
    if (_run != nullptr) {
        _run->end.wake();
        _run = nullptr;
    }
    _changed.notifyAll();
    const Value* handlers = _properties.find(kRylCaptureStreamProperty_VideoOutputHandlers);
    std::pair<Value, Camera> dropped{handlers != nullptr ? *handlers : Value(),
                                     std::exchange(_opened, {})};
    _properties = {};
    return dropped;
}

bool CaptureStream::_isCaptureThread() {
    return _captureThread == std::this_thread::get_id();
}

void CaptureStream::_waitForHandler() {
    while (_isInHandler && !_isCaptureThread()) {
        _changed.wait(_mutex);
    }
}

void CaptureStream::_capture(const RunRef& run) {
    pthread_setname_np(pthread_self(), "capture stream");
    {
        const MutexLock lock(_mutex);
        _captureThread = std::this_thread::get_id();
    }
    try {
        Progress progress(_described, _context->machine, run->camera);
        _captureUntilEnd(*run, progress);
    } catch (const SystemProblem& problem) {
        _break(*run, problem);
    }
    run->buffers->end();
    stopKernel(run->camera);
    const MutexLock lock(_mutex);
    _isCapturing = false;
    _captureThread = {};
    _changed.notifyAll();
}

void CaptureStream::_captureUntilEnd(Run& run, Progress& progress) {
    const VideoDevice* metadata = run.camera.metadata.get();
    for (;;) {
        pollfd waits[] = {{run.end.descriptor(), POLLIN, 0},
                          {run.camera.video->descriptor(), POLLIN | POLLPRI, 0},
                          {metadata != nullptr ? metadata->descriptor() : -1, POLLIN, 0}};
        if (poll(waits, std::size(waits), pollTimeout(progress.pairs.deadline())) < 0 &&
            errno != EINTR) {
            failWithErrno(_described.name + ": waiting for a frame");
        }
        if (waits[0].revents != 0) {
            return;
        }
        if ((waits[1].revents & POLLPRI) != 0) {
            _takeEvents(run);
        }
        if (waits[2].revents != 0) {
            _takeMetadata(run, progress);
        }
        if ((waits[1].revents & ~POLLPRI) != 0) {
            _takePictures(run, progress);
        }
        while (auto frame = progress.pairs.next(Clock::now())) {
            _deliver(run, progress, *frame);
        }
        // Taking a buffer fails on a node that is broken. One that says so and has none all the same would be asked
        // for ever.
        for (const pollfd& wait : waits) {
            if ((wait.revents & (POLLERR | POLLHUP | POLLNVAL)) != 0) {
                throw SystemProblem(_described.name + ": the kernel ended the stream", EIO);
            }
        }
    }
}

void CaptureStream::_takeEvents(Run& run) {
    while (const auto event = run.camera.video->nextEvent()) {
        if (!event->isControl) {
            _report(run, EventCause::SourceChanged, event->microseconds, event->value);
            continue;
        }
        for (const auto& [control, code] : run.controlEvents) {
            if (control == event->control) {
                _callEventHandler(run, code, event->microseconds, event->value);
            }
        }
    }
}

void CaptureStream::_takeMetadata(Run& run, Progress& progress) {
    VideoDevice& node = *run.camera.metadata;
    while (const auto buffer = node.dequeue()) {
        if (!buffer->isBroken) {
            progress.pairs.addMetadata(buffer->microseconds, node.content(*buffer));
        }
        node.queue(buffer->index);
    }
}

void CaptureStream::_takePictures(Run& run, Progress& progress) {
    while (const auto picture = run.camera.video->dequeue()) {
        const std::uint32_t lost = progress.count(*picture);
        if (lost > 0) {
            {
                const MutexLock lock(_mutex);
                _lostFrames += lost;
            }
            _report(run, EventCause::LostFrames, picture->microseconds, lost);
        }
        if (!picture->isBroken) {
            progress.pairs.addPicture(*picture, Clock::now());
            continue;
        }
        {
            const MutexLock lock(_mutex);
            ++_errorBuffers;
        }
        run.buffers->giveBack(picture->index);
        _report(run, EventCause::ErrorBuffer, picture->microseconds, picture->sequence);
    }
}

void CaptureStream::_deliver(Run& run, Progress& progress, const FramePairs::Frame& frame) {
    const std::uint32_t index = frame.picture.index;
    const std::uint64_t number = progress.numbers[index];
    platform::MutableDictionary attachments;
    if (frame.metadata.has_value() || run.camera.metadata == nullptr) {
        std::span<const std::byte> bytes;
        if (frame.metadata.has_value()) {
            bytes = *frame.metadata;
        }
        if (auto metadata = progress.metadata.make(bytes, number)) {
            attachments.set(kRylCaptureSampleBufferAttachmentKey_MetadataDictionary,
                            *std::move(metadata));
        }
    } else {
        logProblem(_described.name + ": no metadata came for frame " + std::to_string(number));
    }
    const platform::ImageBufferRef buffer = run.buffers->lend(index, std::move(attachments));
    const Value handlers = _beginTurn(run);
    if (const auto* handler = devices::frameHandlerIn(handlers)) {
        (*handler)(buffer, mediaTime(frame.picture.microseconds));
    }
    _endTurn();
}

void CaptureStream::_report(Run& run,
                            EventCause cause,
                            std::int64_t microseconds,
                            std::int64_t info) {
    for (const EventRule& rule : _described.events) {
        if (rule.cause == cause) {
            _callEventHandler(run, rule.code, microseconds, info);
        }
    }
}

void CaptureStream::_callEventHandler(const Run& run,
                                      std::int32_t code,
                                      std::int64_t microseconds,
                                      std::int64_t info) {
    const Value handlers = _beginTurn(run);
    if (const auto* handler = devices::eventHandlerIn(handlers)) {
        (*handler)(code, mediaTime(microseconds), info);
    }
    _endTurn();
}

// The handlers; a Value that holds nothing once the run is over. Until _endTurn() a stop waits.
Value CaptureStream::_beginTurn(const Run& run) {
    const MutexLock lock(_mutex);
    if (_run.get() != &run) {
        return {};
    }
    _isInHandler = true;
    const Value* handlers = _properties.find(kRylCaptureStreamProperty_VideoOutputHandlers);
    return handlers != nullptr ? *handlers : Value();
}

void CaptureStream::_endTurn() {
    const MutexLock lock(_mutex);
    _isInHandler = false;
    _changed.notifyAll();
}

void CaptureStream::_break(const Run& run, const SystemProblem& problem) {
    {
        const MutexLock lock(_mutex);
        if (_run.get() != &run) {
            return;
        }
        _run = nullptr;
        _state = State::Broken;
        _breakage = errorOf(problem);
    }
    logProblem(_described.name + ": the stream broke: " + problem.what());
}

}  // namespace linux_device
