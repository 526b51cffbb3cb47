#include "vantor_fault/fault_experiment.h"

namespace {

constexpr std::string_view kFrameCount = "frameCount";
constexpr std::string_view kTimeout = "timeout";

platform::Failure failNegative(platform::ErrorSlot error, std::string_view parameter) {
    return platform::fail(error, ZRErrorDomain, 5, nullptr, "%@ cannot be negative!", parameter);
}

}  // namespace

ZRVantorFaultExperiment::ZRVantorFaultExperiment()
    : ZRVantorFaultExperiment(kRylCapturePortType_FrontFacingInfraredCamera) {}

ZRVantorFaultExperiment::ZRVantorFaultExperiment(std::string_view capturePort)
    : _port(capturePort)
    , _receivingQueue("ZRVantorFaultExperiment.primaryScalar",
                      platform::WorkQueue::Priority::UserInteractive)
    , _processingQueue("ZRVantorFaultExperiment", platform::WorkQueue::Priority::Background) {}

ZRDescription ZRVantorFaultExperiment::experimentDescription() const {
    auto description = ZRDescription::descriptionWithSummary(
        "Stream the vantor camera in dense interleave for the requested duration.");
    description.addParameter(ZRNumberParameter("The number of frames to capture.", true),
                             std::string(kFrameCount));
    description.addParameter(
        ZRNumberParameter(platform::format("The max time to wait for %@, in seconds.", kFrameCount),
                          true),
        std::string(kTimeout));
    return description;
}

bool ZRVantorFaultExperiment::setupWithParameters(const platform::Dictionary& parameters,
                                                  ZRDiagnosticHost* /*host*/,
                                                  platform::ErrorSlot error) {
    const platform::Number frameCount = parameters.number(kFrameCount);
    if (frameCount.as<std::int64_t>() < 0) {
        return failNegative(error, kFrameCount);
    }
    _stopCount = frameCount.as<std::uint64_t>();

    const double timeout = parameters.number(kTimeout).asDouble();
    if (timeout < 0.0) {
        return failNegative(error, kTimeout);
    }
    _timeout = timeout;
    return true;
}

bool ZRVantorFaultExperiment::teardown(platform::ErrorSlot error) {
    platform::ErrorRef reported;
    if (_device != nullptr && _device->invalidate(&reported)) {
        return true;
    }
    return platform::fail(error, ZRCapturePlugInErrorDomain, 200, reported,
                          "Failed to invalidate the capture device.");
}
