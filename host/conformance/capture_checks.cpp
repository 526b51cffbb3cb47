// The promises of the capture service (platform/welkin/capture.h), on the front infrared camera, else on the first
// camera whose port type can be read.
#include <atomic>
#include <chrono>
#include <memory>
#include <optional>
#include <utility>
#include <vector>

#include "host/conformance/conformance.h"
#include "host/record/plugin_data.h"
#include "platform/deadline.h"
#include "platform/welkin/capture.h"

namespace host {

namespace {

using platform::Dictionary;
using platform::ErrorSlot;
using Clock = std::chrono::steady_clock;
using platform::Value;

enum Check : std::size_t { Slot, StreamOrder, Overlap, Times, Numbers, Reused, Changed, Late };

constexpr Promise kPromises[] = {
    kSlotPromise,
    {"streams in another order", "streams() has every stream of the device in a fixed order"},
    {"frame handlers that overlap", "At most one frame handler of a stream is called at a time",
     false},
    {"time going backwards", "The presentation times of a stream do not fall"},
    {"frames out of order", "The numbers that a device gives its frames rise"},
    {"buffer reused while referenced",
     "A buffer is not lent again while a client holds a reference", false},
    {"buffer changed while referenced", "A buffer does not change while a client holds a reference",
     false},
    {"handler called after invalidation", "After invalidate() no handler is called any more",
     false},
};

constexpr std::size_t kFrames = 30;
constexpr std::size_t kHeld = 2;              // buffers; a pool may have only a few
constexpr std::chrono::seconds kPatience{5};  // for a frame that must come
constexpr std::chrono::milliseconds kSilence{
    200};  // in which a frame would have come that must not
constexpr std::chrono::milliseconds kOverlap{
    100};  // in which another handler would have been called

// What the handlers saw. They are called on threads of the device's.
class Seen {
  public:
    explicit Seen(std::shared_ptr<Checks> checks) : _checks(std::move(checks)) {}

    void frame(const platform::ImageBufferRef& buffer, platform::MediaTime time) {
        const bool isAlone = _inside.fetch_add(1) == 0;
        _checks->decide(Overlap, isAlone,
                        "a frame handler was called while another had not returned");
        if (_isStillValid("a frame handler")) {
            const platform::MutexLock lock(_mutex);
            ++_frames;
            _changed.notifyAll();
            _compareTimes(time.seconds());
            if (buffer != nullptr) {
                _compareNumbers(*buffer);
                _hold(buffer);
            }
            // Long enough for a second handler to show itself.
            const auto deadline = platform::deadlineAfter(kOverlap);
            while (_frames == 1 && Clock::now() < deadline) {
                _changed.waitUntil(_mutex, deadline);
            }
        }
        --_inside;
    }
    void event() { _isStillValid("an event handler"); }

    // Whether so many frames came, none of them much later than the one before.
    bool await(std::size_t frames) {
        const platform::MutexLock lock(_mutex);
        std::size_t before = _frames;
        auto deadline = platform::deadlineAfter(kPatience);
        while (_frames < frames && Clock::now() < deadline) {
            _changed.waitUntil(_mutex, deadline);
            if (_frames != before) {
                before = _frames;
                deadline = platform::deadlineAfter(kPatience);
            }
        }
        return _frames >= frames;
    }

    void compareHeld() {
        const platform::MutexLock lock(_mutex);
        for (const Held& held : _held) {
            _checks->decide(Changed, _metadataOf(*held.buffer) == held.metadata,
                            "the metadata of a buffer is another than when it was lent");
        }
        _held.clear();
    }

    void invalidated() { _isInvalidated = true; }
    void requireSilence() {
        const platform::MutexLock lock(_mutex);
        const std::size_t before = _frames;
        const auto deadline = platform::deadlineAfter(kSilence);
        while (_frames == before && Clock::now() < deadline) {
            _changed.waitUntil(_mutex, deadline);
        }
        // A camera that never called a handler keeps silent in any case.
        if (_frames > 0) {
            _checks->kept(Late);
        }
    }

  private:
    struct Held {
        platform::ImageBufferRef buffer;
        Value metadata;
    };

    static const Value& _metadataOf(const platform::ImageBuffer& buffer) {
        return buffer.attachment(kRylCaptureSampleBufferAttachmentKey_MetadataDictionary);
    }

    bool _isStillValid(std::string_view handler) {
        const bool isValid = !_isInvalidated;
        if (!isValid) {
            _checks->broken(Late, platform::format("%@ was called", handler));
        }
        return isValid;
    }

    void _compareTimes(double time) ZR_REQUIRES(_mutex) {
        if (_lastTime.has_value()) {
            _checks->decide(Times, time >= *_lastTime,
                            platform::format("frame %lu comes %@ s before the one before it",
                                             _frames, platform::Number(*_lastTime - time).text()));
        }
        _lastTime = time;
    }

    void _compareNumbers(const platform::ImageBuffer& buffer) ZR_REQUIRES(_mutex) {
        const platform::Number* number = _metadataOf(buffer)[kSensorFrameNumber].number();
        if (number == nullptr) {
            return;
        }
        const auto is = number->as<std::int64_t>();
        if (_lastNumber.has_value()) {
            _checks->decide(Numbers, is > *_lastNumber,
                            platform::format("frame %@ comes after frame %@", platform::Number(is),
                                             platform::Number(*_lastNumber)));
        }
        _lastNumber = is;
    }

    void _hold(const platform::ImageBufferRef& buffer) ZR_REQUIRES(_mutex) {
        for (const Held& held : _held) {
            _checks->decide(Reused, held.buffer != buffer, "a frame came in a buffer that is held");
        }
        if (_held.size() < kHeld) {
            _held.push_back({buffer, _metadataOf(*buffer)});
        }
    }

    const std::shared_ptr<Checks> _checks;
    std::atomic<int> _inside{0};              // frame handlers that have not returned
    std::atomic<bool> _isInvalidated{false};  // written by the client's thread

    platform::Mutex _mutex;
    platform::Condition _changed;
    std::size_t _frames ZR_GUARDED_BY(_mutex) = 0;
    std::optional<double> _lastTime ZR_GUARDED_BY(_mutex);
    std::optional<std::int64_t> _lastNumber ZR_GUARDED_BY(_mutex);
    std::vector<Held> _held ZR_GUARDED_BY(_mutex);
};

Value handlersTo(const std::shared_ptr<Seen>& seen) {
    WLRylFrameHandler frame = [seen](const platform::ImageBufferRef& buffer,
                                     platform::MediaTime time) { seen->frame(buffer, time); };
    WLRylEventHandler event = [seen](std::int32_t, platform::MediaTime, std::int64_t) {
        seen->event();
    };
    return Dictionary{{kRylCaptureStreamVideoOutputID_PrimaryScaler,
                       Dictionary{{kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler,
                                   Value::opaque(std::move(frame))},
                                  {kRylCaptureStreamVideoOutputHandlerKey_EventHandler,
                                   Value::opaque(std::move(event))}}}};
}

// A session with the device, in the calls that the fault experiment makes: a recording of one answers them.
class CaptureSession {
  public:
    explicit CaptureSession(const devices::Device& device)
        : _checks(std::make_shared<Checks>(kPromises, device.unanswered))
        , _plugIn(device.services.capture)
        , _seen(std::make_shared<Seen>(_checks)) {}

    std::vector<CheckRecord> check() {
        if (_open()) {
            if (_configure()) {
                _stream30();
            }
            _compareStreams();
            _giveUpDevice();
        }
        return _checks->records();
    }

  private:
    template <class Call>
    auto _call(std::string_view operation, const Call& call) {
        return _checks->call(Slot, operation, call);
    }

    bool _open() {
        _device = _call("device()", [&](ErrorSlot error) { return _plugIn->device(error); });
        const auto streams =
            _device == nullptr
                ? std::nullopt
                : _call("streams()", [&](ErrorSlot error) { return _device->streams(error); });
        if (!streams.has_value()) {
            return false;
        }
        _streams = *streams;
        for (const auto& stream : _streams) {
            if (stream == nullptr) {
                continue;
            }
            const Value type = _call("valueForProperty() of the port type", [&](ErrorSlot error) {
                return stream->valueForProperty(kRylCaptureStreamProperty_PortType, error);
            });
            const bool isInfrared = type.string() != nullptr &&
                                    *type.string() == kRylCapturePortType_FrontFacingInfraredCamera;
            if (type.isPresent() && (_stream == nullptr || isInfrared)) {
                _stream = stream;
            }
            if (isInfrared) {
                break;
            }
        }
        if (_stream == nullptr) {
            _checks->giveUp("the device has no stream whose port type can be read");
        }
        return _stream != nullptr;
    }

    bool _configure() {
        if (!_call("requestControlOfStreams()", [&](ErrorSlot error) {
                return _device->requestControlOfStreams({_stream}, error);
            })) {
            return false;
        }
        const std::pair<std::string_view, Value> values[] = {
            {kRylCaptureStreamProperty_InfraredLightSourceConfiguration,
             Dictionary{
                 {kRylCaptureStreamInfraredLightSourceConfigurationKey_Mode, 2},
                 {kRylCaptureStreamInfraredLightSourceConfigurationKey_StructuredLightCurrent, 0},
                 {kRylCaptureStreamInfraredLightSourceConfigurationKey_StructuredLightPattern, 1}}},
            {kRylCaptureStreamProperty_MultipleOutputSupportEnabled, true},
            {kRylCaptureStreamProperty_FormatIndex, std::uint64_t{0}},
            {kRylCaptureStreamProperty_MinimumFrameRate, 30},
            {kRylCaptureStreamProperty_MaximumFrameRate, 30},
            {kRylCaptureStreamProperty_VideoOutputConfigurations,
             Dictionary{
                 {kRylCaptureStreamVideoOutputID_PrimaryScaler,
                  Dictionary{{kRylCaptureStreamVideoOutputConfigurationKey_AttachRaw, true}}}}},
            {kRylCaptureStreamProperty_VideoOutputsEnabled,
             Dictionary{{kRylCaptureStreamVideoOutputID_PrimaryScaler, true}}},
            {kRylCaptureStreamProperty_AEEnabled, false},
            {kRylCaptureStreamProperty_VideoOutputHandlers, handlersTo(_seen)},
        };
        for (const auto& [property, value] : values) {
            if (!_call(platform::format("setValue() of %@", property),
                       [&, &name = property, &written = value](ErrorSlot error) {
                           return _stream->setValue(written, name, error);
                       })) {
                return false;
            }
        }
        return true;
    }

    void _stream30() {
        if (!_call("start()", [&](ErrorSlot error) { return _stream->start(error); })) {
            return;
        }
        if (!_seen->await(kFrames)) {
            _checks->giveUp(platform::format("fewer than %lu frames came", kFrames));
        }
        _call("stop()", [&](ErrorSlot error) { return _stream->stop(error); });
        _seen->compareHeld();
        _checks->notChecked(Numbers, "the frames have no number");
    }

    void _compareStreams() {
        std::optional<WLRylCaptureStreamList> again;
        const bool isAnswered = _checks->answered([&] { again = _device->streams(nullptr); });
        if (!isAnswered || !again.has_value()) {
            _checks->notChecked(StreamOrder, "streams() gives no list the second time");
            return;
        }
        std::vector<Value> before;
        std::vector<Value> after;
        const bool canCompare = _checks->answered([&] {
            before = _portTypes(_streams);
            after = _portTypes(*again);
        });
        if (canCompare) {
            _checks->decide(StreamOrder, before == after,
                            "the port types are others the second time");
        } else {
            _checks->notChecked(StreamOrder, "the port types cannot be read again");
        }
    }

    static std::vector<Value> _portTypes(const WLRylCaptureStreamList& streams) {
        std::vector<Value> types;
        for (const auto& stream : streams) {
            types.push_back(stream != nullptr ? stream->valueForProperty(
                                                    kRylCaptureStreamProperty_PortType, nullptr)
                                              : Value());
        }
        return types;
    }

    void _giveUpDevice() {
        if (_call("invalidate()", [&](ErrorSlot error) { return _device->invalidate(error); })) {
            _seen->invalidated();
            // Nor may a handler be called when its stream goes.
            _stream.reset();
            _streams.clear();
            _device.reset();
            _seen->requireSilence();
        }
    }

    const std::shared_ptr<Checks>
        _checks;  // shared with the handlers, which a broken device may keep
    const std::shared_ptr<WLISPCapturePlugIn> _plugIn;
    const std::shared_ptr<Seen> _seen;
    std::shared_ptr<WLRylCaptureDevice> _device;
    WLRylCaptureStreamList _streams;
    std::shared_ptr<WLRylCaptureStream> _stream;
};

}  // namespace

std::vector<CheckRecord> checkCapture(const devices::Device& device) {
    return CaptureSession(device).check();
}

}  // namespace host
