// What a HID report descriptor says of the device as a whole (USB-IF, Device Class Definition for HID 1.11, 6.2.2).
#ifndef ZR_DEVICES_LINUX_REPORT_DESCRIPTOR_H
#define ZR_DEVICES_LINUX_REPORT_DESCRIPTOR_H

#include <cstdint>
#include <span>

namespace linux_device {

struct ReportDescriptor {
    // The usage of the first application collection; both 0 when there is none.
    std::uint32_t primaryUsagePage = 0;
    std::uint32_t primaryUsage = 0;
    bool hasReportIds = false;  // whether reports begin with their ID
};

// A descriptor that ends within an item is read up to there.
ReportDescriptor parseReportDescriptor(std::span<const std::uint8_t> bytes);

}  // namespace linux_device

#endif
