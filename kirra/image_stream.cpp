#include "kirra/image_stream.h"

#include <algorithm>
#include <array>
#include <utility>

#include "frame/host_interface.h"
#include "platform/internal_inconsistency.h"

namespace {

// The first vendor-defined usage page, and the sensor's usage in it.
constexpr std::int32_t kUsagePage = 0xFF00;
constexpr std::int32_t kUsage = 0x24;

constexpr auto kImageReport = std::to_integer<std::int64_t>(KirraImage::kReportID);

// A feature report that configures the sensor: its ID byte, then 1; and the error when it fails.
struct FeatureReport {
    std::uint8_t reportID;
    std::int64_t code;
    platform::FormatText<> message;
};
constexpr FeatureReport kFeatureReports[] = {
    {171, 4, "Failed to override power mode to active!"},
    {172, 5, "Failed to set streaming mode to images only!"},
};

}  // namespace

bool ZRKirraImageStream::openWithRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                                         platform::ErrorSlot error) {
    constexpr std::string_view kDomain = ZRKirraImageExperimentErrorDomain;
    _runLoop = runLoop;
    const platform::Dictionary matching{{platform::kHidPrimaryUsagePage, kUsagePage},
                                        {platform::kHidPrimaryUsage, kUsage}};
    const auto manager = WLHIDManager::create();
    if (manager == nullptr) {
        throw platform::InternalInconsistency("No HID Manager available?!");
    }
    manager->enumerateDevicesMatching({matching});
    auto devices = manager->devices();
    if (devices.size() != 1) {
        return platform::fail(error, kDomain, 3, nullptr, "Kirra device match was ambiguous!");
    }
    _hidDevice = std::move(devices.front());

    platform::ErrorRef reported;
    if (!_hidDevice->open(&reported)) {
        return platform::fail(error, kDomain, 3, reported, "Could not open Kirra device.");
    }
    _hidDevice->setInputReportCallback(
        [weak = weak_from_this()](std::int64_t reportID, std::span<const std::byte> data,
                                  const platform::ErrorRef& failure) {
            if (const auto self = weak.lock()) {
                self->_processInputReportWithID(reportID, data, failure);
            }
        });
    for (const FeatureReport& report : kFeatureReports) {
        const std::array data{std::byte{report.reportID}, std::byte{1}};
        reported = nullptr;
        if (!_hidDevice->setFeatureReportWithID(report.reportID, data, &reported)) {
            return platform::fail(error, kDomain, report.code, reported, report.message);
        }
    }
    _hidDevice->scheduleWithRunLoop(runLoop, platform::kRunLoopDefaultMode);
    return true;
}

void ZRKirraImageStream::close() {
    if (_hidDevice == nullptr) {
        return;
    }
    _hidDevice->setInputReportCallback({});
    _hidDevice->unscheduleFromRunLoop(_runLoop.lock(), platform::kRunLoopDefaultMode);
    _hidDevice->close(nullptr);
}

void ZRKirraImageStream::_processInputReportWithID(std::int64_t reportID,
                                                   std::span<const std::byte> data,
                                                   const platform::ErrorRef& error) {
    const auto strongDelegate = delegate();
    if (error != nullptr) {
        close();
        if (strongDelegate != nullptr) {
            strongDelegate->streamDidError(error);
        }
        return;
    }
    if (reportID != kImageReport || data.size() < KirraImage::kSize) {
        return;
    }
    KirraImage record;
    std::copy_n(data.begin(), KirraImage::kSize, record.bytes.begin());
    ZRKirraMendraImage image(record);
    if (strongDelegate != nullptr) {
        strongDelegate->handleImage(std::move(image));
    }
}
