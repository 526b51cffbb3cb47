#include <atomic>
#include <utility>

#include "devices/observed/handlers_property.h"
#include "devices/observed/wrapper_table.h"
#include "devices/recording/recorded.h"

namespace recording {

namespace {

using platform::ErrorSlot;
using platform::Value;

constexpr std::string_view kHandlers = kRylCaptureStreamProperty_VideoOutputHandlers;

// What is known of a stream, shared by its wrapper and the handlers that lie in the device. The atomic fields are
// written by the client's threads and read by the device's; each stands for itself.
struct StreamState {
    explicit StreamState(RecorderRef with) : recorder(std::move(with)), id(recorder->newObject()) {}

    Phase phase() const { return {starts, stopped}; }

    const RecorderRef recorder;
    const ObjectId id;
    std::atomic<std::uint32_t> starts{0};
    std::atomic<bool> stopped{false};  // stop() has been called since
};
using StreamStateRef = std::shared_ptr<StreamState>;

// These two hold the client's handler as the value that it wrote. The entry comes first: whatever the client does in
// its handler comes after it.
class RecordedFrameHandler {
  public:
    RecordedFrameHandler(Value client, StreamStateRef stream)
        : _client(std::move(client)), _stream(std::move(stream)) {}

    void operator()(const platform::ImageBufferRef& buffer, platform::MediaTime time) const {
        Frame frame{.stream = _stream->id,
                    .phase = _stream->phase(),
                    .time = time,
                    .hasBuffer = buffer != nullptr,
                    .metadata = {}};
        if (buffer != nullptr) {
            frame.metadata =
                buffer->attachment(kRylCaptureSampleBufferAttachmentKey_MetadataDictionary);
        }
        _stream->recorder->add(_stream->recorder->now(), std::move(frame));
        (*_client.object<WLRylFrameHandler>())(buffer, time);
    }

    const Value& client() const { return _client; }

  private:
    Value _client;
    StreamStateRef _stream;
};

class RecordedEventHandler {
  public:
    RecordedEventHandler(Value client, StreamStateRef stream)
        : _client(std::move(client)), _stream(std::move(stream)) {}

    void operator()(std::int32_t code, platform::MediaTime time, std::int64_t info) const {
        _stream->recorder->add(_stream->recorder->now(), Event{.stream = _stream->id,
                                                               .phase = _stream->phase(),
                                                               .time = time,
                                                               .code = code,
                                                               .info = info});
        (*_client.object<WLRylEventHandler>())(code, time, info);
    }

    const Value& client() const { return _client; }

  private:
    Value _client;
    StreamStateRef _stream;
};

class RecordedStream final : public WLRylCaptureStream {
  public:
    RecordedStream(std::shared_ptr<WLRylCaptureStream> inner, StreamStateRef state)
        : _inner(std::move(inner)), _state(std::move(state)) {}

    Value valueForProperty(std::string_view property, ErrorSlot error) override {
        const Value value =
            _call(Operation::ValueForProperty, property, error,
                  [&](ErrorSlot slot) { return _inner->valueForProperty(property, slot); });
        return property == kHandlers
                   ? observed::unwrapHandlers<RecordedFrameHandler, RecordedEventHandler>(value)
                   : value;
    }
    bool setValue(const Value& value, std::string_view forProperty, ErrorSlot error) override {
        const Value written =
            forProperty == kHandlers
                ? observed::wrapHandlers<RecordedFrameHandler, RecordedEventHandler>(value, _state)
                : value;
        return _call(Operation::SetValue, platform::List{forProperty, withoutObjects(value)}, error,
                     [&](ErrorSlot slot) { return _inner->setValue(written, forProperty, slot); });
    }
    bool start(ErrorSlot error) override {
        // Frames may come before the call returns. One that fails changes nothing.
        const bool wasStopped = _state->stopped.exchange(false);
        ++_state->starts;
        const bool started =
            _call(Operation::Start, {}, error, [&](ErrorSlot slot) { return _inner->start(slot); });
        if (!started) {
            --_state->starts;
            _state->stopped = wasStopped;
        }
        return started;
    }
    bool stop(ErrorSlot error) override {
        _state->stopped = true;
        return _call(Operation::Stop, {}, error,
                     [&](ErrorSlot slot) { return _inner->stop(slot); });
    }

    const std::shared_ptr<WLRylCaptureStream>& inner() const { return _inner; }
    ObjectId id() const { return _state->id; }

  private:
    template <class Inner>
    auto _call(Operation operation, Value arguments, ErrorSlot error, Inner inner)
        -> decltype(inner(nullptr)) {
        return _state->recorder->call(operation, _state->id, std::move(arguments), error, inner);
    }

    const std::shared_ptr<WLRylCaptureStream> _inner;
    const StreamStateRef _state;
};

// The streams' numbers, nothing for one that is null.
Value idsOf(const WLRylCaptureStreamList& streams) {
    platform::MutableList ids;
    for (const auto& stream : streams) {
        const auto* recorded = dynamic_cast<const RecordedStream*>(stream.get());
        ids.push_back(recorded != nullptr ? Value(recorded->id()) : Value());
    }
    return platform::List(std::move(ids));
}

class RecordedDevice final : public WLRylCaptureDevice {
  public:
    RecordedDevice(std::shared_ptr<WLRylCaptureDevice> inner, RecorderRef recorder)
        : _inner(std::move(inner)), _recorder(std::move(recorder)), _id(_recorder->newObject()) {}

    std::optional<WLRylCaptureStreamList> streams(ErrorSlot error) override {
        return _recorder->call(
            Operation::Streams, _id, {}, error,
            [&](ErrorSlot slot) {
                auto streams = _inner->streams(slot);
                if (streams.has_value()) {
                    for (auto& stream : *streams) {
                        stream = _wrappers.wrap(
                            stream, [&] { return std::make_shared<StreamState>(_recorder); });
                    }
                }
                return streams;
            },
            [](const auto& streams) { return streams.has_value() ? idsOf(*streams) : Value(); });
    }
    bool requestControlOfStreams(const WLRylCaptureStreamList& streams, ErrorSlot error) override {
        return _recorder->call(Operation::RequestControl, _id, idsOf(streams), error,
                               [&](ErrorSlot slot) {
                                   return _inner->requestControlOfStreams(
                                       observed::unwrapped<RecordedStream>(streams), slot);
                               });
    }
    bool invalidate(ErrorSlot error) override {
        return _recorder->call(Operation::Invalidate, _id, {}, error,
                               [&](ErrorSlot slot) { return _inner->invalidate(slot); });
    }

    ObjectId id() const { return _id; }

  private:
    const std::shared_ptr<WLRylCaptureDevice> _inner;
    const RecorderRef _recorder;
    const ObjectId _id;
    observed::WrapperTable<WLRylCaptureStream, StreamState, RecordedStream> _wrappers;
};

class RecordedPlugIn final : public WLISPCapturePlugIn {
  public:
    RecordedPlugIn(std::shared_ptr<WLISPCapturePlugIn> inner, RecorderRef recorder)
        : _inner(std::move(inner)), _recorder(std::move(recorder)) {}

    std::shared_ptr<WLRylCaptureDevice> device(ErrorSlot error) override {
        return _recorder->call(
            Operation::Device, 0, {}, error,
            [&](ErrorSlot slot) {
                auto device = _inner->device(slot);
                return device != nullptr
                           ? std::make_shared<RecordedDevice>(std::move(device), _recorder)
                           : nullptr;
            },
            [](const auto& device) { return device != nullptr ? Value(device->id()) : Value(); });
    }

  private:
    const std::shared_ptr<WLISPCapturePlugIn> _inner;
    const RecorderRef _recorder;
};

}  // namespace

std::shared_ptr<WLISPCapturePlugIn> recordCapture(std::shared_ptr<WLISPCapturePlugIn> plugIn,
                                                  const RecorderRef& recorder) {
    return plugIn != nullptr ? std::make_shared<RecordedPlugIn>(std::move(plugIn), recorder)
                             : nullptr;
}

}  // namespace recording
