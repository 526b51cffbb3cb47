#include "vantor_counters/counter_analysis.h"

#include "vantor_counters/expected_channels.h"
#include "vantor_counters/limited_results.h"

ZRDescription ZRVantorMeterixAnalysis::analysisDescription() const {
    return ZRDescription("Make sure all the Vantor Meterixs were measured.");
}

ZRAnalysisResultRef ZRVantorMeterixAnalysis::analyzeExperimentResult(
    const ZRExperimentResult& result, platform::ErrorSlot error) {
    auto analysis = std::make_shared<ZRAnalysisResult>();
    analysis->measuredResults().reserve(kVantorCounterChannelNames.size());
    LimitedResults limited(kVantorCounterChannelNames.size());
    for (const std::string_view name : kVantorCounterChannelNames) {
        const MeasurementRef* measurement = result.measurements().find(name);
        if (measurement == nullptr) {
            return platform::fail(error, ZRErrorDomain, 6, nullptr, "Missing measurement for %@",
                                  name);
        }
        const MeasurementRef zero = limited.value(0.0, ZRDimensionlessUnit::events());
        analysis->measuredResults().push_back(limited.result(name, *measurement, "Max Reports",
                                                             limited.closedBound(zero),
                                                             limited.closedBound(zero)));
    }
    return analysis;
}
