#include "kirra/image_record.h"

#include <array>
#include <bit>
#include <cstdint>

namespace {

constexpr std::size_t kFrameIDOffset = 4;
constexpr std::size_t kTimestampOffset = 12;
constexpr std::size_t kIOffset = 16;
constexpr std::size_t kQOffset = 208;
constexpr std::size_t kTemperatureOffset = 788;

std::uint32_t wordAt(const KirraImage& image, std::size_t offset) {
    const auto byte = [&](std::size_t at) {
        return std::to_integer<std::uint32_t>(image.bytes[offset + at]);
    };
    return byte(0) | byte(1) << 8 | byte(2) << 16 | byte(3) << 24;
}

platform::List samplesAt(const KirraImage& image, std::size_t offset) {
    std::array<std::int32_t, ZRKirraMendraImage::kSampleCount> samples;
    for (std::size_t sample = 0; sample < samples.size(); ++sample) {
        samples[sample] = static_cast<std::int32_t>(wordAt(image, offset + 4 * sample));
    }
    return platform::List(samples);
}

KirraImage recordOfZeros() {
    KirraImage image;
    image.bytes[0] = KirraImage::kReportID;
    return image;
}

}  // namespace

ZRKirraMendraImage::ZRKirraMendraImage() : ZRKirraMendraImage(recordOfZeros()) {}

ZRKirraMendraImage::ZRKirraMendraImage(const KirraImage& kirraImage)
    : _frameID(wordAt(kirraImage, kFrameIDOffset))
    , _dScanI(samplesAt(kirraImage, kIOffset))
    , _dScanQ(samplesAt(kirraImage, kQOffset))
    , _tmonDataInC(std::bit_cast<float>(wordAt(kirraImage, kTemperatureOffset)))
    , _timestampInMilliseconds(wordAt(kirraImage, kTimestampOffset)) {}
