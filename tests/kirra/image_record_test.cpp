#include "kirra/image_record.h"

#include <bit>
#include <cstdint>
#include <functional>
#include <limits>
#include <string>
#include <tuple>
#include <vector>

#include <gtest/gtest.h>

namespace {

using platform::Number;

// A record in which every value that is read is another one.
KirraImage distinctRecord() {
    KirraImage record;
    for (std::size_t at = 0; at < record.bytes.size(); ++at) {
        record.bytes[at] = static_cast<std::byte>(at * 7 + at / 256);
    }
    return record;
}

void set(KirraImage& record, std::size_t offset, const std::vector<int>& bytes) {
    for (const int byte : bytes) {
        record.bytes[offset++] = static_cast<std::byte>(byte);
    }
}

auto parts(const ZRKirraMendraImage& image) {
    return std::tuple(image.frameID(), image.dScanI(), image.dScanQ(), image.tmonDataInC(),
                      image.timestampInMilliseconds());
}

TEST(ImageRecord, ReadsEachFieldFromItsPlaceInItsKind) {
    using Read = std::function<Number(const ZRKirraMendraImage&)>;
    const auto sampleI = [](std::size_t k) -> Read {
        return [k](const auto& image) { return image.dScanI()[k].asNumber(); };
    };
    const auto sampleQ = [](std::size_t k) -> Read {
        return [k](const auto& image) { return image.dScanQ()[k].asNumber(); };
    };
    const Read frameID = [](const auto& image) { return image.frameID(); };
    const Read timestamp = [](const auto& image) { return image.timestampInMilliseconds(); };
    const Read temperature = [](const auto& image) { return image.tmonDataInC(); };
    const struct {
        std::size_t offset;
        std::vector<int> bytes;
        Read read;
        Number expected;
    } kCases[] = {
        {4, {1, 2, 3, 4}, frameID, std::uint32_t{0x04030201}},
        {4, {255, 255, 255, 255}, frameID, std::uint32_t{4294967295}},
        {12, {4, 3, 2, 1}, timestamp, std::uint32_t{0x01020304}},
        {16, {255, 255, 255, 255}, sampleI(0), std::int32_t{-1}},
        {204, {0, 1, 0, 128}, sampleI(47), std::int32_t{-2147483392}},
        {208, {254, 255, 255, 255}, sampleQ(0), std::int32_t{-2}},
        {396, {0, 0, 0, 128}, sampleQ(47), std::numeric_limits<std::int32_t>::min()},
        {788, {0, 0, 72, 66}, temperature, 50.0F},
    };
    for (const auto& [offset, bytes, read, expected] : kCases) {
        KirraImage record = distinctRecord();
        set(record, offset, bytes);
        EXPECT_EQ(read(ZRKirraMendraImage(record)), expected) << "at " << offset;
    }
    KirraImage record;
    set(record, 788, {1, 0, 128, 127});  // a signalling NaN, which a conversion would quiet
    const Number nan = ZRKirraMendraImage(record).tmonDataInC();
    EXPECT_EQ(nan.kind(), Number::Kind::Float);
    EXPECT_EQ(std::bit_cast<std::uint32_t>(nan.asFloat()), 0x7F800001U);
}

// Which bytes are read: those of the first section, the frame ID, the timestamp and the temperature.
TEST(ImageRecord, DependsOnNoByteThatIsNotRead) {
    const KirraImage record = distinctRecord();
    const auto before = parts(ZRKirraMendraImage(record));
    for (std::size_t at = 0; at < record.bytes.size(); ++at) {
        const bool isRead = (at >= 4 && at < 8) || (at >= 12 && at < 400) || at >= 788;
        KirraImage changed = record;
        changed.bytes[at] ^= std::byte{0x10};
        EXPECT_EQ(parts(ZRKirraMendraImage(changed)) != before, isRead) << "byte " << at;
    }
}

TEST(ImageRecord, IsZeroByDefault) {
    const platform::List zeros(platform::MutableList(48, std::int32_t{0}));
    EXPECT_EQ(parts(ZRKirraMendraImage()), std::tuple(Number(std::uint32_t{0}), zeros, zeros,
                                                      Number(0.0F), Number(std::uint32_t{0})));
}

TEST(ImageRecord, HasWhatItsOwnerPutsThere) {
    ZRKirraMendraImage image;
    image.setFrameID(1);
    const platform::List two{2};
    const platform::List three{3};
    image.setDScanI(two);
    image.setDScanQ(three);
    image.setTmonDataInC(4.5F);
    image.setTimestampInMilliseconds(5);
    EXPECT_EQ(parts(image), std::tuple(Number(1), two, three, Number(4.5F), Number(5)));
}

}  // namespace
