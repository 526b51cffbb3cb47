// The first phase of a run: finds the stream, takes control of it and writes its properties.
#include "vantor_fault/fault_experiment.h"

using platform::Dictionary;
using platform::Value;

bool ZRVantorFaultExperiment::_selectStream(platform::ErrorRef& reported,
                                            platform::ErrorSlot error) {
    const auto plugIn = WLISPCapturePlugIn::defaultPlugIn();
    _device = plugIn != nullptr ? plugIn->device(&reported) : nullptr;
    if (_device == nullptr) {
        return platform::fail(error, ZRCapturePlugInErrorDomain, 200, reported,
                              "Failed to get the capture plugin!");
    }
    const auto streams = _device->streams(&reported);
    if (!streams.has_value()) {
        return platform::fail(error, ZRCapturePlugInErrorDomain, 202, reported,
                              "Failed to get streams!");
    }
    for (const auto& stream : *streams) {
        const Value portType =
            stream != nullptr
                ? stream->valueForProperty(kRylCaptureStreamProperty_PortType, &reported)
                : Value();
        if (!portType.isPresent()) {
            // Reported only: another stream may be the one.
            static_cast<void>(platform::fail(error, ZRCapturePlugInErrorDomain, 202, reported,
                                             "Failed to get stream port type!"));
        } else if (portType.string() != nullptr && *portType.string() == _port) {
            _stream = stream;
            return true;
        }
    }
    return platform::fail(error, ZRCapturePlugInErrorDomain, 202, nullptr,
                          "Failed to find stream!");
}

bool ZRVantorFaultExperiment::_configureStream(platform::ErrorRef& reported,
                                               platform::ErrorSlot error) {
    if (!_device->requestControlOfStreams({_stream}, &reported)) {
        return platform::fail(error, ZRCapturePlugInErrorDomain, 203, reported,
                              "Failed to request the zorvel stream!");
    }

    using Self = ZRVantorFaultExperiment;
    struct Write {
        std::string_view property;
        Value (*value)(Self&);
        std::int64_t code;                            // of the error when the stream refuses it
        platform::FormatText<std::uint64_t> message;  // with the format index
    };
    static constexpr Write kWrites[] = {
        {kRylCaptureStreamProperty_InfraredLightSourceConfiguration,
         [](Self&) -> Value {
             return Dictionary{
                 {kRylCaptureStreamInfraredLightSourceConfigurationKey_Mode, 2},
                 {kRylCaptureStreamInfraredLightSourceConfigurationKey_StructuredLightCurrent, 0},
                 {kRylCaptureStreamInfraredLightSourceConfigurationKey_StructuredLightPattern, 1}};
         },
         212, "Failed to configure structured light!"},
        {kRylCaptureStreamProperty_MultipleOutputSupportEnabled,
         [](Self&) -> Value { return true; }, 208, "Failed to enable multiple outputs."},
        {kRylCaptureStreamProperty_FormatIndex,
         [](Self& self) -> Value { return self._formatIndex; }, 209,
         "Failed to set format index %@."},
        {kRylCaptureStreamProperty_MinimumFrameRate, [](Self&) -> Value { return 30; }, 207,
         "Failed to set min frame rate."},
        {kRylCaptureStreamProperty_MaximumFrameRate, [](Self&) -> Value { return 30; }, 207,
         "Failed to set max frame rate."},
        {kRylCaptureStreamProperty_VideoOutputConfigurations,
         [](Self&) -> Value {
             return Dictionary{
                 {kRylCaptureStreamVideoOutputID_PrimaryScaler,
                  Dictionary{{kRylCaptureStreamVideoOutputConfigurationKey_AttachRaw, true}}}};
         },
         208, "Failed to configure primary scalar."},
        {kRylCaptureStreamProperty_VideoOutputsEnabled,
         [](Self&) -> Value {
             return Dictionary{{kRylCaptureStreamVideoOutputID_PrimaryScaler, true}};
         },
         208, "Failed to enable primary scalar."},
        {kRylCaptureStreamProperty_AEEnabled, [](Self&) -> Value { return false; }, 211,
         "Failed to diable AE."},
        {kRylCaptureStreamProperty_VideoOutputHandlers,
         [](Self& self) -> Value { return self._videoOutputHandlers(); }, 208,
         "Failed to set callback handlers."},
    };
    for (const Write& write : kWrites) {
        if (!_stream->setValue(write.value(*this), write.property, &reported)) {
            return platform::fail(error, ZRCapturePlugInErrorDomain, write.code, reported,
                                  write.message, _formatIndex);
        }
    }
    return true;
}

// The stream's handlers for the primary output. They do not keep the experiment alive.
Value ZRVantorFaultExperiment::_videoOutputHandlers() {
    WLRylFrameHandler frameHandler = [weak = weak_from_this()](
                                         const platform::ImageBufferRef& buffer,
                                         platform::MediaTime time) {
        if (const auto self = weak.lock()) {
            self->_handlePixelBuffer(buffer, time);
        }
    };
    WLRylEventHandler eventHandler =
        [weak = weak_from_this()](std::int32_t event, platform::MediaTime time, std::int64_t info) {
            if (const auto self = weak.lock()) {
                self->_handleEvent(event, time, info);
            }
        };
    return Dictionary{{kRylCaptureStreamVideoOutputID_PrimaryScaler,
                       Dictionary{{kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler,
                                   Value::opaque(std::move(frameHandler))},
                                  {kRylCaptureStreamVideoOutputHandlerKey_EventHandler,
                                   Value::opaque(std::move(eventHandler))}}}};
}
