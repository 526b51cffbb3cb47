// The last phase of a run: what was recorded, as measurements.
#include "vantor_counters/counter_report.h"
#include "vantor_fault/fault_experiment.h"

namespace {

// The measurements that the stream's error counters become, and the counters' keys.
constexpr struct {
    std::string_view name;
    std::string_view key;
} kErrorMeasurements[] = {
    {"I2C", kRylCaptureStreamPropertyValue_I2CErrorCount},
    {"MIPI", kRylCaptureStreamPropertyValue_MIPIErrorCount},
    {"LPDP", "LPDPErrorCount"},
    {"UART", "UARTErrorCount"},
    {"SIF", "SIFErrorCount"},
    {"Projector", "ProjectorErrorCount"},
};

}  // namespace

// Counter channels come last: one that is named like a fixed measurement replaces it.
ZRExperimentResultRef ZRVantorFaultExperiment::_buildResult() const {
    auto result = std::make_shared<ZRExperimentResult>();
    const auto put = [&](std::string_view name, double value, const ZRDimensionlessUnit& unit) {
        result->measurements().set(name, std::make_shared<const Measurement>(value, unit));
    };
    put("FrameCount", static_cast<double>(_frameCount.load()), ZRDimensionlessUnit::frames());
    if (_errorCounters.has_value()) {
        for (const auto& [name, key] : kErrorMeasurements) {
            put(name, _errorCounters->number(key).asDouble(), ZRDimensionlessUnit::errors());
        }
    }
    storeMeasurements(_meterixDelta.samples(), *result);
    return result;
}
