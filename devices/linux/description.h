// A port description: which node, control, byte or file of a Linux machine stands for what of a device. Made of a
// JSON file; examples/linux/port-description.schema.json describes its keys.
#ifndef ZR_DEVICES_LINUX_DESCRIPTION_H
#define ZR_DEVICES_LINUX_DESCRIPTION_H

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

#include "devices/linux/data_type.h"
#include "devices/linux/file_number.h"
#include "platform/number.h"
#include "platform/welkin/capture.h"

namespace linux_device {

// A number of the machine, as it is read: first masked and shifted, then scaled, then added to. One that is only
// masked and shifted stays an integer.
struct Conversion {
    std::optional<std::uint64_t> mask = {};
    unsigned shift = 0;
    double scale = 1;
    double add = 0;

    platform::Number apply(platform::Number number) const;
};

// Where a number comes from. Which of these a place of the description takes, the reader checks.
struct Constant {
    platform::Number value;
};
struct Control {
    std::string
        name;  // as the driver or v4l2-ctl shows it, or its number: "Gain", "gain", "0x00980913"
};
struct ExtensionUnit {
    std::uint8_t unit;
    std::uint8_t selector;
    DataType type;
};
struct BufferField {
    std::size_t at = 0;  // bytes from the start of the frame's metadata
    DataType type = {};
};
enum class StreamCount { LostFrames, ErrorBuffers };
using Source = std::
    variant<std::monostate, Constant, FileNumber, Control, ExtensionUnit, BufferField, StreamCount>;

struct NumberSource {
    std::string name;      // what it stands for
    std::string key = {};  // the same in the description
    Source source = {};
    Conversion conversion = {};
    bool optional = false;     // frames without it are delivered all the same
    double atMostEvery = 0.5;  // seconds that a number of a file or a control is kept for
    bool sinceStart = false;   // less what it was when the stream started
};

// How the numbers of a counter go on when what counts starts anew.
enum class Restarts { Never, AtStreamStart, AtAnyTime };

struct CounterChannel {
    std::string name;
    std::string group;
    std::string subgroup;
    NumberSource count = {};
    Restarts restarts = Restarts::Never;
};

// Which USB device; what is empty matches any.
struct UsbIdentity {
    std::optional<std::uint16_t> vendor = {};
    std::optional<std::uint16_t> product = {};
    std::string serial = {};

    bool matches(std::uint16_t itsVendor,
                 std::uint16_t itsProduct,
                 std::string_view itsSerial) const {
        return vendor.value_or(itsVendor) == itsVendor &&
               product.value_or(itsProduct) == itsProduct &&
               (serial.empty() || serial == itsSerial);
    }
};

struct VideoMatch {
    std::string driver = {};             // of the node's device, such as "uvcvideo"
    std::string name = {};               // of the node, as the kernel shows it
    std::string busInfo = {};            // as the node says itself
    std::optional<unsigned> index = {};  // among the nodes of one camera
    UsbIdentity usb = {};
};

struct VideoFormat {
    std::string fourcc;
    std::uint32_t width = 0;
    std::uint32_t height = 0;
};

// A name in a description for which the interfaces have another.
struct ShortName {
    std::string_view shortName;
    std::string_view name;
};

// The properties that a client writes, but for the handlers.
inline constexpr ShortName kProperties[] = {
    {"multipleOutputs", kRylCaptureStreamProperty_MultipleOutputSupportEnabled},
    {"formatIndex", kRylCaptureStreamProperty_FormatIndex},
    {"minimumFrameRate", kRylCaptureStreamProperty_MinimumFrameRate},
    {"maximumFrameRate", kRylCaptureStreamProperty_MaximumFrameRate},
    {"outputConfigurations", kRylCaptureStreamProperty_VideoOutputConfigurations},
    {"outputsEnabled", kRylCaptureStreamProperty_VideoOutputsEnabled},
    {"autoExposure", kRylCaptureStreamProperty_AEEnabled},
    {"lightSource", kRylCaptureStreamProperty_InfraredLightSourceConfiguration},
};
// The keys of the light source's configuration; each is a target of its own: "lightSource.mode".
inline constexpr ShortName kLightSourceKeys[] = {
    {"mode", kRylCaptureStreamInfraredLightSourceConfigurationKey_Mode},
    {"current", kRylCaptureStreamInfraredLightSourceConfigurationKey_StructuredLightCurrent},
    {"pattern", kRylCaptureStreamInfraredLightSourceConfigurationKey_StructuredLightPattern},
};

// What becomes of a property that is written.
struct Accepted {};       // nothing; the write succeeds
struct FrameInterval {};  // frames per second, set at the video node
struct FormatChoice {};   // the index of one of the formats
struct PropertyTarget {
    std::string name;  // of the property in the description: "lightSource.mode"
    std::variant<Accepted, FrameInterval, FormatChoice, Control, ExtensionUnit> target = Accepted();
    // By the text of the value that is written ("true", "2"); another value is refused. Empty: scale and add.
    std::map<std::string, std::int64_t> values = {};
    double scale = 1;
    double add = 0;
};

struct ControlSetting {
    Control control;
    std::int64_t value = 0;
};

// The keys of a frame's metadata that a client reads.
struct FrameKey {
    std::string_view shortName;  // in a description
    std::string_view name;       // in the metadata
    bool isRequired = true;      // a client refuses a frame without it
};
inline constexpr FrameKey kFrameKeys[] = {
    {"infraredLightSource", kRylCaptureStreamMetadata_InfraredLightSource},
    {"floodActiveTemperature", kRylCaptureStreamMetadata_FloodActiveTemperature, false},
    {"MetaDataProjectorMode", "MetaDataProjectorMode"},
    {"MetaDataProjectorIndex", "MetaDataProjectorIndex"},
    {"MetaDataProjectorPowerLow", "MetaDataProjectorPowerLow"},
    {"MetaDataProjectorPowerHigh", "MetaDataProjectorPowerHigh"},
    {"MetaDataProjectorPowerFlood", "MetaDataProjectorPowerFlood"},
    {"MetaDataProjectorProbeMode", "MetaDataProjectorProbeMode"},
    {"MetaDataProjectorPowerProbeA", "MetaDataProjectorPowerProbeA"},
    {"MetaDataProjectorPowerProbeB", "MetaDataProjectorPowerProbeB"},
    {"MetaDataProjectorPulseWidth", "MetaDataProjectorPulseWidth"},
    {"HardwareEvents", "HardwareEvents"},
    {"NTCTemperatureIdle", "NTCTemperatureIdle"},
    {"NTCTemperatureStandby", "NTCTemperatureStandby"},
    {"NTCTemperatureActive", "NTCTemperatureActive"},
    {"DIETemperatureIdle", "DIETemperatureIdle"},
    {"DIETemperatureStandby", "DIETemperatureStandby"},
    {"DIETemperatureActive", "DIETemperatureActive"},
};

enum class EventCause { ControlChanged, SourceChanged, ErrorBuffer, LostFrames };
struct EventRule {
    EventCause cause = EventCause::LostFrames;
    Control control = {};  // of ControlChanged
    std::int32_t code = 0;
};

struct StreamDescription {
    std::string name;
    std::string portType = {};
    VideoMatch video = {};
    std::string metadataFormat = {};  // fourcc of the metadata node; empty: the camera has none
    std::uint32_t buffers = 4;
    std::vector<VideoFormat> formats = {};
    std::vector<PropertyTarget> properties = {};
    std::vector<ControlSetting> beforeStart = {};
    std::vector<NumberSource> metadata = {};
    std::vector<NumberSource> errorCounters = {};
    std::vector<EventRule> events = {};
};

struct HidDescription {
    std::string name;
    std::optional<std::uint16_t> bus = {};  // BUS_USB and so on of linux/input.h
    UsbIdentity identity = {};
};

struct DisplayDescription {
    std::string connector;  // the name of its folder in /sys/class/drm, with wildcards
    // The display is powered when all of these files of the folder have this content.
    std::map<std::string, std::string> on = {
        {"status", "connected"}, {"enabled", "enabled"}, {"dpms", "On"}};
};

// The parts that a description does not have count as not available.
struct Description {
    std::string path;
    std::string summary;
    std::optional<std::vector<StreamDescription>> capture = {};
    std::optional<std::vector<CounterChannel>> counters = {};
    std::optional<std::vector<HidDescription>> hid = {};
    std::optional<DisplayDescription> display = {};
};

// The description in a file. On failure returns nothing and appends a line to `problems` for each thing that is
// wrong: the file, a JSON pointer (RFC 6901) where there is one, and the reason.
std::optional<Description> readDescription(const std::string& path,
                                           std::vector<std::string>& problems);

}  // namespace linux_device

#endif
