#include "devices/simulator/image_report.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <limits>
#include <numbers>

#include "devices/simulator/mix_bits.h"

namespace simulator {

namespace {

constexpr std::size_t kScanSamples = 48;
constexpr std::size_t kFirstScan = 16;  // offset of its I samples; its Q samples follow them
constexpr std::size_t kSecondScan = 400;
constexpr double kSecondScanDelay = 3;  // samples by which its echo comes later
constexpr std::byte kFiller{0xFF};

using Data = std::vector<std::byte>;

// The first number from `number` on that is not dropped; nothing when all are.
std::optional<std::uint64_t> afterDropped(const HidDeviceProfile& profile, std::uint64_t number) {
    for (;;) {
        const auto drop = std::find_if(profile.overrides.begin(), profile.overrides.end(),
                                       [&](const ReportOverride& change) {
                                           return change.dropped && change.reports.covers(number);
                                       });
        if (drop == profile.overrides.end()) {
            return number;
        }
        if (drop->reports.last == std::numeric_limits<std::uint64_t>::max()) {
            return std::nullopt;
        }
        number = drop->reports.last + 1;
    }
}

void put(Data& data, std::size_t offset, std::uint32_t value) {
    for (std::size_t at = 0; at < 4; ++at) {
        data[offset + at] = static_cast<std::byte>(value >> (8 * at));
    }
}

// Evenly spread over -1 to 1, always the same for the same place.
double noiseAt(std::uint64_t report, std::uint64_t place) {
    const std::uint64_t bits = mixBits(report * kSplitMixStep + place * 0xD1B54A32D192ED03U);
    return static_cast<double>(bits) / 0x1p63 - 1;
}

void putScan(
    Data& data, std::size_t offset, const ScanShape& scan, double center, std::uint64_t number) {
    const auto putSample = [&](std::size_t at, double echo) {
        const double counts = echo + scan.noise * noiseAt(number, at);
        const auto sample = platform::Number(std::round(counts)).as<std::int32_t>();
        put(data, at, static_cast<std::uint32_t>(sample));
    };
    for (std::size_t sample = 0; sample < kScanSamples; ++sample) {
        const double x = static_cast<double>(sample) - center;
        const double envelope = scan.amplitude * std::exp(-x * x / (2 * scan.width * scan.width));
        const double cycles =
            (scan.frequency + scan.chirp * x / 2) * x + scan.turn * static_cast<double>(number);
        const double phase = 2 * std::numbers::pi * cycles;
        putSample(offset + 4 * sample, envelope * std::cos(phase));
        putSample(offset + 4 * (kScanSamples + sample), envelope * std::sin(phase));
    }
}

Data imageRecord(const HidDeviceProfile& profile, std::uint64_t number) {
    const std::uint64_t before = number - 1;
    const double elapsed = 1000 * static_cast<double>(before) / profile.reportsPerSecond;
    const double temperature =
        profile.startTemperature + profile.temperaturePerReport * static_cast<double>(before);
    Data data(kImageReportSize);
    put(data, 4, profile.firstFrameId + static_cast<std::uint32_t>(before));
    put(data, 12,
        profile.firstTimestamp +
            static_cast<std::uint32_t>(platform::Number(std::round(elapsed)).as<std::uint64_t>()));
    putScan(data, kFirstScan, profile.scan, profile.scan.center, number);
    putScan(data, kSecondScan, profile.scan, profile.scan.center + kSecondScanDelay, number);
    put(data, 788, std::bit_cast<std::uint32_t>(static_cast<float>(temperature)));
    return data;
}

}  // namespace

std::optional<SensorReport> nextReport(const HidDeviceProfile& profile, std::uint64_t number) {
    const std::uint64_t first = number;
    const auto sent = afterDropped(profile, first);
    if (!sent.has_value() || *sent > profile.maxReports.value_or(*sent)) {
        return std::nullopt;
    }
    SensorReport report;
    report.number = *sent;
    if (profile.unplugAtReport.has_value() && *sent >= *profile.unplugAtReport) {
        report.unplugged = true;
        return report;
    }
    if (profile.errorAtReport.has_value() && first <= profile.errorAtReport->report &&
        profile.errorAtReport->report <= *sent) {
        report.error = profile.errorAtReport->error;
        return report;
    }
    report.data = imageRecord(profile, *sent);
    for (const ReportOverride& change : profile.overrides) {
        if (change.reports.covers(*sent)) {
            report.id = change.reportID.value_or(report.id);
            report.data.resize(change.length.value_or(report.data.size()), kFiller);
        }
    }
    if (!report.data.empty()) {
        report.data.front() = static_cast<std::byte>(report.id);
    }
    return report;
}

}  // namespace simulator
