// The support library's capture service: the image signal processor's camera streams.
//
// These are interfaces; the device behind them implements the four classes. Every operation with an
// error slot may fail without filling the slot.
//
// Owner    The plug-in is one object for the process. A device, its streams and the handlers written
//          to a stream are shared; a stream holds its handlers until they are replaced or the device
//          is invalidated.
//          The last reference to a stream or a device may go inside one of the stream's own handlers.
// Threads  Any. A client mostly calls one operation at a time, but a bad first frame makes it read
//          the error counters and stop the stream while start() has not returned yet. Handlers are
//          called on threads of the service's own, at most one frame handler at a time per stream.
//
// What an implementation owes its callers:
//   - stop() may be called inside a lock of the caller's, and may wait until a handler in progress
//     has returned. So handlers must not take that lock: they hand the work on and return. They do
//     not throw.
//   - Dropping a stream or a device, or stopping it, inside one of its handlers does not wait for that
//     handler.
//   - After stop() a few frames that were already on their way may still be delivered.
//   - After invalidate() no handler is called any more.
//   - The frames of a stream come in the order in which they were taken: presentation times do not fall, and
//     the numbers that a device gives its frames rise.
//   - A buffer that somebody holds a reference to is neither changed nor lent again.
#ifndef ZR_PLATFORM_WELKIN_CAPTURE_H
#define ZR_PLATFORM_WELKIN_CAPTURE_H

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string_view>
#include <vector>

#include "platform/error.h"
#include "platform/image_buffer.h"
#include "platform/media_time.h"
#include "platform/value.h"

// A frame's image and its presentation time. The buffer is lent for the length of the call; copy the
// reference to keep it. A null buffer counts as one without attachments. Does not throw.
using WLRylFrameHandler =
    std::function<void(const platform::ImageBufferRef& buffer, platform::MediaTime time)>;

// An event's code, its time and a value that depends on the code. Does not throw.
using WLRylEventHandler =
    std::function<void(std::int32_t event, platform::MediaTime time, std::int64_t info)>;

// Property keys of a stream, in the order in which a client usually meets them. The comment at each key
// is the Value that is read or written. Numbers may be of any kind: convert what you read.

// Read. String: one of the port types below.
inline constexpr std::string_view kRylCaptureStreamProperty_PortType = "ryl.stream.port-type";
// Written. Dictionary: the three light-source keys below, each to an integer.
inline constexpr std::string_view kRylCaptureStreamProperty_InfraredLightSourceConfiguration =
    "ryl.stream.infrared-light-source";
// Written. Boolean.
inline constexpr std::string_view kRylCaptureStreamProperty_MultipleOutputSupportEnabled =
    "ryl.stream.multiple-outputs";
// Written. Unsigned integer: which of the sensor's formats, from 0.
inline constexpr std::string_view kRylCaptureStreamProperty_FormatIndex = "ryl.stream.format-index";
// Written. Integers: frames per second.
inline constexpr std::string_view kRylCaptureStreamProperty_MinimumFrameRate =
    "ryl.stream.minimum-frame-rate";
inline constexpr std::string_view kRylCaptureStreamProperty_MaximumFrameRate =
    "ryl.stream.maximum-frame-rate";
// Written. Dictionary: output to dictionary: ..._AttachRaw to boolean.
inline constexpr std::string_view kRylCaptureStreamProperty_VideoOutputConfigurations =
    "ryl.stream.output-configurations";
// Written. Dictionary: output to boolean.
inline constexpr std::string_view kRylCaptureStreamProperty_VideoOutputsEnabled =
    "ryl.stream.outputs-enabled";
// Written. Boolean: automatic exposure.
inline constexpr std::string_view kRylCaptureStreamProperty_AEEnabled = "ryl.stream.auto-exposure";
// Written. Dictionary: output to dictionary: ..._PixelBufferHandler to an opaque WLRylFrameHandler,
// ..._EventHandler to an opaque WLRylEventHandler.
inline constexpr std::string_view kRylCaptureStreamProperty_VideoOutputHandlers =
    "ryl.stream.output-handlers";
// Read. Dictionary: error counter, by the keys below, to number.
inline constexpr std::string_view kRylCaptureStreamProperty_ErrorCounters =
    "ryl.stream.error-counters";

// Keys of the light-source configuration. The dense-interleaved structured-light mode is mode 2,
// current 0, pattern 1.
inline constexpr std::string_view kRylCaptureStreamInfraredLightSourceConfigurationKey_Mode =
    "ryl.light-source.mode";
inline constexpr std::string_view
    kRylCaptureStreamInfraredLightSourceConfigurationKey_StructuredLightCurrent =
        "ryl.light-source.current";
inline constexpr std::string_view
    kRylCaptureStreamInfraredLightSourceConfigurationKey_StructuredLightPattern =
        "ryl.light-source.pattern";

// Outputs of a stream, and the keys of an output's configuration and handlers.
inline constexpr std::string_view kRylCaptureStreamVideoOutputID_PrimaryScaler =
    "ryl.output.primary-scaler";
inline constexpr std::string_view kRylCaptureStreamVideoOutputConfigurationKey_AttachRaw =
    "ryl.output.attach-raw";
inline constexpr std::string_view kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler =
    "ryl.output.frame-handler";
inline constexpr std::string_view kRylCaptureStreamVideoOutputHandlerKey_EventHandler =
    "ryl.output.event-handler";

// Keys of the error counters: these two, and the plain "LPDPErrorCount", "UARTErrorCount",
// "SIFErrorCount" and "ProjectorErrorCount". A counter that is missing reads as 0, others are ignored.
inline constexpr std::string_view kRylCaptureStreamPropertyValue_I2CErrorCount = "ryl.errors.i2c";
inline constexpr std::string_view kRylCaptureStreamPropertyValue_MIPIErrorCount = "ryl.errors.mipi";

// The attachment of a delivered buffer that holds the frame's metadata dictionary.
inline constexpr std::string_view kRylCaptureSampleBufferAttachmentKey_MetadataDictionary =
    "ryl.buffer.metadata";

// Keys of the metadata, each to a number (a boolean is one): two that are the service's own, and the
// plain
//   "MetaDataProjectorMode"        "MetaDataProjectorProbeMode"    "NTCTemperatureIdle"
//   "MetaDataProjectorIndex"       "MetaDataProjectorPowerProbeA"  "NTCTemperatureStandby"
//   "MetaDataProjectorPowerLow"    "MetaDataProjectorPowerProbeB"  "NTCTemperatureActive"
//   "MetaDataProjectorPowerHigh"   "MetaDataProjectorPulseWidth"   "DIETemperatureIdle"
//   "MetaDataProjectorPowerFlood"  "HardwareEvents"                "DIETemperatureStandby"
//                                                                  "DIETemperatureActive"
// A frame may lack the flood temperature; lacking another ends the run. A light source of 1 or 2 means
// that the projector lit the frame. "HardwareEvents" are 16 flags; bit 13 is set when projection was
// switched off for safety.
inline constexpr std::string_view kRylCaptureStreamMetadata_InfraredLightSource =
    "RylInfraredLightSource";
inline constexpr std::string_view kRylCaptureStreamMetadata_FloodActiveTemperature =
    "RylFloodActiveTemperature";

// Port types.
inline constexpr std::string_view kRylCapturePortType_FrontFacingInfraredCamera =
    "ryl.port.front-infrared";

class WLRylCaptureStream {
  public:
    virtual ~WLRylCaptureStream() = default;

    // The property's value; a Value that holds nothing when it cannot be read.
    virtual platform::Value valueForProperty(std::string_view property,
                                             platform::ErrorSlot error) = 0;

    // Writes the property; false when the stream refuses it. Needs control of the stream.
    virtual bool setValue(const platform::Value& value,
                          std::string_view forProperty,
                          platform::ErrorSlot error) = 0;

    // Starts to deliver frames and events to the installed handlers.
    virtual bool start(platform::ErrorSlot error) = 0;

    // Stops the delivery. May wait for a handler in progress (see above).
    virtual bool stop(platform::ErrorSlot error) = 0;
};

using WLRylCaptureStreamList = std::vector<std::shared_ptr<WLRylCaptureStream>>;

class WLRylCaptureDevice {
  public:
    virtual ~WLRylCaptureDevice() = default;

    // Every stream of the device in a fixed order; no list on failure. A null entry counts as a stream
    // whose properties cannot be read.
    virtual std::optional<WLRylCaptureStreamList> streams(platform::ErrorSlot error) = 0;

    // Asks for control of the listed streams, which writing a property needs.
    virtual bool requestControlOfStreams(const WLRylCaptureStreamList& streams,
                                         platform::ErrorSlot error) = 0;

    // Gives the device up: control ends, handlers are dropped.
    virtual bool invalidate(platform::ErrorSlot error) = 0;
};

class WLISPCapturePlugIn {
  public:
    virtual ~WLISPCapturePlugIn() = default;

    // The image signal processor's plug-in, the same on every call; null when there is none.
    static std::shared_ptr<WLISPCapturePlugIn> defaultPlugIn();

    // The device that owns the camera streams, or null.
    virtual std::shared_ptr<WLRylCaptureDevice> device(platform::ErrorSlot error) = 0;
};

#endif
