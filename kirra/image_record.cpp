#include "kirra/image_record.h"

#include <bit>
#include <cstdint>
#include <utility>

namespace {

constexpr std::size_t kFrameIDOffset = 4;
constexpr std::size_t kTimestampOffset = 12;
constexpr std::size_t kIOffset = 16;
constexpr std::size_t kQOffset = 208;
constexpr std::size_t kTemperatureOffset = 788;

std::uint32_t wordAt(const KirraImage& image, std::size_t offset) {
    std::uint32_t word = 0;
    for (std::size_t at = 4; at-- > 0;) {
        word = (word << 8) | std::to_integer<std::uint32_t>(image.bytes[offset + at]);
    }
    return word;
}

std::int32_t signedAt(const KirraImage& image, std::size_t offset) {
    return static_cast<std::int32_t>(wordAt(image, offset));
}

KirraImage recordOfZeros() {
    KirraImage image;
    image.bytes[0] = KirraImage::kReportID;
    return image;
}

}  // namespace

ZRKirraMendraImage::ZRKirraMendraImage() : ZRKirraMendraImage(recordOfZeros()) {}

ZRKirraMendraImage::ZRKirraMendraImage(const KirraImage& kirraImage)
    : _frameID(wordAt(kirraImage, kFrameIDOffset)) {
    platform::MutableList samplesI;
    platform::MutableList samplesQ;
    samplesI.reserve(kSampleCount);
    samplesQ.reserve(kSampleCount);
    for (std::size_t sample = 0; sample < kSampleCount; ++sample) {
        samplesI.emplace_back(signedAt(kirraImage, kIOffset + 4 * sample));
        samplesQ.emplace_back(signedAt(kirraImage, kQOffset + 4 * sample));
    }
    _dScanI = platform::List(std::move(samplesI));
    _dScanQ = platform::List(std::move(samplesQ));
    _tmonDataInC = std::bit_cast<float>(wordAt(kirraImage, kTemperatureOffset));
    _timestampInMilliseconds = wordAt(kirraImage, kTimestampOffset);
}
