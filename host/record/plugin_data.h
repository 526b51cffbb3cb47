// What the bench knows about the data that the plug-in's experiments take and return: what their
// parameters count, what a frame's metadata holds, what an image is made of. Progress and drawings need
// it; an experiment with other data is reported without them.
#ifndef ZR_HOST_RECORD_PLUGIN_DATA_H
#define ZR_HOST_RECORD_PLUGIN_DATA_H

#include <cstddef>
#include <iterator>
#include <string_view>

#include "platform/value.h"
#include "platform/welkin/capture.h"

namespace host {

// What the progress of a run is counted in.
enum class Counted { Frames, Images };

// The parameters of an experiment that say after how many frames or images it ends.
struct CountParameter {
    std::string_view parameter;
    Counted counted;
    std::string_view plural;
};
inline constexpr CountParameter kCountParameters[] = {{"frameCount", Counted::Frames, "frames"},
                                                      {"images", Counted::Images, "images"}};

// The parameter of an experiment that limits its time, in seconds.
inline constexpr std::string_view kTimeoutParameter = "timeout";

// The entry of a frame's metadata that a device may add: the sensor's own number of the frame. The
// plug-in does not read it.
inline constexpr std::string_view kSensorFrameNumber = "FrameNumber";

// The entries of a frame's metadata that are drawn.
inline constexpr std::string_view kLightSource = kRylCaptureStreamMetadata_InfraredLightSource;

enum class Sensor { NTC, Die, Flood };
enum class SensorState { Idle, Standby, Active };

// The temperatures in a frame's metadata, in the device's own unit.
struct TemperatureEntry {
    std::string_view key;
    std::string_view name;
    Sensor sensor;
    SensorState state;
};
inline constexpr TemperatureEntry kTemperatures[] = {
    {"NTCTemperatureIdle", "NTC idle", Sensor::NTC, SensorState::Idle},
    {"NTCTemperatureStandby", "NTC standby", Sensor::NTC, SensorState::Standby},
    {"NTCTemperatureActive", "NTC active", Sensor::NTC, SensorState::Active},
    {"DIETemperatureIdle", "DIE idle", Sensor::Die, SensorState::Idle},
    {"DIETemperatureStandby", "DIE standby", Sensor::Die, SensorState::Standby},
    {"DIETemperatureActive", "DIE active", Sensor::Die, SensorState::Active},
    {kRylCaptureStreamMetadata_FloodActiveTemperature, "Flood active", Sensor::Flood,
     SensorState::Active},
};
inline constexpr std::size_t kTemperatureCount = std::size(kTemperatures);

// The entries of a frame's metadata that have a column of their own in a table of frames. Any further entry is
// written beside them.
inline constexpr std::string_view kFrameColumns[] = {
    kSensorFrameNumber,
    "MetaDataProjectorMode",
    kLightSource,
    "MetaDataProjectorIndex",
    "MetaDataProjectorPowerLow",
    "MetaDataProjectorPowerHigh",
    "MetaDataProjectorPowerFlood",
    "MetaDataProjectorProbeMode",
    "MetaDataProjectorPowerProbeA",
    "MetaDataProjectorPowerProbeB",
    "MetaDataProjectorPulseWidth",
    kRylCaptureStreamMetadata_FloodActiveTemperature,
    "NTCTemperatureIdle",
    "NTCTemperatureStandby",
    "NTCTemperatureActive",
    "DIETemperatureIdle",
    "DIETemperatureStandby",
    "DIETemperatureActive",
    "HardwareEvents"};

// How many samples of each sort an image has.
inline constexpr std::size_t kImageSamples = 48;

// The images in an experiment's auxiliary data, or null. Valid as long as the data.
inline const platform::List* imagesOf(const platform::Dictionary& auxiliaryData) {
    return auxiliaryData["images"].list();
}

// What an image holds; views of its dictionary, valid as long as that. A number is absent, and a list
// null, where the image lacks it.
struct ImageView {
    explicit ImageView(const platform::Value& image)
        : frameId(image["frameID"].asNumber())
        , milliseconds(image["timestampInMilliseconds"].asNumber())
        , celsius(image["tmonDataInC"].asNumber())
        , samplesI(image["dScanI"].list())
        , samplesQ(image["dScanQ"].list()) {}

    platform::Number frameId;
    platform::Number milliseconds;  // of the sensor's clock
    platform::Number celsius;
    const platform::List* samplesI;
    const platform::List* samplesQ;
};

}  // namespace host

#endif
