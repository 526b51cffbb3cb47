// What is wrong with a device of the gallery is what a run of it meets: every error, every limit that
// is not met, every device that passes all the same.
#include <exception>
#include <fstream>
#include <memory>
#include <ostream>
#include <string>
#include <tuple>
#include <vector>

#include <gmock/gmock.h>
#include <nlohmann/json.hpp>

#include "kirra/image_experiment.h"
#include "platform/run_loop.h"
#include "platform/services.h"
#include "simulator/device.h"
#include "simulator/profile_reader.h"
#include "vantor_counters/counter_analysis.h"
#include "vantor_counters/counter_experiment.h"
#include "vantor_fault/fault_analysis.h"
#include "vantor_fault/fault_experiment.h"

namespace {

constexpr const char* kCounters = "VantorMeterixDiagnostic";
constexpr const char* kFault = "VantorFaultDiagnostic";
constexpr const char* kImages = "KirraImageExperiment";
constexpr double kGenerous = 60;  // seconds, for what is not meant to time out

struct Row {
    const char* run;
    const char* device;
    const char*
        outcome;  // an error's code, message and causes; or the results outside their limits
    double timeout = kGenerous;
};

void PrintTo(const Row& row, std::ostream* out) {
    *out << row.run << " on " << row.device;
}

// Of everything that does not pass.
const Row kRows[] = {
    {kCounters, "counter-missing", "6 Missing measurement for Number MB EN_PIN_STATE"},
    {kCounters, "counter-stuck", "outside: Number Xel INT_FAULT_CC"},
    {kCounters, "counter-without-count", "100 Could not get the count of Number YB FAULT_NVM."},
    {kCounters, "counters-unavailable",
     "100 Could not get simple channels. < MeterixErrorDomain -536870206"},
    {kCounters, "counters-unsampled", "100 Could not sample the report."},

    {kFault, "auto-exposure-refused", "211 Failed to diable AE."},
    {kFault, "control-refused", "203 Failed to request the zorvel stream! < RylErrorDomain -12785"},
    {kFault, "counter-missing", "6 Missing measurement for Number MB EN_PIN_STATE"},
    {kFault, "counter-rises", "outside: Number Xel INT_FAULT_SHORTANODE_LATCH"},
    {kFault, "counter-rises-steadily", "outside: Number Qorn NTC"},
    {kFault, "counter-subgroup-renamed", "6 Missing measurement for Number Fesk NTC"},
    {kFault, "counters-lost-after-streaming",
     "100 Cannot get Meterix delta after streaming. < MeterixErrorDomain -536870195"},
    {kFault, "counters-unavailable",
     "100 Cannot get Meterix before streaming. < MeterixErrorDomain -536870206"},
    {kFault, "counters-unsampled", "100 Cannot get Meterix before streaming."},
    {kFault, "counters-without-difference", "100 Cannot get Meterix delta after streaming."},
    {kFault, "error-counters-unreadable", "210 Failed to get error counters from zorvel."},
    {kFault, "format-index-refused", "209 Failed to set format index 0. < RylErrorDomain -12783"},
    {kFault, "frames-stall", "outside: Actual Frames", 1},
    {kFault, "handlers-refused", "208 Failed to set callback handlers. < RylErrorDomain -12787"},
    {kFault, "i2c-errors", "outside: I2C Errors"},
    {kFault, "infrared-stream-missing", "202 Failed to find stream!"},
    {kFault, "invalidate-fails",
     "200 Failed to invalidate the capture device. < RylErrorDomain -12792"},
    {kFault, "light-source-refused",
     "212 Failed to configure structured light! < RylErrorDomain -12790 < I2CErrorDomain -5"},
    {kFault, "light-source-unknown", "206 Frame 10 is not illuminated for unknown reason!"},
    {kFault, "maximum-frame-rate-refused",
     "207 Failed to set max frame rate. < RylErrorDomain -12784"},
    {kFault, "metadata-key-missing", "206 Could not create a frame description of frame 12!"},
    {kFault, "metadata-missing", "206 Frame metadata is missing!"},
    {kFault, "metadata-no-dictionary", "206 Frame metadata is not a dictionary!"},
    {kFault, "metadata-wrong-kind", "206 Could not create a frame description of frame 12!"},
    {kFault, "minimum-frame-rate-refused", "207 Failed to set min frame rate."},
    {kFault, "mipi-errors", "outside: MIPI Errors"},
    {kFault, "module-overheats", "213 Frame 18 is not illuminated for safety reason!"},
    {kFault, "multiple-outputs-refused", "208 Failed to enable multiple outputs."},
    {kFault, "no-capture-device",
     "200 Failed to get the capture plugin! < RylErrorDomain -12780 < FirmwareErrorDomain 3"},
    {kFault, "no-capture-plug-in", "200 Failed to get the capture plugin!"},
    {kFault, "no-frames", "outside: Actual Frames", 1},
    {kFault, "no-stream-list", "202 Failed to get streams!"},
    {kFault, "no-streams", "202 Failed to find stream!"},
    {kFault, "output-configuration-refused", "208 Failed to configure primary scalar."},
    {kFault, "outputs-enabled-refused",
     "208 Failed to enable primary scalar. < RylErrorDomain -12786"},
    {kFault, "port-type-unreadable", "202 Failed to find stream!"},
    {kFault, "sif-errors", "outside: SIF Errors"},
    {kFault, "start-fails",
     "204 Failed to start streaming zorvel. < RylErrorDomain -12791 < ProjectorErrorDomain 17 < "
     "I2CErrorDomain -5"},
    {kFault, "stop-fails", "205 Failed to stop stream!"},
    {kFault, "unlit-for-safety", "213 Frame 10 is not illuminated for safety reason!"},
    {kFault, "unlit-frame", "206 Frame 10 is not illuminated for unknown reason!"},

    {kImages, "display-missing",
     "2 Could not get the main display to determine device power state."},
    {kImages, "display-off", "2 The display is not powered."},
    {kImages, "display-without-power-info", "2 Could not find the display power state."},
    {kImages, "display-without-power-state", "2 Could not find the display power state."},
    {kImages, "display-without-property", "2 Could not find the display power state."},
    {kImages, "display-without-registry",
     "2 Could not get the frame buffer to determine device power state."},
    {kImages, "no-hid-manager", "exception: No HID Manager available?!"},
    {kImages, "sensor-error-midstream", "-536870186 The laser's current is out of range"},
    {kImages, "sensor-missing", "3 Kirra device match was ambiguous!"},
    {kImages, "sensor-mode-refused", "5 Failed to set streaming mode to images only!"},
    {kImages, "sensor-open-refused", "3 Could not open Kirra device. < HIDErrorDomain -536870203"},
    {kImages, "sensor-other-reports", "6 Timed out after 1 seconds.", 1},
    {kImages, "sensor-power-refused",
     "4 Failed to override power mode to active! < HIDErrorDomain -536870201 < USBErrorDomain 32"},
    {kImages, "sensor-short-reports", "6 Timed out after 1 seconds.", 1},
    {kImages, "sensor-silent", "6 Timed out after 1 seconds.", 1},
    {kImages, "sensor-stalls", "6 Timed out after 1 seconds.", 1},
    {kImages, "sensor-twice", "3 Kirra device match was ambiguous!"},
};

std::string textOf(const platform::ErrorRef& error) {
    if (error == nullptr) {
        return "failed without an error";
    }
    std::string text = std::to_string(error->code()) + " " + error->localizedDescription();
    for (auto cause = error->underlyingError(); cause != nullptr;
         cause = cause->underlyingError()) {
        text += " < " + cause->domain() + " " + std::to_string(cause->code());
    }
    return text;
}

// What a host does with an experiment and, if there is one, its analysis; the first thing that goes
// wrong, or "passed".
std::string outcomeOf(ZRExperiment& experiment, ZRAnalysis* analysis, double timeout) {
    const platform::Dictionary parameters{{"frameCount", 30}, {"images", 5}, {"timeout", timeout}};
    platform::ErrorRef error;
    const auto setUp = [&](auto* instance) {
        auto* setup = dynamic_cast<ZRSetup*>(instance);
        return setup == nullptr || setup->setupWithParameters(parameters, nullptr, &error);
    };
    if (!setUp(&experiment)) {
        return textOf(error);
    }
    ZRExperimentResultRef result;
    try {
        result = experiment.run(&error);
    } catch (const std::exception& exception) {
        return std::string("exception: ") + exception.what();
    }
    if (result == nullptr) {
        return textOf(error);
    }
    auto* teardown = dynamic_cast<ZRTeardown*>(&experiment);
    if (teardown != nullptr && !teardown->teardown(&error)) {
        return textOf(error);
    }
    if (analysis == nullptr) {
        return "passed";
    }
    const auto judged =
        setUp(analysis) ? analysis->analyzeExperimentResult(*result, &error) : nullptr;
    if (judged == nullptr) {
        return textOf(error);
    }
    std::string outside;
    for (const ZRMeasuredResultRef& one : judged->measuredResults()) {
        const double value = one->measurement()->doubleValue();
        const auto& upper = one->limit()->upperBound();
        if (value < one->limit()->lowerBound()->value()->doubleValue() ||
            (upper != nullptr && value > upper->value()->doubleValue())) {
            outside += (outside.empty() ? "outside: " : ", ") + one->name();
        }
    }
    return outside.empty() ? "passed" : outside;
}

std::string outcomeOf(const std::string& run, const std::string& device, double timeout) {
    std::string problem;
    const auto profile = simulator::loadProfile(device, problem);
    if (!profile.has_value()) {
        return problem;
    }
    platform::installServices(simulator::makeDevice(*profile, 0, {}));
    platform::RunLoop::forThisThread();
    if (run == kCounters) {
        ZRVantorMeterixAnalysis analysis;
        return outcomeOf(*std::make_shared<ZRVantorMeterixExperiment>(), &analysis, timeout);
    }
    if (run == kFault) {
        ZRVantorFaultAnalysis analysis;
        return outcomeOf(*std::make_shared<ZRVantorFaultExperiment>(), &analysis, timeout);
    }
    return outcomeOf(*std::make_shared<ZRKirraImageExperiment>(), nullptr, timeout);
}

class GalleryFault : public testing::TestWithParam<Row> {
  protected:
    ~GalleryFault() override { platform::installServices({}); }
};

TEST_P(GalleryFault, IsWhatTheRunMeets) {
    const Row& row = GetParam();
    EXPECT_EQ(outcomeOf(row.run, row.device, row.timeout), row.outcome);
}

INSTANTIATE_TEST_SUITE_P(Rows, GalleryFault, testing::ValuesIn(kRows), [](const auto& info) {
    std::string name = std::string(info.param.run) + "_" + info.param.device;
    for (char& character : name) {
        character = character == '-' ? '_' : character;
    }
    return name;
});

// The table holds every run that is expected not to pass, with the verdict that follows from its
// outcome, and every other run passes.
TEST(Gallery, MeetsTheExpectedVerdicts) {
    std::ifstream file(ZR_PROFILES "/expected-verdicts.json");
    const auto expected = nlohmann::json::parse(file);
    std::vector<std::tuple<std::string, std::string, std::string>> listed;
    std::vector<std::tuple<std::string, std::string, std::string>> wanted;
    for (const Row& row : kRows) {
        const bool outside = std::string(row.outcome).starts_with("outside: ");
        listed.emplace_back(row.run, row.device, outside ? "FAIL" : "ERROR");
    }
    for (const auto& [device, runs] : expected.items()) {
        for (const auto& [run, verdict] : runs.items()) {
            if (verdict != "PASS") {
                wanted.emplace_back(run, device, verdict);
            } else {
                EXPECT_EQ(outcomeOf(run, device, kGenerous), "passed") << run << " on " << device;
            }
        }
    }
    EXPECT_THAT(listed, testing::UnorderedElementsAreArray(wanted));
    platform::installServices({});
}

}  // namespace
