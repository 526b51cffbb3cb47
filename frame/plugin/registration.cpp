// The module's only entry point: when the module is loaded, announces to the host's lab every
// experiment, analysis and diagnostic that it offers. The lab owns the factories from then on.
#include "frame/host_interface.h"
#include "kirra/image_experiment.h"
#include "vantor_counters/counter_analysis.h"
#include "vantor_counters/counter_experiment.h"
#include "vantor_fault/fault_analysis.h"
#include "vantor_fault/fault_experiment.h"

namespace {

template <class Experiment>
std::shared_ptr<ZRExperiment> makeExperiment() {
    return std::make_shared<Experiment>();
}

template <class Analysis>
std::shared_ptr<ZRAnalysis> makeAnalysis() {
    return std::make_shared<Analysis>();
}

// A row holds what it registers; a row with a summary is a diagnostic of the two that it names.
struct Row {
    std::string_view name;
    std::shared_ptr<ZRExperiment> (*experiment)() = nullptr;
    std::shared_ptr<ZRAnalysis> (*analysis)() = nullptr;
    std::string_view summary = {};
    std::string_view experimentName = {};
    std::string_view analysisName = {};
};

constexpr std::string_view kMeterixExperiment = "VantorMeterixExperiment";
constexpr std::string_view kMeterixAnalysis = "VantorMeterixAnalysis";
constexpr std::string_view kFaultExperiment = "VantorFaultExperiment";
constexpr std::string_view kFaultAnalysis = "VantorFaultAnalysis";

// In the order of registration: a diagnostic after the two that it names.
constexpr Row kRows[] = {
    {.name = kMeterixExperiment, .experiment = makeExperiment<ZRVantorMeterixExperiment>},
    {.name = kMeterixAnalysis, .analysis = makeAnalysis<ZRVantorMeterixAnalysis>},
    {.name = "VantorMeterixDiagnostic",
     .summary = "Measure the important Vantor Meterixs and ensure they are all present.",
     .experimentName = kMeterixExperiment,
     .analysisName = kMeterixAnalysis},
    {.name = kFaultExperiment, .experiment = makeExperiment<ZRVantorFaultExperiment>},
    {.name = kFaultAnalysis, .analysis = makeAnalysis<ZRVantorFaultAnalysis>},
    {.name = "VantorFaultDiagnostic",
     .summary = "Perform a 30fps Dense-Intereleaved stream and capture Q71ISP Meterix delta.",
     .experimentName = kFaultExperiment,
     .analysisName = kFaultAnalysis},
    {.name = "KirraImageExperiment", .experiment = makeExperiment<ZRKirraImageExperiment>},
};

// Runs once, when the loader maps the module.
[[gnu::constructor]] void registerWithLab() {
    for (const Row& row : kRows) {
        if (row.experiment != nullptr) {
            ZRLab::defaultLab().addExperimentWithName(row.name, row.experiment);
        } else if (row.analysis != nullptr) {
            ZRLab::defaultLab().addAnalysisWithName(row.name, row.analysis);
        } else {
            ZRLab::defaultLab().addDiagnosticWithName(row.name, row.summary, row.experimentName,
                                                      row.analysisName);
        }
    }
}

}  // namespace
