// The simulated HID bus: devices that are matched by their usage, and the Kirra sensor among them,
// which sends image records once it has been told to.
//
// What is wrong with a device is data: every call can fail, with or without an error object, and
// every report can be what a broken sensor would make of it.
#ifndef ZR_SIMULATOR_HID_SENSOR_H
#define ZR_SIMULATOR_HID_SENSOR_H

#include <cstddef>
#include <cstdint>
#include <limits>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/error.h"
#include "platform/welkin/hid.h"
#include "simulator/fault.h"
#include "simulator/observer.h"

namespace simulator {

// What is different about a range of reports. Several may cover one report: applied in their order.
struct ReportOverride {
    std::uint64_t firstReport = 1;
    std::uint64_t lastReport = std::numeric_limits<std::uint64_t>::max();  // the last one covered
    std::optional<std::size_t> size;       // bytes, cut off or filled up with zeros
    std::optional<std::uint8_t> reportId;  // in place of 118
    bool dropped = false;                  // lost: counted by the sensor and never delivered
};

// Reports are numbered by the sensor, from 1 each time it is opened.
struct HidDeviceProfile {
    std::string product;  // its name
    std::uint32_t usagePage = 0;
    std::uint32_t usage = 0;

    Fault open;
    Fault close;  // the device goes on then
    // By report ID: setting the feature report fails.
    std::map<std::int64_t, Fault> featureFaults;

    // Image reports. A device with a rate of 0 sends none.
    double reportsPerSecond = 0;
    bool waitsForFeatureReports = true;  // sends nothing until reports 171 and 172 have arrived
    std::vector<ReportOverride> overrides;
    std::optional<std::uint64_t> silentAfterReport;  // sends nothing after this report
    // The report in whose place the callback gets an error, and the error.
    std::optional<std::uint64_t> errorAtReport;
    platform::ErrorRef error;
    std::optional<std::uint64_t> unpluggedAtReport;  // gone from its run loop from this report on

    // What the images show.
    std::uint32_t firstFrameId = 1;
    double temperature = 31.5;  // degrees Celsius, of the first image
    double temperatureDriftPerImage = 0.02;
    double echoPosition = 20.0;  // of the echo's middle, in samples of a scan
    double echoDriftPerImage = 0.05;
    double echoAmplitude = 24000.0;  // in the samples' own unit
    double noiseAmplitude = 900.0;
};

struct HidProfile {
    bool manager = true;  // whether a HID manager can be made
    std::vector<HidDeviceProfile> devices;
};

// The usage by which the Kirra sensor is found: the first vendor-defined usage page, usage 0x24.
inline constexpr std::uint32_t kKirraUsagePage = 0xFF00;
inline constexpr std::uint32_t kKirraUsage = 0x24;

// A Kirra sensor without faults, 30 images a second, among a keyboard and a vendor's other device.
HidProfile healthyHid();

// The HID bus of such a device.
//
// A sensor's reports are made on a thread of its own at its rate times `speed` (0: as fast as they are
// taken) and wait in a bounded queue; they are delivered one a turn by a source of the run loop that
// the device is scheduled on. With the queue full the sensor waits.
//
// The observer is told each image report, after its callback returned, and each misuse: a device that
// is opened twice, a feature report to a device that is not open, a device that is scheduled before it
// was opened or twice.
std::shared_ptr<platform::HidFacility> makeHidFacility(HidProfile profile,
                                                       double speed,
                                                       std::weak_ptr<Observer> observer);

}  // namespace simulator

#endif
