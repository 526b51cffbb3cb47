// What a simulated sensor sends, report by report.
#ifndef ZR_DEVICES_SIMULATOR_IMAGE_REPORT_H
#define ZR_DEVICES_SIMULATOR_IMAGE_REPORT_H

#include <cstddef>
#include <cstdint>
#include <optional>
#include <vector>

#include "devices/simulator/profile/hid_profile.h"
#include "platform/error.h"

namespace simulator {

inline constexpr std::int64_t kImageReportID = 118;
inline constexpr std::size_t kImageReportSize = 792;  // bytes, report ID included

struct SensorReport {
    std::uint64_t number = 0;
    std::int64_t id = kImageReportID;
    std::vector<std::byte> data = {};  // begins with the report ID
    platform::ErrorRef error = {};     // in place of the data
    bool unplugged = false;            // in place of everything else: the device is gone
};

// The first report from `number` on that is not dropped; nothing when there is none.
std::optional<SensorReport> nextReport(const HidDeviceProfile& profile, std::uint64_t number);

}  // namespace simulator

#endif
