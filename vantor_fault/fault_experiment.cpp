// The experiment as the host drives it: setup, the whole of a run, teardown.
#include "vantor_fault/fault_experiment.h"

#include <chrono>

#include "frame/shared_helpers.h"
#include "vantor_counters/counter_report.h"

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

ZRExperimentResultRef ZRVantorFaultExperiment::run(platform::ErrorSlot error) {
    const auto self = shared_from_this();  // what the time-out will own
    platform::ErrorRef reported;
    if (!_selectStream(reported, error) || !_configureStream(reported, error)) {
        return nullptr;
    }

    // Asking an absent report or snapshot for anything yields absence: one check at the end suffices.
    const WLMeterix report =
        WLMeterix::reportWithOnlySimpleChannels(&reported).reportByFilteringChannels(
            isISPEventSubgroup);
    const WLMeterixSnapshot baseline = report.snapshot(&reported);
    if (!baseline) {
        return platform::fail(error, ZRMeterixErrorDomain, 100, reported,
                              "Cannot get Meterix before streaming.");
    }
    {
        // Taken before the start and until the stop is recorded, so that no item can lack a thread.
        const platform::WorkQueue::Hold receiving(_receivingQueue);
        const platform::WorkQueue::Hold processing(_processingQueue);
        if (!_stream->start(&reported)) {
            return platform::fail(error, ZRCapturePlugInErrorDomain, 204, reported,
                                  "Failed to start streaming zorvel.");
        }
        // Never cancelled: a time-out that comes after the stop finds nothing to do.
        _processingQueue.after(std::chrono::duration<double>(_timeout), [self] {
            ZRLogHandle().write(platform::LogLevel::Error,
                                [] { return "Timeout has been reached."; });
            self->_stopWithError(nullptr);
        });
        _done_semaphore.acquire();
    }
    if (_error != nullptr) {
        return platform::failWith(error, _error);
    }
    _meterixDelta = report.snapshot(&reported).snapshotWithBaseline(baseline, &reported);
    if (!_meterixDelta) {
        return platform::fail(error, ZRMeterixErrorDomain, 100, reported,
                              "Cannot get Meterix delta after streaming.");
    }
    return _buildResult();
}

bool ZRVantorFaultExperiment::teardown(platform::ErrorSlot error) {
    platform::ErrorRef reported;
    if (_device != nullptr && _device->invalidate(&reported)) {
        return true;
    }
    return platform::fail(error, ZRCapturePlugInErrorDomain, 200, reported,
                          "Failed to invalidate the capture device.");
}
