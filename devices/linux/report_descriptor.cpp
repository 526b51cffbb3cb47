#include "devices/linux/report_descriptor.h"

#include <cstddef>
#include <vector>

namespace linux_device {

namespace {

// The first byte of an item without the bits of its size.
constexpr std::uint8_t kItemMask = 0xFC;
constexpr std::uint8_t kSizeMask = 0x03;
constexpr std::uint8_t kTypeMask = 0x0C;
constexpr std::uint8_t kMainType = 0x00;
constexpr std::uint8_t kLongItem = 0xFE;
enum Item : std::uint8_t {
    UsagePage = 0x04,
    Usage = 0x08,
    ReportId = 0x84,
    Collection = 0xA0,
    Push = 0xA4,
    Pop = 0xB4,
};
constexpr std::uint32_t kApplication = 1;
constexpr std::size_t kExtendedUsage = 4;  // bytes: the upper half is the page

}  // namespace

ReportDescriptor parseReportDescriptor(std::span<const std::uint8_t> bytes) {
    // The first usage since the last main item.
    struct {
        bool isThere = false;
        bool isExtended = false;
        std::uint32_t value = 0;
    } usage;
    ReportDescriptor descriptor;
    std::uint32_t page = 0;
    std::vector<std::uint32_t> pushedPages;
    bool hasPrimary = false;
    for (std::size_t at = 0; at < bytes.size();) {
        const std::uint8_t head = bytes[at];
        if (head == kLongItem) {
            at += 3 + (at + 1 < bytes.size() ? bytes[at + 1] : 0);
            continue;
        }
        const std::size_t sizeCode = head & kSizeMask;
        const std::size_t size = sizeCode == 3 ? 4 : sizeCode;
        if (bytes.size() - at - 1 < size) {
            break;
        }
        std::uint32_t value = 0;
        for (std::size_t byte = 0; byte < size; ++byte) {
            value |= std::uint32_t{bytes[at + 1 + byte]} << (8 * byte);
        }
        at += 1 + size;
        switch (head & kItemMask) {
            case UsagePage:
                page = value;
                break;
            case Usage:
                if (!usage.isThere) {
                    usage = {true, size == kExtendedUsage, value};
                }
                break;
            case ReportId:
                descriptor.hasReportIds = true;
                break;
            case Push:
                pushedPages.push_back(page);
                break;
            case Pop:
                if (!pushedPages.empty()) {
                    page = pushedPages.back();
                    pushedPages.pop_back();
                }
                break;
            case Collection:
                if (value == kApplication && usage.isThere && !hasPrimary) {
                    hasPrimary = true;
                    descriptor.primaryUsagePage = usage.isExtended ? usage.value >> 16U : page;
                    descriptor.primaryUsage = usage.value & 0xFFFFU;
                }
                break;
            default:
                break;
        }
        if ((head & kTypeMask) == kMainType) {
            usage = {};
        }
    }
    return descriptor;
}

}  // namespace linux_device
