#include "devices/observed/capture_handlers.h"

#include <algorithm>
#include <chrono>
#include <utility>

#include "devices/observed/handlers_property.h"
#include "platform/run_tag.h"

namespace observed {

namespace {

using platform::Value;
using Clock = std::chrono::steady_clock;

thread_local int handlersOnThisThread = 0;

// A call of a client's handler, for the run that wrote it.
class HandlerCall {
  public:
    HandlerCall(StreamWatch& stream, std::string_view handler, platform::RunTag run) : _run(run) {
        ++handlersOnThisThread;
        if (stream.device->invalidated && !stream.lateHandlerReported.exchange(true)) {
            stream.reporter().misused(
                platform::format("%@ was called after invalidate() had returned", handler));
        }
    }
    ~HandlerCall() { --handlersOnThisThread; }
    HandlerCall(const HandlerCall&) = delete;
    HandlerCall& operator=(const HandlerCall&) = delete;

  private:
    const platform::RunTagScope _run;
};

// A call of a frame handler, of which a stream makes one at a time.
class FrameHandlerCall {
  public:
    FrameHandlerCall(StreamWatch& stream, platform::RunTag run)
        : _call(stream, "a frame handler", run), _stream(stream) {
        if (stream.frameHandlersInside++ > 0 && !stream.overlapReported.exchange(true)) {
            stream.reporter().misused("two frame handlers of one stream were called at once");
        }
    }
    ~FrameHandlerCall() { --_stream.frameHandlersInside; }
    FrameHandlerCall(const FrameHandlerCall&) = delete;
    FrameHandlerCall& operator=(const FrameHandlerCall&) = delete;

  private:
    const HandlerCall _call;
    StreamWatch& _stream;
};

// These two hold the client's handler as the value that it wrote.
class WatchedFrameHandler {
  public:
    WatchedFrameHandler(Value client, std::shared_ptr<StreamWatch> stream)
        : _client(std::move(client)), _stream(std::move(stream)) {}

    void operator()(const platform::ImageBufferRef& buffer, platform::MediaTime time) const {
        const FrameHandlerCall call(*_stream, _run);
        DeliveredFrame frame{
            .number = ++_stream->frames, .time = time, .delivered = Clock::now(), .metadata = {}};
        const auto& handler = *_client.object<WLRylFrameHandler>();
        if (buffer == nullptr) {
            handler(buffer, time);
        } else {
            constexpr auto kMetadata = kRylCaptureSampleBufferAttachmentKey_MetadataDictionary;
            if (const auto* metadata = buffer->attachment(kMetadata).dictionary()) {
                frame.metadata = *metadata;
            }
            handler(_stream->device->plugIn->lentBuffers->lend(buffer, _stream, frame.delivered),
                    time);
        }
        _stream->reporter().report([&](Observer& observer) { observer.frameDelivered(frame); });
    }

    const Value& client() const { return _client; }

  private:
    Value _client;
    std::shared_ptr<StreamWatch> _stream;
    platform::RunTag _run = platform::currentRunTag();
};

class WatchedEventHandler {
  public:
    WatchedEventHandler(Value client, std::shared_ptr<StreamWatch> stream)
        : _client(std::move(client)), _stream(std::move(stream)) {}

    void operator()(std::int32_t code, platform::MediaTime time, std::int64_t info) const {
        const HandlerCall call(*_stream, "an event handler", _run);
        const DeliveredEvent event{
            .code = code, .time = time, .info = info, .delivered = Clock::now()};
        (*_client.object<WLRylEventHandler>())(code, time, info);
        _stream->reporter().report([&](Observer& observer) { observer.eventDelivered(event); });
    }

    const Value& client() const { return _client; }

  private:
    Value _client;
    std::shared_ptr<StreamWatch> _stream;
    platform::RunTag _run = platform::currentRunTag();
};

}  // namespace

Value watchHandlers(const Value& handlers, const std::shared_ptr<StreamWatch>& stream) {
    return wrapHandlers<WatchedFrameHandler, WatchedEventHandler>(handlers, stream);
}

Value unwatchHandlers(const Value& handlers) {
    return unwrapHandlers<WatchedFrameHandler, WatchedEventHandler>(handlers);
}

bool hasFrameHandler(const Value& handlers) {
    const platform::Dictionary* outputs = handlers.dictionary();
    return outputs != nullptr &&
           std::any_of(outputs->entries().begin(), outputs->entries().end(),
                       [](const auto& output) {
                           const auto* handler =
                               output.second[kFrameHandler].template object<WLRylFrameHandler>();
                           return handler != nullptr && *handler;
                       });
}

bool isInsideHandler() {
    return handlersOnThisThread > 0;
}

}  // namespace observed
