// What is on a simulated HID bus, and what it does wrong: every call can fail, with or without an error
// object, and every report can be what a broken sensor would make of it.
#ifndef ZR_DEVICES_SIMULATOR_PROFILE_HID_PROFILE_H
#define ZR_DEVICES_SIMULATOR_PROFILE_HID_PROFILE_H

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "devices/simulator/profile/fault.h"
#include "devices/simulator/profile/number_range.h"
#include "platform/error.h"

namespace simulator {

// What is different about a range of reports. Several may cover one report: applied in their order.
struct ReportOverride {
    NumberRange reports = {};
    std::optional<std::size_t> length = {};     // bytes: cut short, or filled up with 0xFF
    std::optional<std::int64_t> reportID = {};  // in place of 118; its lowest byte begins the data
    bool dropped = false;  // lost on the way: its frame ID is missing from the sequence
};

// An error that the device reports in place of a report.
struct ReportError {
    std::uint64_t report = 1;
    platform::ErrorRef error = {};
};

// The I and Q samples of a report: an echo, a Gaussian pulse on a chirped carrier, whose phase turns
// from report to report, under noise that is another in every report and the same in every run.
struct ScanShape {
    double amplitude = 24000;  // counts
    double center = 19.5;      // samples from the first
    double width = 6;          // samples, standard deviation
    double frequency = 0.09;   // cycles per sample, at the center
    double chirp = 0.004;      // cycles per sample, gained with each sample
    double turn = 0.02;        // cycles per report
    double noise = 700;        // counts, at most
};

// Reports are numbered from 1 at each open. An error or an unplugging that falls on a dropped report
// comes with the next one that is not.
struct HidDeviceProfile {
    std::string product = "Kirra";
    std::int64_t usagePage = 0xFF00;
    std::int64_t usage = 0x24;

    Fault open = {};
    Fault close = {};                                   // the device is closed all the same
    std::map<std::int64_t, Fault> featureReports = {};  // by report ID
    // Sends nothing before feature reports 171 and 172 have set the active power mode and the
    // images-only streaming mode.
    bool needsFeatureReports = true;

    double reportsPerSecond = 20;                  // of device time; 0: sends none
    std::optional<std::uint64_t> maxReports = {};  // sends nothing after so many
    std::vector<ReportOverride> overrides = {};
    std::optional<ReportError> errorAtReport = {};
    // Gone for good when this report would come: its event source vanishes from the run loop.
    std::optional<std::uint64_t> unplugAtReport = {};

    std::uint32_t firstFrameId = 1;
    std::uint32_t firstTimestamp = 0;    // milliseconds
    double startTemperature = 31;        // degrees Celsius
    double temperaturePerReport = 0.01;  // degrees Celsius
    ScanShape scan = {};
};

struct HidProfile {
    bool managerAvailable = true;
    std::vector<HidDeviceProfile> devices = {};
};

// A Kirra sensor without faults between a keyboard and another vendor-defined device.
HidProfile healthyHid();

}  // namespace simulator

#endif
