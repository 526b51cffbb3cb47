#include <map>
#include <utility>

#include "devices/recording/playback.h"
#include "devices/recording/replayed.h"
#include "devices/written_handlers.h"
#include "platform/sync.h"

namespace recording {

namespace {

using platform::ErrorSlot;
using platform::MutexLock;
using platform::Value;

constexpr std::string_view kHandlers = kRylCaptureStreamProperty_VideoOutputHandlers;

ObjectId idOf(const Value& value) {
    return value.asNumber().as<ObjectId>();
}

// Owner    Its device and the client; while it delivers also its thread, so the last reference may go there.
// Threads  Any; no lock is held while a handler runs.
class ReplayedStream final : public WLRylCaptureStream,
                             public std::enable_shared_from_this<ReplayedStream> {
  public:
    ReplayedStream(ScriptRef script, ObjectId id) : _script(std::move(script)), _id(id) {}
    ReplayedStream(const ReplayedStream&) = delete;
    ReplayedStream& operator=(const ReplayedStream&) = delete;
    ~ReplayedStream() override { abandon(); }

    Value valueForProperty(std::string_view property, ErrorSlot error) override {
        Value value = _script->take(Operation::ValueForProperty, _id, property, error);
        return property == kHandlers && value.isPresent() ? _writtenHandlers() : value;
    }
    bool setValue(const Value& value, std::string_view forProperty, ErrorSlot error) override {
        const platform::List arguments{forProperty, withoutObjects(value)};
        const bool done = _isTrue(Operation::SetValue, arguments, error);
        if (done && forProperty == kHandlers) {
            Value handlers = value;  // those before go without the lock
            const MutexLock lock(_mutex);
            std::swap(_handlers, handlers);
        }
        return done;
    }
    bool start(ErrorSlot error) override {
        if (!_isTrue(Operation::Start, {}, error)) {
            return false;
        }
        std::shared_ptr<Playback> started;
        {
            const MutexLock lock(_mutex);
            const Deliveries& deliveries = _script->deliveries(_id, ++_starts);
            started = std::make_shared<Playback>(
                deliveries, _script->speed(),
                [weak = weak_from_this(), script = _script, &deliveries](std::size_t index) {
                    if (const auto self = weak.lock()) {
                        self->_deliver(deliveries.contents[index]);
                    }
                });
            _playback.swap(started);
        }
        if (started != nullptr) {
            started->abandon();
        }
        _currentPlayback()->start();
        return true;
    }
    bool stop(ErrorSlot error) override {
        const auto playback = _currentPlayback();
        if (playback != nullptr) {
            playback->stop();
        }
        const bool done = _isTrue(Operation::Stop, {}, error);
        if (playback != nullptr) {
            playback->stopped();
        }
        return done;
    }

    // Ends the stream for good and drops its handlers. What was recorded before that is delivered first, unless a
    // handler calls this.
    void invalidate() {
        if (const auto playback = _currentPlayback()) {
            playback->finish();
        }
        _dropHandlers();
    }
    // The same at once.
    void abandon() {
        if (const auto playback = _currentPlayback()) {
            playback->abandon();
        }
        _dropHandlers();
    }

    ObjectId id() const { return _id; }

  private:
    bool _isTrue(Operation operation, const Value& arguments, ErrorSlot error) {
        return _script->take(operation, _id, arguments, error).asNumber().isTrue();
    }
    Value _writtenHandlers() {
        const MutexLock lock(_mutex);
        return _handlers;
    }
    std::shared_ptr<Playback> _currentPlayback() {
        const MutexLock lock(_mutex);
        return _playback;
    }
    void _dropHandlers() {
        Value dropped;  // without the lock: they may own the last reference to anything
        const MutexLock lock(_mutex);
        std::swap(_handlers, dropped);
    }

    void _deliver(const Content& content) {
        const Value handlers = _writtenHandlers();
        if (const auto* event = std::get_if<Event>(&content)) {
            if (const auto* handler = devices::eventHandlerIn(handlers)) {
                (*handler)(event->code, event->time, event->info);
            }
        } else if (const auto* frame = std::get_if<Frame>(&content)) {
            if (const auto* handler = devices::frameHandlerIn(handlers)) {
                (*handler)(_bufferOf(*frame), frame->time);
            }
        }
    }
    static platform::ImageBufferRef _bufferOf(const Frame& frame) {
        if (!frame.hasBuffer) {
            return nullptr;
        }
        platform::MutableDictionary attachments;
        if (frame.metadata.isPresent()) {
            attachments.set(kRylCaptureSampleBufferAttachmentKey_MetadataDictionary,
                            frame.metadata);
        }
        return std::make_shared<const platform::ImageBuffer>(std::move(attachments));
    }

    const ScriptRef _script;
    const ObjectId _id;

    platform::Mutex _mutex;
    Value _handlers ZR_GUARDED_BY(_mutex);
    std::uint32_t _starts ZR_GUARDED_BY(_mutex) = 0;            // that succeeded
    std::shared_ptr<Playback> _playback ZR_GUARDED_BY(_mutex);  // of the last start; null before
};

class ReplayedDevice final : public WLRylCaptureDevice {
  public:
    ReplayedDevice(ScriptRef script, ObjectId id) : _script(std::move(script)), _id(id) {}
    ReplayedDevice(const ReplayedDevice&) = delete;
    ReplayedDevice& operator=(const ReplayedDevice&) = delete;

    // Possibly inside a handler: never waits.
    ~ReplayedDevice() override {
        for (const auto& stream : _knownStreams()) {
            stream->abandon();
        }
    }

    std::optional<WLRylCaptureStreamList> streams(ErrorSlot error) override {
        const Value answer = _script->take(Operation::Streams, _id, {}, error);
        if (answer.list() == nullptr) {
            return std::nullopt;
        }
        WLRylCaptureStreamList streams;
        for (const Value& entry : *answer.list()) {
            streams.push_back(entry.isPresent() ? _streamOf(idOf(entry)) : nullptr);
        }
        return streams;
    }
    bool requestControlOfStreams(const WLRylCaptureStreamList& streams, ErrorSlot error) override {
        platform::MutableList ids;
        for (const auto& stream : streams) {
            const auto* own = dynamic_cast<const ReplayedStream*>(stream.get());
            ids.push_back(own != nullptr ? Value(own->id()) : Value());
        }
        return _script->take(Operation::RequestControl, _id, platform::List(std::move(ids)), error)
            .asNumber()
            .isTrue();
    }
    bool invalidate(ErrorSlot error) override {
        const bool done = _script->take(Operation::Invalidate, _id, {}, error).asNumber().isTrue();
        if (done) {
            for (const auto& stream : _knownStreams()) {
                stream->invalidate();
            }
        }
        return done;
    }

  private:
    using StreamRef = std::shared_ptr<ReplayedStream>;

    StreamRef _streamOf(ObjectId id) {
        const MutexLock lock(_mutex);
        StreamRef& stream = _streams[id];
        if (stream == nullptr) {
            stream = std::make_shared<ReplayedStream>(_script, id);
        }
        return stream;
    }
    std::vector<StreamRef> _knownStreams() {
        std::vector<StreamRef> streams;
        const MutexLock lock(_mutex);
        for (const auto& [id, stream] : _streams) {
            streams.push_back(stream);
        }
        return streams;
    }

    const ScriptRef _script;
    const ObjectId _id;

    platform::Mutex _mutex;
    std::map<ObjectId, StreamRef> _streams ZR_GUARDED_BY(_mutex);  // those that were asked for
};

class ReplayedPlugIn final : public WLISPCapturePlugIn {
  public:
    explicit ReplayedPlugIn(ScriptRef script) : _script(std::move(script)) {}

    std::shared_ptr<WLRylCaptureDevice> device(ErrorSlot error) override {
        const Value answer = _script->take(Operation::Device, 0, {}, error);
        return answer.isPresent() ? std::make_shared<ReplayedDevice>(_script, idOf(answer))
                                  : nullptr;
    }

  private:
    const ScriptRef _script;
};

}  // namespace

std::shared_ptr<WLISPCapturePlugIn> replayCapture(ScriptRef script) {
    return std::make_shared<ReplayedPlugIn>(std::move(script));
}

}  // namespace recording
