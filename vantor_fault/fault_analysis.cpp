#include "vantor_fault/fault_analysis.h"

#include <iterator>

#include "vantor_counters/expected_channels.h"
#include "vantor_counters/limited_results.h"

namespace {

using Measurements = platform::StringMap<MeasurementRef>;

constexpr std::string_view kFrameCount = "FrameCount";

constexpr struct {
    std::string_view key;
    std::string_view resultName;
} kErrorCounts[] = {{"I2C", "I2C Errors"}, {"MIPI", "MIPI Errors"}, {"SIF", "SIF Errors"}};

// The measurement under `key`, judged as `resultName` and limited to exactly 0.
ZRMeasuredResultRef zeroLimitMeasuredResult(LimitedResults& limited,
                                            const Measurements& measurements,
                                            const platform::StringKey& key,
                                            std::string_view resultName,
                                            const ZRDimensionlessUnit& unit,
                                            platform::ErrorSlot error) {
    const MeasurementRef* measurement = measurements.find(key);
    if (measurement == nullptr) {
        return platform::fail(error, ZRErrorDomain, 6, nullptr, "Missing measurement named %@!",
                              key.text());
    }
    const ZRBoundRef zero = limited.closedBound(limited.value(0.0, unit));
    return limited.result(resultName, *measurement, "Limit", zero, zero);
}

}  // namespace

ZRDescription ZRVantorFaultAnalysis::analysisDescription() const {
    auto description = ZRDescription::descriptionWithSummary(
        "Analyse the results of a Vantor Stream with Meterix capture.");
    description.addParameter(
        ZRNumberParameter("The minimum number of frames required in this analysis.", true),
        "frameCount");
    return description;
}

bool ZRVantorFaultAnalysis::setupWithParameters(const platform::Dictionary& parameters,
                                                ZRDiagnosticHost* /*host*/,
                                                platform::ErrorSlot /*error*/) {
    _frameCount = parameters.number("frameCount");
    return true;
}

ZRAnalysisResultRef ZRVantorFaultAnalysis::analyzeExperimentResult(const ZRExperimentResult& result,
                                                                   platform::ErrorSlot error) {
    const Measurements& measurements = result.measurements();
    constexpr std::size_t kResults =
        kVantorCounterChannelNames.size() + 1 + std::size(kErrorCounts);
    LimitedResults limited(kResults);
    auto analysis = std::make_shared<ZRAnalysisResult>();
    auto& measuredResults = analysis->measuredResults();
    measuredResults.reserve(kResults);

    for (const std::string_view name : kVantorCounterChannelNames) {
        const platform::StringKey key(name);
        if (!measurements.contains(key)) {
            return platform::fail(error, ZRErrorDomain, 6, nullptr, "Missing measurement for %@",
                                  name);
        }
        measuredResults.push_back(zeroLimitMeasuredResult(limited, measurements, key, name,
                                                          ZRDimensionlessUnit::events(), error));
    }

    const MeasurementRef* frames = measurements.find(kFrameCount);
    if (frames == nullptr) {
        return platform::fail(error, ZRErrorDomain, 6, nullptr, "Missing %@ measurement!",
                              kFrameCount);
    }
    measuredResults.push_back(limited.result(
        "Actual Frames", *frames, "Min Frame Count",
        limited.closedBound(limited.value(_frameCount.asDouble(), ZRDimensionlessUnit::frames())),
        nullptr));

    for (const auto& [key, resultName] : kErrorCounts) {
        auto measured = zeroLimitMeasuredResult(limited, measurements, key, resultName,
                                                ZRDimensionlessUnit::errors(), error);
        if (measured == nullptr) {
            return nullptr;
        }
        measuredResults.push_back(std::move(measured));
    }
    return analysis;
}
