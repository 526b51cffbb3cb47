// The Kirra sensor's image record: the 792 bytes of an input report 118, and their parsed form.
#ifndef ZR_KIRRA_IMAGE_RECORD_H
#define ZR_KIRRA_IMAGE_RECORD_H

#include <array>
#include <cstddef>

#include "platform/number.h"
#include "platform/value.h"

// The record as the sensor sends it, report ID byte included. Little-endian; offsets in bytes:
//     0    1  report ID, 118
//     4    4  unsigned    frame ID
//    12    4  unsigned    timestamp, milliseconds of the device's clock
//    16  192  48 signed   first scan section, I samples
//   208  192  48 signed   first scan section, Q samples
//   400  384              second scan section, laid out as the first
//   788    4  float       temperature monitor reading, degrees Celsius (IEEE 754 binary32)
// Nothing else in it is interpreted.
struct KirraImage {
    static constexpr std::size_t kSize = 792;
    static constexpr std::byte kReportID{118};

    std::array<std::byte, kSize> bytes{};
};

// The parsed form of one record. Plain values that their owner may replace; no locking.
class ZRKirraMendraImage {
  public:
    // Samples of a scan section's I array, and of its Q array.
    static constexpr std::size_t kSampleCount = 48;

    // The image of a record of zeros: frame 0, time 0, 48 zeros in each list, 0 degrees.
    ZRKirraMendraImage();

    // Parses any 792 bytes; cannot fail, checks nothing, neither the report ID nor a range. Reads the
    // same on machines of either byte order.
    explicit ZRKirraMendraImage(const KirraImage& kirraImage);

    // An unsigned 32-bit number.
    const platform::Number& frameID() const { return _frameID; }
    void setFrameID(platform::Number frameID) { _frameID = frameID; }

    // Lists of 48 signed 32-bit numbers, sample 0 first, in the sensor's own unit.
    const platform::List& dScanI() const { return _dScanI; }
    void setDScanI(platform::List samples) { _dScanI = std::move(samples); }
    const platform::List& dScanQ() const { return _dScanQ; }
    void setDScanQ(platform::List samples) { _dScanQ = std::move(samples); }

    // A float, degrees Celsius.
    const platform::Number& tmonDataInC() const { return _tmonDataInC; }
    void setTmonDataInC(platform::Number temperature) { _tmonDataInC = temperature; }

    // An unsigned 32-bit number, milliseconds.
    const platform::Number& timestampInMilliseconds() const { return _timestampInMilliseconds; }
    void setTimestampInMilliseconds(platform::Number time) { _timestampInMilliseconds = time; }

  private:
    platform::Number _frameID;
    platform::List _dScanI;
    platform::List _dScanQ;
    platform::Number _tmonDataInC;
    platform::Number _timestampInMilliseconds;
};

#endif
