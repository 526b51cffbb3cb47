// The cameras of a device without faults.
#include "devices/simulator/profile/capture_profile.h"
#include "platform/welkin/capture.h"

namespace simulator {

namespace {

StreamProfile camera(std::string name, std::string_view portType) {
    StreamProfile stream;
    stream.name = std::move(name);
    stream.portType = portType;
    stream.errorCounters = platform::Dictionary{
        {kRylCaptureStreamPropertyValue_I2CErrorCount, 0},
        {kRylCaptureStreamPropertyValue_MIPIErrorCount, 0},
        {"LPDPErrorCount", 0},
        {"UARTErrorCount", 0},
        {"SIFErrorCount", 0},
        {"ProjectorErrorCount", 0},
    };
    return stream;
}

// Powers in milliwatts, the pulse in microseconds, temperatures in degrees Celsius. The light source
// is 1 and 2 in turn, as an interleaved stream shows it.
StreamProfile infraredCamera() {
    StreamProfile stream = camera("front-infrared", kRylCapturePortType_FrontFacingInfraredCamera);
    stream.lightSources = {1, 2};
    constexpr std::pair<std::string_view, double> kMetadata[] = {
        {"MetaDataProjectorMode", 2},        {"MetaDataProjectorIndex", 0},
        {"MetaDataProjectorPowerLow", 180},  {"MetaDataProjectorPowerHigh", 1450},
        {"MetaDataProjectorPowerFlood", 95}, {"MetaDataProjectorProbeMode", 1},
        {"MetaDataProjectorPowerProbeA", 7}, {"MetaDataProjectorPowerProbeB", 9},
        {"MetaDataProjectorPulseWidth", 45}, {"HardwareEvents", 0},
    };
    for (const auto& [key, value] : kMetadata) {
        stream.metadata.set(key, static_cast<std::int32_t>(value));
    }
    struct Temperature {
        std::string_view key;
        double cold;
        double rise;
    };
    constexpr Temperature kTemperatures[] = {
        {kRylCaptureStreamMetadata_FloodActiveTemperature, 29.2, 7.5},
        {"NTCTemperatureIdle", 27.4, 2.1},
        {"NTCTemperatureStandby", 27.9, 3.0},
        {"NTCTemperatureActive", 28.6, 6.2},
        {"DIETemperatureIdle", 30.1, 2.8},
        {"DIETemperatureStandby", 31.0, 4.4},
        {"DIETemperatureActive", 33.7, 9.6},
    };
    for (const Temperature& temperature : kTemperatures) {
        stream.metadata.set(temperature.key, temperature.cold);
        stream.warming.set(temperature.key, temperature.rise);
    }
    stream.jitterMicroseconds = 400;
    return stream;
}

}  // namespace

CaptureProfile healthyCapture() {
    CaptureProfile profile;
    profile.streams = {camera("rear", "ryl.port.rear"), camera("front", "ryl.port.front"),
                       infraredCamera()};
    return profile;
}

}  // namespace simulator
