// ZRVantorFrameDescription: the part of a frame's metadata that concerns the projector and the
// module's temperatures, with the frame's number, its presentation time and the moment of the record.
//
// Owner    Shared. The fault experiment makes one per frame on its receiving queue and hands it on to
//          its processing queue.
// Threads  Not synchronised: written by its maker only, any thread may read it afterwards.
// Units    Numbers are kept exactly as the capture service supplied them, kind included. Only the
//          light source (1 and 2 lit the frame) and one hardware event bit are interpreted.
#ifndef ZR_VANTOR_FAULT_FRAME_DESCRIPTION_H
#define ZR_VANTOR_FAULT_FRAME_DESCRIPTION_H

#include <array>
#include <cstddef>
#include <cstdint>
#include <iterator>
#include <memory>
#include <string>
#include <string_view>

#include "platform/media_time.h"
#include "platform/number.h"
#include "platform/value.h"
#include "platform/wall_clock.h"
#include "platform/welkin/capture.h"

// The eighteen numbers, in the order in which they are read and printed. A row yields the property's
// getter and setter, its column, and the metadata key that it is read from.
//        setter's name, getter, metadata key, whether a description needs it
#define ZR_FRAME_NUMBERS(ROW)                                                                    \
    ROW(ProjectorMode, projectorMode, "MetaDataProjectorMode", true)                             \
    ROW(InfraredLightSource, infraredLightSource, kRylCaptureStreamMetadata_InfraredLightSource, \
        true)                                                                                    \
    ROW(ProjectorIndex, projectorIndex, "MetaDataProjectorIndex", true)                          \
    ROW(ProjectorPowerLow, projectorPowerLow, "MetaDataProjectorPowerLow", true)                 \
    ROW(ProjectorPowerHigh, projectorPowerHigh, "MetaDataProjectorPowerHigh", true)              \
    ROW(ProjectorPowerFlood, projectorPowerFlood, "MetaDataProjectorPowerFlood", true)           \
    ROW(ProjectorProbeMode, projectorProbeMode, "MetaDataProjectorProbeMode", true)              \
    ROW(ProjectorPowerProbeA, projectorPowerProbeA, "MetaDataProjectorPowerProbeA", true)        \
    ROW(ProjectorPowerProbeB, projectorPowerProbeB, "MetaDataProjectorPowerProbeB", true)        \
    ROW(ProjectorPulseWidth, projectorPulseWidth, "MetaDataProjectorPulseWidth", true)           \
    ROW(FloodActiveTemperature, floodActiveTemperature,                                          \
        kRylCaptureStreamMetadata_FloodActiveTemperature, false)                                 \
    ROW(NTCTemperatureIdle, NTCTemperatureIdle, "NTCTemperatureIdle", true)                      \
    ROW(NTCTemperatureStandby, NTCTemperatureStandby, "NTCTemperatureStandby", true)             \
    ROW(NTCTemperatureActive, NTCTemperatureActive, "NTCTemperatureActive", true)                \
    ROW(DIETemperatureIdle, DIETemperatureIdle, "DIETemperatureIdle", true)                      \
    ROW(DIETemperatureStandby, DIETemperatureStandby, "DIETemperatureStandby", true)             \
    ROW(DIETemperatureActive, DIETemperatureActive, "DIETemperatureActive", true)                \
    ROW(HardwareEvents, hardwareEvents, "HardwareEvents", true)

class ZRVantorFrameDescription {
  public:
    // Frame 0 at the zero time, made now; every number an integer 0 except the flood temperature,
    // which is absent.
    ZRVantorFrameDescription();

    // The description of a frame with this metadata. Null when the metadata lacks a value under a
    // required key or holds something other than a number there (booleans count as numbers). Only the
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
    // metadata keys. An absent number prints "(null)", a time that is not finite "nan", "inf" or
    // "-inf". (C++ cannot overload a static member on an instance member, hence the suffix Header.)
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

    // projectorMode(), setProjectorMode(), and so on.
#define ZR_PROPERTY(Name, getter, key, required) \
    const Number& getter() const {               \
        return _numbers[Column::Name];           \
    }                                            \
    void set##Name(Number value) {               \
        _numbers[Column::Name] = value;          \
    }
    ZR_FRAME_NUMBERS(ZR_PROPERTY)
#undef ZR_PROPERTY

  private:
    struct Column {
#define ZR_ENUMERATOR(Name, getter, key, required) Name,
        enum : std::size_t { ZR_FRAME_NUMBERS(ZR_ENUMERATOR) };
#undef ZR_ENUMERATOR
    };

    // What each column is read from.
    struct Source {
        platform::StringKey key;
        bool required;
    };
#define ZR_SOURCE(Name, getter, key, required) {key, required},
    static constexpr Source kSources[] = {ZR_FRAME_NUMBERS(ZR_SOURCE)};
#undef ZR_SOURCE

    std::uint64_t _monotonicCount = 0;
    platform::MediaTime _presentationTime;
    platform::Date _creationDate = platform::Date::now();
    std::array<Number, std::size(kSources)> _numbers;
};

#undef ZR_FRAME_NUMBERS

#endif
