// The HID bus of a device profile: its devices, the calls that fail and the reports that are wrong.
#include <charconv>
#include <cstddef>
#include <cstdint>
#include <string>

#include "devices/simulator/profile/part_readers.h"
#include "devices/simulator/profile/value_readers.h"

namespace simulator {

namespace {

constexpr std::int64_t kHighestUsage = 0xFFFF;
constexpr std::int64_t kHighestReportId = 0xFF;
constexpr std::size_t kLongestReport = 0x10000;

constexpr JsonKey<ReportOverride> kReportOverrideKeys[] = {
    {"reports", [](const JsonNode& node,
                   ReportOverride& change) { change.reports = readRange(node, "reports"); }},
    {"length",
     [](const JsonNode& node, ReportOverride& change) {
         change.length = node.asInteger<std::size_t>(0, kLongestReport);
     }},
    {"reportID",
     [](const JsonNode& node, ReportOverride& change) {
         change.reportID = node.asInteger<std::int64_t>(0, kHighestReportId);
     }},
    {"dropped", readMember<&ReportOverride::dropped>},
};

constexpr JsonKey<ReportError> kReportErrorKeys[] = {
    {"report", [](const JsonNode& node,
                  ReportError& error) { error.report = node.asInteger<std::uint64_t>(1); }},
    {"error", [](const JsonNode& node, ReportError& error) { error.error = readError(node); }},
};

constexpr JsonKey<ScanShape> kScanKeys[] = {
    {"amplitude", readMember<&ScanShape::amplitude>},
    {"center", readMember<&ScanShape::center>},
    {"width", readMember<&ScanShape::width>},
    {"frequency", readMember<&ScanShape::frequency>},
    {"chirp", readMember<&ScanShape::chirp>},
    {"turn", readMember<&ScanShape::turn>},
    {"noise", readMember<&ScanShape::noise>},
};

void readErrorAtReport(const JsonNode& node, HidDeviceProfile& device) {
    device.errorAtReport.reset();
    if (!node.isNull()) {
        readObject(node, kReportErrorKeys, device.errorAtReport.emplace());
        if (device.errorAtReport->error == nullptr) {
            node.fail("needs an \"error\"");
        }
    }
}

// Named by the report ID in decimal.
void readFeatureReportFaults(const JsonNode& node, HidDeviceProfile& device) {
    node.forEachKey([&](const std::string& name, const JsonNode& value) {
        std::int64_t id = -1;
        const auto [end, problem] = std::from_chars(name.data(), name.data() + name.size(), id);
        if (problem != std::errc() || end != name.data() + name.size() || id < 0 ||
            id > kHighestReportId) {
            value.fail("not a report ID from 0 to " + std::to_string(kHighestReportId));
        }
        device.featureReports[id] = readFault(value);
    });
}

constexpr JsonKey<HidDeviceProfile> kDeviceFaultKeys[] = {
    {"open", readMember<&HidDeviceProfile::open>},
    {"close", readMember<&HidDeviceProfile::close>},
    {"featureReports", readFeatureReportFaults},
};

constexpr JsonKey<HidDeviceProfile> kDeviceKeys[] = {
    {"usagePage",
     [](const JsonNode& node, HidDeviceProfile& device) {
         device.usagePage = node.asInteger<std::int64_t>(0, kHighestUsage);
     }},
    {"usage",
     [](const JsonNode& node, HidDeviceProfile& device) {
         device.usage = node.asInteger<std::int64_t>(0, kHighestUsage);
     }},
    {"faults", [](const JsonNode& node,
                  HidDeviceProfile& device) { readObject(node, kDeviceFaultKeys, device); }},
    {"needsFeatureReports", readMember<&HidDeviceProfile::needsFeatureReports>},
    {"reportsPerSecond",
     [](const JsonNode& node, HidDeviceProfile& device) {
         device.reportsPerSecond = node.asDouble(0, kLargestQuantity);
     }},
    {"maxReports", readMember<&HidDeviceProfile::maxReports>},
    {"overrides",
     [](const JsonNode& node, HidDeviceProfile& device) {
         device.overrides = readList(node, kReportOverrideKeys);
     }},
    {"errorAtReport", readErrorAtReport},
    {"unplugAtReport",
     [](const JsonNode& node, HidDeviceProfile& device) {
         device.unplugAtReport = readOptional(node, 1);
     }},
    {"firstFrameId", readMember<&HidDeviceProfile::firstFrameId>},
    {"firstTimestamp", readMember<&HidDeviceProfile::firstTimestamp>},
    {"startTemperature", readMember<&HidDeviceProfile::startTemperature>},
    {"temperaturePerReport", readMember<&HidDeviceProfile::temperaturePerReport>},
    {"scan", [](const JsonNode& node,
                HidDeviceProfile& device) { readObject(node, kScanKeys, device.scan); }},
};

constexpr JsonKey<HidProfile> kHidKeys[] = {
    {"manager", readMember<&HidProfile::managerAvailable>},
    {"devices",
     [](const JsonNode& node, HidProfile& hid) {
         readNamed(
             node, kDeviceKeys, hid.devices, "HID device", {"usagePage", "usage"},
             [](const HidDeviceProfile& device) { return device.product; },
             [](const std::string& name, const JsonNode& /*node*/) {
                 HidDeviceProfile device;
                 device.product = name;
                 return device;
             });
     }},
};

}  // namespace

void readHid(const JsonNode& node, HidProfile& hid) {
    readObject(node, kHidKeys, hid);
}

}  // namespace simulator
