// ZRVantorFrameDescription: the part of a frame's metadata that concerns the projector and the
// module's temperatures, with the frame's number, its presentation time and the moment of the record.
//
// Owner    Shared. The fault experiment makes one a frame on its receiving queue and hands it on to
//          its processing queue.
// Threads  Not synchronised: written by its maker only, any thread may read it afterwards.
// Units    Numbers are kept exactly as the capture service supplied them, kind included. Nothing is
//          read into them but the light source (1 and 2 lit the frame) and one hardware event bit.
#ifndef ZR_VANTOR_FAULT_FRAME_DESCRIPTION_H
#define ZR_VANTOR_FAULT_FRAME_DESCRIPTION_H

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>

#include "platform/media_time.h"
#include "platform/number.h"
#include "platform/value.h"
#include "platform/wall_clock.h"

class ZRVantorFrameDescription {
  public:
    // Frame 0 at the zero time, made now; every number an integer 0 but for the flood temperature,
    // which is absent.
    ZRVantorFrameDescription();

    // The description of a frame with this metadata. Null when the metadata lacks a value under a
    // required key or holds something else than a number there (booleans count as numbers). Only the
    // flood temperature is optional: it stays absent then. `metadata` may be empty: null.
    static std::shared_ptr<ZRVantorFrameDescription> descriptionWithMonotonicCount(
        std::uint64_t monotonicCount,
        platform::MediaTime presenationTime,
        const platform::Dictionary& metadata);

    // Whether the hardware switched the projector off for safety: bit 13 of the hardware events, of
    // which only the low 16 bits count.
    bool safetyDisabledProjection() const;

    // One line: class and identity, frame number, light source.
    std::string description() const;

    // The frame as a row of 21 fields, and the row of their names; both end with a line feed. Fields
    // are separated by single commas and not quoted. The names of the eighteen numbers are their
    // metadata keys (one name cannot serve a class and its instances, so the class's has a suffix). An
    // absent number prints "(null)", a time that is no number "nan" or "inf".
    std::string csvRepresentation() const;
    static std::string csvRepresentationHeader();

    // The frame's number, from 1, among the frames that were counted.
    std::uint64_t monotonicCount() const { return _monotonicCount; }
    void setMonotonicCount(std::uint64_t count) { _monotonicCount = count; }

    const platform::MediaTime& presentationTime() const { return _presentationTime; }
    void setPresentationTime(const platform::MediaTime& time) { _presentationTime = time; }

    // When the description was made.
    const platform::Date& creationDate() const { return _creationDate; }
    void setCreationDate(const platform::Date& date) { _creationDate = date; }

    using Number = platform::Number;

    const Number& projectorMode() const { return _numbers[ProjectorMode]; }
    void setProjectorMode(Number value) { _numbers[ProjectorMode] = value; }
    const Number& infraredLightSource() const { return _numbers[InfraredLightSource]; }
    void setInfraredLightSource(Number value) { _numbers[InfraredLightSource] = value; }
    const Number& projectorIndex() const { return _numbers[ProjectorIndex]; }
    void setProjectorIndex(Number value) { _numbers[ProjectorIndex] = value; }
    const Number& projectorPowerLow() const { return _numbers[ProjectorPowerLow]; }
    void setProjectorPowerLow(Number value) { _numbers[ProjectorPowerLow] = value; }
    const Number& projectorPowerHigh() const { return _numbers[ProjectorPowerHigh]; }
    void setProjectorPowerHigh(Number value) { _numbers[ProjectorPowerHigh] = value; }
    const Number& projectorPowerFlood() const { return _numbers[ProjectorPowerFlood]; }
    void setProjectorPowerFlood(Number value) { _numbers[ProjectorPowerFlood] = value; }
    const Number& projectorProbeMode() const { return _numbers[ProjectorProbeMode]; }
    void setProjectorProbeMode(Number value) { _numbers[ProjectorProbeMode] = value; }
    const Number& projectorPowerProbeA() const { return _numbers[ProjectorPowerProbeA]; }
    void setProjectorPowerProbeA(Number value) { _numbers[ProjectorPowerProbeA] = value; }
    const Number& projectorPowerProbeB() const { return _numbers[ProjectorPowerProbeB]; }
    void setProjectorPowerProbeB(Number value) { _numbers[ProjectorPowerProbeB] = value; }
    const Number& projectorPulseWidth() const { return _numbers[ProjectorPulseWidth]; }
    void setProjectorPulseWidth(Number value) { _numbers[ProjectorPulseWidth] = value; }
    const Number& floodActiveTemperature() const { return _numbers[FloodActiveTemperature]; }
    void setFloodActiveTemperature(Number value) { _numbers[FloodActiveTemperature] = value; }
    const Number& NTCTemperatureIdle() const { return _numbers[NtcTemperatureIdle]; }
    void setNTCTemperatureIdle(Number value) { _numbers[NtcTemperatureIdle] = value; }
    const Number& NTCTemperatureStandby() const { return _numbers[NtcTemperatureStandby]; }
    void setNTCTemperatureStandby(Number value) { _numbers[NtcTemperatureStandby] = value; }
    const Number& NTCTemperatureActive() const { return _numbers[NtcTemperatureActive]; }
    void setNTCTemperatureActive(Number value) { _numbers[NtcTemperatureActive] = value; }
    const Number& DIETemperatureIdle() const { return _numbers[DieTemperatureIdle]; }
    void setDIETemperatureIdle(Number value) { _numbers[DieTemperatureIdle] = value; }
    const Number& DIETemperatureStandby() const { return _numbers[DieTemperatureStandby]; }
    void setDIETemperatureStandby(Number value) { _numbers[DieTemperatureStandby] = value; }
    const Number& DIETemperatureActive() const { return _numbers[DieTemperatureActive]; }
    void setDIETemperatureActive(Number value) { _numbers[DieTemperatureActive] = value; }
    const Number& hardwareEvents() const { return _numbers[HardwareEvents]; }
    void setHardwareEvents(Number value) { _numbers[HardwareEvents] = value; }

  private:
    // The numbers, in the order in which they are read and printed.
    enum Column : std::size_t {
        ProjectorMode,
        InfraredLightSource,
        ProjectorIndex,
        ProjectorPowerLow,
        ProjectorPowerHigh,
        ProjectorPowerFlood,
        ProjectorProbeMode,
        ProjectorPowerProbeA,
        ProjectorPowerProbeB,
        ProjectorPulseWidth,
        FloodActiveTemperature,
        NtcTemperatureIdle,
        NtcTemperatureStandby,
        NtcTemperatureActive,
        DieTemperatureIdle,
        DieTemperatureStandby,
        DieTemperatureActive,
        HardwareEvents,
    };
    static constexpr std::size_t kColumnCount = HardwareEvents + 1;

    // What each column is read from.
    struct Source {
        std::string_view key;
        bool required;
    };
    static const std::array<Source, kColumnCount> kSources;

    std::uint64_t _monotonicCount = 0;
    platform::MediaTime _presentationTime;
    platform::Date _creationDate = platform::Date::now();
    std::array<Number, kColumnCount> _numbers;
};

#endif
