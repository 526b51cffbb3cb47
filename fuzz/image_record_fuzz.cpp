// Any 792 bytes make an image, in which each value has its kind and the bytes that are not read do
// not count.
#include "kirra/image_record.h"

#include <algorithm>
#include <bit>
#include <cstdint>
#include <cstring>
#include <utility>

#include "fuzz/expect.h"

namespace {

using fuzz::expect;
using platform::Number;

// The record as this machine, which is little-endian, has it in memory.
struct InMemory {
    std::uint8_t reportID;
    std::uint8_t unread1;
    std::uint16_t unread2;
    std::uint32_t frameID;
    std::uint32_t unread3;
    std::uint32_t timestamp;
    std::int32_t scans[2][2][48];
    std::uint32_t unread4;
    float temperature;
};
static_assert(sizeof(InMemory) == KirraImage::kSize);
static_assert(std::endian::native == std::endian::little);

// Equal, or both not a number.
bool same(const Number& a, const Number& b) {
    const bool bothNaN = a.kind() == b.kind() && a.asDouble() != a.asDouble() &&  //
                         b.asDouble() != b.asDouble();
    return a == b || bothNaN;
}

void expectImage(const ZRKirraMendraImage& image, const InMemory& record) {
    expect(image.frameID() == Number(record.frameID), "the frame ID");
    expect(image.timestampInMilliseconds() == Number(record.timestamp), "the timestamp");
    expect(same(image.tmonDataInC(), record.temperature), "the temperature");
    expect(image.dScanI().size() == 48 && image.dScanQ().size() == 48, "48 samples");
    for (std::size_t k = 0; k < 48; ++k) {
        expect(image.dScanI()[k].asNumber() == Number(record.scans[0][0][k]), "an I sample");
        expect(image.dScanQ()[k].asNumber() == Number(record.scans[0][1][k]), "a Q sample");
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    KirraImage image;
    std::memcpy(image.bytes.data(), data, std::min(size, image.bytes.size()));
    InMemory record;
    std::memcpy(&record, image.bytes.data(), sizeof record);
    expectImage(ZRKirraMendraImage(image), record);

    for (const auto& [first, last] : {std::pair{0, 4}, {8, 12}, {400, 788}}) {
        std::fill(image.bytes.begin() + first, image.bytes.begin() + last, std::byte{0xA5});
    }
    expectImage(ZRKirraMendraImage(image), record);
    return 0;
}
