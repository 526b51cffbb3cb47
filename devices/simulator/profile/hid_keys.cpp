// The HID bus of a device profile: its devices, the calls that fail and the reports that are wrong.
#include <charconv>
#include <cstddef>
#include <cstdint>
#include <string>

#include "devices/simulator/profile/parts.h"
#include "devices/simulator/profile/value_forms.h"

namespace simulator {

namespace {

constexpr std::int64_t kHighestUsage = 0xFFFF;
constexpr std::int64_t kHighestReportId = 0xFF;
constexpr std::size_t kLongestReport = 0x10000;

constexpr JsonKey<ReportOverride> kReportOverrideKeys[] = {
    {"reports",
     [](const JsonNode& node, ReportOverride& change) {
         change.reports = readRange(node, "reports");
     },
     [](const ReportOverride& change) { return jsonOf(change.reports); }},
    numberKey<&ReportOverride::length, std::size_t{0}, kLongestReport>("length"),
    numberKey<&ReportOverride::reportID, std::int64_t{0}, kHighestReportId>("reportID"),
    memberKey<&ReportOverride::dropped>("dropped"),
};

constexpr JsonKey<ReportError> kReportErrorKeys[] = {
    numberKey<&ReportError::report, std::uint64_t{1}, kLastNumber>("report"),
    memberKey<&ReportError::error>("error"),
};

constexpr JsonKey<ScanShape> kScanKeys[] = {
    memberKey<&ScanShape::amplitude>("amplitude"), memberKey<&ScanShape::center>("center"),
    memberKey<&ScanShape::width>("width"),         memberKey<&ScanShape::frequency>("frequency"),
    memberKey<&ScanShape::chirp>("chirp"),         memberKey<&ScanShape::turn>("turn"),
    memberKey<&ScanShape::noise>("noise"),
};

void readErrorAtReport(const JsonNode& node, HidDeviceProfile& device) {
    device.errorAtReport.reset();
    if (!node.isNull()) {
        node.requireKeys({"error"}, "needs an \"error\"");
        input::readObject(node, kReportErrorKeys, device.errorAtReport.emplace());
    }
}

Json writeErrorAtReport(const HidDeviceProfile& device) {
    return device.errorAtReport.has_value()
               ? input::writeObject(kReportErrorKeys, *device.errorAtReport)
               : Json();
}

// Named by the report ID in decimal.
void readFeatureReportFaults(const JsonNode& node, HidDeviceProfile& device) {
    node.forEachKey([&](const std::string& name, const JsonNode& value) {
        std::uint64_t id = 0;
        const auto [end, problem] = std::from_chars(name.data(), name.data() + name.size(), id);
        if (problem != std::errc() || end != name.data() + name.size() || id > kHighestReportId) {
            value.fail("not a report ID from 0 to " + std::to_string(kHighestReportId));
        }
        readInto(value, device.featureReports[static_cast<std::int64_t>(id)]);
    });
}

Json writeFeatureReportFaults(const HidDeviceProfile& device) {
    Json json = Json::object();
    for (const auto& [id, fault] : device.featureReports) {
        json[std::to_string(id)] = jsonOf(fault);
    }
    return json;
}

constexpr JsonKey<HidDeviceProfile> kDeviceFaultKeys[] = {
    memberKey<&HidDeviceProfile::open>("open"),
    memberKey<&HidDeviceProfile::close>("close"),
    {"featureReports", readFeatureReportFaults, writeFeatureReportFaults},
};

constexpr JsonKey<HidDeviceProfile> kDeviceKeys[] = {
    numberKey<&HidDeviceProfile::usagePage, std::int64_t{0}, kHighestUsage>("usagePage"),
    numberKey<&HidDeviceProfile::usage, std::int64_t{0}, kHighestUsage>("usage"),
    groupKey<kDeviceFaultKeys>("faults"),
    memberKey<&HidDeviceProfile::needsFeatureReports>("needsFeatureReports"),
    numberKey<&HidDeviceProfile::reportsPerSecond, 0, kLargestQuantity>("reportsPerSecond"),
    memberKey<&HidDeviceProfile::maxReports>("maxReports"),
    listKey<&HidDeviceProfile::overrides, kReportOverrideKeys>("overrides"),
    {"errorAtReport", readErrorAtReport, writeErrorAtReport},
    numberKey<&HidDeviceProfile::unplugAtReport, std::uint64_t{1}, kLastNumber>("unplugAtReport"),
    memberKey<&HidDeviceProfile::firstFrameId>("firstFrameId"),
    memberKey<&HidDeviceProfile::firstTimestamp>("firstTimestamp"),
    memberKey<&HidDeviceProfile::startTemperature>("startTemperature"),
    memberKey<&HidDeviceProfile::temperaturePerReport>("temperaturePerReport"),
    objectKey<&HidDeviceProfile::scan, kScanKeys>("scan"),
};

constexpr JsonNames<HidDeviceProfile> kDeviceNames = {
    "HID device",
    &HidDeviceProfile::product,
    {"usagePage", "usage"},
    [](const JsonNode& /*node*/) { return HidDeviceProfile(); },
};

constexpr JsonKey<HidProfile> kHidKeys[] = {
    memberKey<&HidProfile::managerAvailable>("manager"),
    namedKey<&HidProfile::devices, kDeviceKeys, kDeviceNames>("devices"),
};

}  // namespace

void readHid(const JsonNode& node, HidProfile& hid) {
    input::readObject(node, kHidKeys, hid);
}

input::Json writeHid(const HidProfile& hid) {
    return input::writeObject(kHidKeys, hid);
}

}  // namespace simulator
