#include "devices/observed/capture.h"

#include <chrono>
#include <utility>

#include "devices/observed/capture_handlers.h"
#include "devices/observed/capture_watch.h"
#include "devices/observed/wrapper_table.h"
#include "platform/deadline.h"

namespace observed {

namespace {

using platform::ErrorSlot;
using platform::Value;

constexpr std::chrono::seconds kLongestLoan{5};
constexpr std::chrono::seconds kReturnGrace{1};

constexpr std::string_view kHandlers = kRylCaptureStreamProperty_VideoOutputHandlers;

std::string buffersWere(std::size_t count, std::string_view what) {
    return platform::format("%lu image %@ %@", count, count == 1 ? "buffer was" : "buffers were",
                            what);
}

class ObservedStream final : public WLRylCaptureStream {
  public:
    ObservedStream(std::shared_ptr<WLRylCaptureStream> inner, std::shared_ptr<StreamWatch> watch)
        : _inner(std::move(inner)), _watch(std::move(watch)) {}

    Value valueForProperty(std::string_view property, ErrorSlot error) override {
        const Call call{"valueForProperty()", property};
        _checkValid(call);
        const Value value = _reporter().call(
            call, error, [&](ErrorSlot slot) { return _inner->valueForProperty(property, slot); });
        return property == kHandlers ? unwatchHandlers(value) : value;
    }

    bool setValue(const Value& value, std::string_view forProperty, ErrorSlot error) override {
        const Call call{"setValue()", forProperty};
        static_cast<void>(_checkValid(call) && _checkControlled(call));
        const Value written = forProperty == kHandlers ? watchHandlers(value, _watch) : value;
        const bool done = _reporter().call(call, error, [&](ErrorSlot slot) {
            return _inner->setValue(written, forProperty, slot);
        });
        if (done && forProperty == kHandlers) {
            _watch->hasFrameHandler = hasFrameHandler(value);
        }
        return done;
    }

    // A handler may stop the stream before start() has returned.
    bool start(ErrorSlot error) override {
        const Call call{"start()"};
        const bool wasRunning = _watch->running.exchange(true);
        if (_checkValid(call) && _checkControlled(call)) {
            if (wasRunning) {
                _reporter().misused(call, "on a stream that is running");
            } else if (!_watch->hasFrameHandler) {
                _reporter().misused(call, "without a frame handler");
            }
        }
        if (!wasRunning) {
            _watch->frames = 0;
        }
        const bool started =
            _reporter().call(call, error, [&](ErrorSlot slot) { return _inner->start(slot); });
        if (!started && !wasRunning) {
            _watch->running = false;
        }
        return started;
    }

    bool stop(ErrorSlot error) override {
        const Call call{"stop()"};
        const bool wasRunning = _watch->running.exchange(false);
        if (_checkValid(call) && !wasRunning) {
            _reporter().misused(call, "on a stream that is not running");
        }
        const bool stopped =
            _reporter().call(call, error, [&](ErrorSlot slot) { return _inner->stop(slot); });
        if (!stopped && wasRunning) {
            _watch->running = true;
        }
        _checkLoans();
        return stopped;
    }

    const std::shared_ptr<WLRylCaptureStream>& inner() const { return _inner; }
    void setControlled() { _watch->controlled = true; }

  private:
    const Reporter& _reporter() const { return _watch->reporter(); }

    bool _checkValid(const Call& call) const {
        const bool valid = !_watch->device->invalidated;
        if (!valid) {
            _reporter().misused(call, "after the device was invalidated");
        }
        return valid;
    }
    bool _checkControlled(const Call& call) const {
        const bool controlled = _watch->controlled;
        if (!controlled) {
            _reporter().misused(call, "without control of the stream");
        }
        return controlled;
    }
    void _checkLoans() const {
        const std::size_t overdue = _watch->device->plugIn->lentBuffers->countLentBefore(
            std::chrono::steady_clock::now() - kLongestLoan, *_watch);
        if (overdue > 0) {
            _reporter().misused(buffersWere(overdue, "held for more than five seconds"));
        }
    }

    const std::shared_ptr<WLRylCaptureStream> _inner;
    const std::shared_ptr<StreamWatch> _watch;
};

class ObservedDevice final : public WLRylCaptureDevice {
  public:
    ObservedDevice(std::shared_ptr<WLRylCaptureDevice> inner,
                   const std::shared_ptr<const PlugInWatch>& plugIn)
        : _inner(std::move(inner)), _watch(std::make_shared<DeviceWatch>(plugIn)) {}

    std::optional<WLRylCaptureStreamList> streams(ErrorSlot error) override {
        const Call call{"streams()"};
        _checkValid(call);
        auto streams =
            _reporter().call(call, error, [&](ErrorSlot slot) { return _inner->streams(slot); });
        if (streams.has_value()) {
            for (auto& stream : *streams) {
                stream =
                    _wrappers.wrap(stream, [&] { return std::make_shared<StreamWatch>(_watch); });
            }
        }
        return streams;
    }

    bool requestControlOfStreams(const WLRylCaptureStreamList& streams, ErrorSlot error) override {
        const Call call{"requestControlOfStreams()"};
        _checkValid(call);
        const WLRylCaptureStreamList inner = unwrapped<ObservedStream>(streams);
        const bool granted = _reporter().call(call, error, [&](ErrorSlot slot) {
            return _inner->requestControlOfStreams(inner, slot);
        });
        for (const auto& stream : streams) {
            auto* own = dynamic_cast<ObservedStream*>(stream.get());
            if (granted && own != nullptr) {
                own->setControlled();
            }
        }
        return granted;
    }

    bool invalidate(ErrorSlot error) override {
        const Call call{"invalidate()"};
        const bool first = _checkValid(call);
        const bool done =
            _reporter().call(call, error, [&](ErrorSlot slot) { return _inner->invalidate(slot); });
        if (done && first) {
            _watch->invalidated = true;
            _awaitBuffers();
        }
        return done;
    }

  private:
    const Reporter& _reporter() const { return _watch->plugIn->reporter; }

    bool _checkValid(const Call& call) const {
        const bool valid = !_watch->invalidated;
        if (!valid) {
            _reporter().misused(call, "on an invalidated device");
        }
        return valid;
    }
    // What is queued already gives its buffers back; inside a handler its own buffer is still out.
    void _awaitBuffers() const {
        if (isInsideHandler()) {
            return;
        }
        const std::size_t out = _watch->plugIn->lentBuffers->awaitReturn(
            *_watch, platform::deadlineAfter(kReturnGrace));
        if (out > 0) {
            _reporter().misused(buffersWere(out, "never given back"));
        }
    }

    const std::shared_ptr<WLRylCaptureDevice> _inner;
    const std::shared_ptr<DeviceWatch> _watch;
    WrapperTable<WLRylCaptureStream, StreamWatch, ObservedStream> _wrappers;
};

class ObservedPlugIn final : public ObservedCapture {
  public:
    ObservedPlugIn(std::shared_ptr<WLISPCapturePlugIn> inner, const Reporter& reporter)
        : _inner(std::move(inner)), _watch(std::make_shared<const PlugInWatch>(reporter)) {}

    std::shared_ptr<WLRylCaptureDevice> device(ErrorSlot error) override {
        auto device = _watch->reporter.call({"device()"}, error,
                                            [&](ErrorSlot slot) { return _inner->device(slot); });
        return device != nullptr ? std::make_shared<ObservedDevice>(std::move(device), _watch)
                                 : nullptr;
    }

    std::size_t lentBuffers() const override { return _watch->lentBuffers->count(); }

  private:
    const std::shared_ptr<WLISPCapturePlugIn> _inner;
    const std::shared_ptr<const PlugInWatch> _watch;
};

}  // namespace

std::shared_ptr<ObservedCapture> observeCapture(std::shared_ptr<WLISPCapturePlugIn> plugIn,
                                                const Reporter& reporter) {
    return plugIn != nullptr ? std::make_shared<ObservedPlugIn>(std::move(plugIn), reporter)
                             : nullptr;
}

}  // namespace observed
