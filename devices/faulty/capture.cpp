#include <algorithm>
#include <utility>

#include "devices/faulty/damage.h"
#include "devices/faulty/decorators.h"
#include "devices/observed/handlers_property.h"
#include "devices/observed/wrapper_table.h"

namespace faulty {

namespace {

using platform::ErrorSlot;
using platform::ImageBuffer;
using platform::ImageBufferRef;
using platform::MediaTime;
using platform::Value;
using StreamsRef = std::optional<WLRylCaptureStreamList>;

constexpr Way kStreamListWays[] = {Way::WithError, Way::WithoutError, Way::AbsentObject,
                                   Way::Empty};
constexpr Way kValueWays[] = {Way::WithError, Way::WithoutError, Way::WrongKind};
constexpr Way kDictionaryWays[] = {Way::WithError, Way::WithoutError, Way::Empty, Way::WrongKind,
                                   Way::WrongEntries};
constexpr Way kFrameWays[] = {Way::AbsentObject, Way::AbsentValue,  Way::Empty,
                              Way::WrongKind,    Way::WrongEntries, Way::Lost};

constexpr std::string_view kHandlers = kRylCaptureStreamProperty_VideoOutputHandlers;
constexpr auto kMetadata = kRylCaptureSampleBufferAttachmentKey_MetadataDictionary;

// The properties as their constants name them, and in which ways reading one can fail.
struct Property {
    std::string_view key;
    std::string_view name;
    std::span<const Way> ways = kDictionaryWays;
};
constexpr Property kProperties[] = {
    {kRylCaptureStreamProperty_PortType, "PortType", kValueWays},
    {kRylCaptureStreamProperty_InfraredLightSourceConfiguration,
     "InfraredLightSourceConfiguration"},
    {kRylCaptureStreamProperty_MultipleOutputSupportEnabled, "MultipleOutputSupportEnabled",
     kValueWays},
    {kRylCaptureStreamProperty_FormatIndex, "FormatIndex", kValueWays},
    {kRylCaptureStreamProperty_MinimumFrameRate, "MinimumFrameRate", kValueWays},
    {kRylCaptureStreamProperty_MaximumFrameRate, "MaximumFrameRate", kValueWays},
    {kRylCaptureStreamProperty_VideoOutputConfigurations, "VideoOutputConfigurations"},
    {kRylCaptureStreamProperty_VideoOutputsEnabled, "VideoOutputsEnabled"},
    {kRylCaptureStreamProperty_AEEnabled, "AEEnabled", kValueWays},
    {kHandlers, "VideoOutputHandlers"},
    {kRylCaptureStreamProperty_ErrorCounters, "ErrorCounters"},
};

// Any other is known by its key.
Property propertyOf(std::string_view key) {
    const auto* known = std::find_if(std::begin(kProperties), std::end(kProperties),
                                     [&](const Property& one) { return one.key == key; });
    return known != std::end(kProperties) ? *known : Property{key, key, kValueWays};
}

// The frame with other metadata. The device's buffer stays out as long as the client holds this.
ImageBufferRef damagedFrame(const ImageBufferRef& buffer, Way way) {
    if (way == Way::AbsentObject) {
        return nullptr;
    }
    struct Frame {
        ImageBufferRef of;
        ImageBuffer image;
    };
    const Value metadata =
        damaged(buffer != nullptr ? buffer->attachment(kMetadata) : Value(), way);
    platform::MutableDictionary attachments;
    if (metadata.isPresent()) {
        attachments.set(kMetadata, metadata);
    }
    const auto frame = std::make_shared<const Frame>(
        Frame{buffer, ImageBuffer(platform::Dictionary(std::move(attachments)))});
    return {frame, &frame->image};
}

// What the device calls in place of the client's handlers.
class FaultyFrameHandler {
  public:
    FaultyFrameHandler(Value client, InjectorRef injector)
        : _client(std::move(client)), _injector(std::move(injector)) {}

    void operator()(const ImageBufferRef& buffer, MediaTime time) const {
        const auto& handler = *_client.object<WLRylFrameHandler>();
        const auto strike = _injector->take(StepKind::Frame, {}, {}, kFrameWays);
        if (!strike.has_value()) {
            handler(buffer, time);
        } else if (strike->fault.way != Way::Lost) {
            handler(damagedFrame(buffer, strike->fault.way), time);
        }
    }

    const Value& client() const { return _client; }

  private:
    Value _client;
    InjectorRef _injector;
};

class FaultyEventHandler {
  public:
    FaultyEventHandler(Value client, InjectorRef injector)
        : _client(std::move(client)), _injector(std::move(injector)) {}

    void operator()(std::int32_t code, MediaTime time, std::int64_t info) const {
        if (!_injector->take(StepKind::Event, {}, {}, kLost).has_value()) {
            (*_client.object<WLRylEventHandler>())(code, time, info);
        }
    }

    const Value& client() const { return _client; }

  private:
    Value _client;
    InjectorRef _injector;
};

class FaultyStream final : public WLRylCaptureStream {
  public:
    FaultyStream(std::shared_ptr<WLRylCaptureStream> inner, InjectorRef injector)
        : _inner(std::move(inner)), _injector(std::move(injector)) {}

    Value valueForProperty(std::string_view property, ErrorSlot error) override {
        const Property known = propertyOf(property);
        const Value value = _injector->call(
            "valueForProperty", known.name, known.ways, error,
            [&] { return _inner->valueForProperty(property, error); }, damaged);
        return property == kHandlers
                   ? observed::unwrapHandlers<FaultyFrameHandler, FaultyEventHandler>(value)
                   : value;
    }
    bool setValue(const Value& value, std::string_view forProperty, ErrorSlot error) override {
        const Value written =
            forProperty == kHandlers
                ? observed::wrapHandlers<FaultyFrameHandler, FaultyEventHandler>(value, _injector)
                : value;
        return _injector->call("setValue", propertyOf(forProperty).name, error,
                               [&] { return _inner->setValue(written, forProperty, error); });
    }
    bool start(ErrorSlot error) override {
        return _injector->call("start", {}, error, [&] { return _inner->start(error); });
    }
    bool stop(ErrorSlot error) override {
        return _injector->call("stop", {}, error, [&] { return _inner->stop(error); });
    }

    const std::shared_ptr<WLRylCaptureStream>& inner() const { return _inner; }

  private:
    const std::shared_ptr<WLRylCaptureStream> _inner;
    const InjectorRef _injector;
};

StreamsRef damagedList(const StreamsRef& streams, Way way) {
    return WLRylCaptureStreamList(way == Way::AbsentObject && streams.has_value() ? streams->size()
                                                                                  : 0);
}

class FaultyCaptureDevice final : public WLRylCaptureDevice {
  public:
    FaultyCaptureDevice(std::shared_ptr<WLRylCaptureDevice> inner, InjectorRef injector)
        : _inner(std::move(inner)), _injector(std::move(injector)) {}

    StreamsRef streams(ErrorSlot error) override {
        StreamsRef streams = _injector->call(
            "streams", {}, kStreamListWays, error, [&] { return _inner->streams(error); },
            damagedList);
        if (streams.has_value()) {
            for (auto& stream : *streams) {
                stream = _wrappers.wrap(stream, [&] { return _injector; });
            }
        }
        return streams;
    }
    bool requestControlOfStreams(const WLRylCaptureStreamList& streams, ErrorSlot error) override {
        return _injector->call("requestControlOfStreams", {}, error, [&] {
            return _inner->requestControlOfStreams(observed::unwrapped<FaultyStream>(streams),
                                                   error);
        });
    }
    bool invalidate(ErrorSlot error) override {
        return _injector->call("invalidate", {}, error, [&] { return _inner->invalidate(error); });
    }

  private:
    const std::shared_ptr<WLRylCaptureDevice> _inner;
    const InjectorRef _injector;
    observed::WrapperTable<WLRylCaptureStream, Injector, FaultyStream> _wrappers;
};

class FaultyPlugIn final : public WLISPCapturePlugIn {
  public:
    FaultyPlugIn(std::shared_ptr<WLISPCapturePlugIn> inner, InjectorRef injector)
        : _inner(std::move(inner)), _injector(std::move(injector)) {}

    std::shared_ptr<WLRylCaptureDevice> device(ErrorSlot error) override {
        auto device = _injector->call("device", {}, error, [&] { return _inner->device(error); });
        return device != nullptr
                   ? std::make_shared<FaultyCaptureDevice>(std::move(device), _injector)
                   : nullptr;
    }

  private:
    const std::shared_ptr<WLISPCapturePlugIn> _inner;
    const InjectorRef _injector;
};

}  // namespace

std::shared_ptr<WLISPCapturePlugIn> decorateCapture(std::shared_ptr<WLISPCapturePlugIn> plugIn,
                                                    InjectorRef injector) {
    return std::make_shared<FaultyPlugIn>(std::move(plugIn), std::move(injector));
}

}  // namespace faulty
