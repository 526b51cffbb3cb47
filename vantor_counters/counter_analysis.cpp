#include "vantor_counters/counter_analysis.h"

#include "vantor_counters/expected_channels.h"

ZRDescription ZRVantorMeterixAnalysis::analysisDescription() const {
    return ZRDescription("Make sure all the Vantor Meterixs were measured.");
}

ZRAnalysisResultRef ZRVantorMeterixAnalysis::analyzeExperimentResult(
    const ZRExperimentResult& result, platform::ErrorSlot error) {
    auto analysis = std::make_shared<ZRAnalysisResult>();
    for (const std::string_view name : kVantorCounterChannelNames) {
        const MeasurementRef* measurement = result.measurements().find(name);
        if (measurement == nullptr) {
            return platform::fail(error, ZRErrorDomain, 6, nullptr, "Missing measurement for %@",
                                  name);
        }
        auto measured = std::make_shared<ZRMeasuredResult>(std::string(name), *measurement);
        auto limit = std::make_shared<ZRLimit>("Max Reports");
        const auto zero = std::make_shared<const Measurement>(0.0, ZRDimensionlessUnit::events());
        limit->setLowerBound(std::make_shared<const ZRBound>(zero, false));
        limit->setUpperBound(std::make_shared<const ZRBound>(zero, false));
        measured->setLimit(std::move(limit));
        analysis->measuredResults().push_back(std::move(measured));
    }
    return analysis;
}
