#include "vantor_fault/fault_analysis.h"

#include "vantor_counters/expected_channels.h"

namespace {

using Measurements = platform::StringMap<MeasurementRef>;

constexpr std::string_view kFrameCount = "FrameCount";

constexpr struct {
    std::string_view key;
    std::string_view resultName;
} kErrorCounts[] = {{"I2C", "I2C Errors"}, {"MIPI", "MIPI Errors"}, {"SIF", "SIF Errors"}};

ZRBoundRef closedBound(double value, const ZRDimensionlessUnit& unit) {
    return std::make_shared<const ZRBound>(std::make_shared<const Measurement>(value, unit), false);
}

// The measurement under `key`, judged as `resultName` and limited to exactly 0.
ZRMeasuredResultRef zeroLimitMeasuredResult(const Measurements& measurements,
                                            std::string_view key,
                                            std::string_view resultName,
                                            const ZRDimensionlessUnit& unit,
                                            platform::ErrorSlot error) {
    const MeasurementRef* measurement = measurements.find(key);
    if (measurement == nullptr) {
        return platform::fail(error, ZRErrorDomain, 6, nullptr, "Missing measurement named %@!",
                              key);
    }
    const ZRBoundRef zero = closedBound(0.0, unit);
    auto limit = std::make_shared<ZRLimit>("Limit");
    limit->setLowerBound(zero);
    limit->setUpperBound(zero);
    auto measured = std::make_shared<ZRMeasuredResult>(std::string(resultName), *measurement);
    measured->setLimit(std::move(limit));
    return measured;
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
    auto analysis = std::make_shared<ZRAnalysisResult>();
    auto& measuredResults = analysis->measuredResults();

    for (const std::string_view name : kVantorCounterChannelNames) {
        if (!measurements.contains(name)) {
            return platform::fail(error, ZRErrorDomain, 6, nullptr, "Missing measurement for %@",
                                  name);
        }
        measuredResults.push_back(zeroLimitMeasuredResult(measurements, name, name,
                                                          ZRDimensionlessUnit::events(), error));
    }

    const MeasurementRef* frames = measurements.find(kFrameCount);
    if (frames == nullptr) {
        return platform::fail(error, ZRErrorDomain, 6, nullptr, "Missing %@ measurement!",
                              kFrameCount);
    }
    auto actualFrames = std::make_shared<ZRMeasuredResult>("Actual Frames", *frames);
    auto minimum = std::make_shared<ZRLimit>("Min Frame Count");
    minimum->setLowerBound(closedBound(_frameCount.asDouble(), ZRDimensionlessUnit::frames()));
    actualFrames->setLimit(std::move(minimum));
    measuredResults.push_back(std::move(actualFrames));

    for (const auto& [key, resultName] : kErrorCounts) {
        auto measured = zeroLimitMeasuredResult(measurements, key, resultName,
                                                ZRDimensionlessUnit::errors(), error);
        if (measured == nullptr) {
            return nullptr;
        }
        measuredResults.push_back(std::move(measured));
    }
    return analysis;
}
