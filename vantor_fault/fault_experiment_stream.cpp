// The second phase of a run: streams, receives and validates frames, and stops once.
#include <chrono>

#include "frame/shared_helpers.h"
#include "platform/number.h"
#include "vantor_counters/counter_report.h"
#include "vantor_fault/fault_experiment.h"
#include "vantor_fault/frame_description.h"

using platform::LogLevel;

namespace {

std::chrono::nanoseconds delayOf(double seconds) {
    return std::chrono::nanoseconds(platform::Number(seconds * 1e9).as<std::int64_t>());
}

// The two light sources that count as the projector's.
bool isLit(const ZRVantorFrameDescription& description) {
    const auto source = description.infraredLightSource().as<std::int32_t>();
    return source == 1 || source == 2;
}

}  // namespace

ZRExperimentResultRef ZRVantorFaultExperiment::run(platform::ErrorSlot error) {
    const auto self = shared_from_this();  // what the time-out will own
    platform::ErrorRef reported;
    if (!_selectStream(reported, error) || !_configureStream(reported, error)) {
        return nullptr;
    }

    // Asking an absent report or snapshot for anything yields absence: one check an end suffices.
    const WLMeterix report =
        WLMeterix::reportWithOnlySimpleChannels(&reported).reportByFilteringChannels(
            isISPEventSubgroup);
    const WLMeterixSnapshot baseline = report.snapshot(&reported);
    if (!baseline) {
        return platform::fail(error, ZRMeterixErrorDomain, 100, reported,
                              "Cannot get Meterix before streaming.");
    }
    if (!_stream->start(&reported)) {
        return platform::fail(error, ZRCapturePlugInErrorDomain, 204, reported,
                              "Failed to start streaming zorvel.");
    }
    // Never cancelled: a time-out that comes after the stop finds nothing to do.
    _processingQueue.after(delayOf(_timeout), [self] {
        ZRLogHandle().write(LogLevel::Error, [] { return "Timeout has been reached."; });
        self->_stopWithError(nullptr);
    });

    _done_semaphore.acquire();
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

void ZRVantorFaultExperiment::_handlePixelBuffer(platform::ImageBufferRef buffer,
                                                 platform::MediaTime withTimeStamp) {
    _receivingQueue.async(
        [weak = weak_from_this(), buffer = std::move(buffer), withTimeStamp]() mutable {
            if (const auto self = weak.lock()) {
                self->_receiveFrame(std::move(buffer), withTimeStamp);
            }
        });
}

void ZRVantorFaultExperiment::_handleEvent(std::int32_t event,
                                           platform::MediaTime withTimeStamp,
                                           std::int64_t /*info*/) {
    _receivingQueue.async([event, withTimeStamp] {
        ZRLogHandle().write(LogLevel::Debug, [&] {
            return platform::format("Processing event %d at %lf.", event, withTimeStamp.seconds());
        });
    });
}

void ZRVantorFaultExperiment::_receiveFrame(platform::ImageBufferRef buffer,
                                            platform::MediaTime time) {
    if (_stop.load()) {
        ZRLogHandle().write(LogLevel::Default, [&] {
            return platform::format("Received frame that won't be counted at time: %@",
                                    time.seconds());
        });
        return;
    }
    const std::uint64_t ordinal = ++_frameCount;
    ZRLogHandle().write(LogLevel::Debug,
                        [&] { return platform::format("Received frame %@.", ordinal); });

    const platform::Value& attachment =
        buffer->attachment(kRylCaptureSampleBufferAttachmentKey_MetadataDictionary);
    if (!attachment.isPresent()) {
        _stopWithError(ZRMakeError(ZRCapturePlugInErrorDomain, 206, "Frame metadata is missing!"));
        return;
    }
    const platform::Dictionary* metadata = attachment.dictionary();
    if (metadata == nullptr) {
        _stopWithError(
            ZRMakeError(ZRCapturePlugInErrorDomain, 206, "Frame metadata is not a dictionary!"));
        return;
    }
    std::shared_ptr<const ZRVantorFrameDescription> description =
        ZRVantorFrameDescription::descriptionWithMonotonicCount(ordinal, time, *metadata);
    if (description == nullptr) {
        _stopWithError(ZRMakeError(ZRCapturePlugInErrorDomain, 206,
                                   "Could not create a frame description of frame %lu!", ordinal));
        return;
    }
    buffer.reset();
    _processingQueue.async([self = shared_from_this(), description = std::move(description),
                            ordinal] { self->_processFrame(*description, ordinal); });
}

void ZRVantorFaultExperiment::_processFrame(const ZRVantorFrameDescription& description,
                                            std::uint64_t ordinal) {
    const std::uint64_t count = description.monotonicCount();
    ZRLogHandle().write(LogLevel::Debug,
                        [&] { return platform::format("Processing frame %lu.", count); });
    if (!isLit(description)) {
        auto error = description.safetyDisabledProjection()
                         ? ZRMakeError(ZRCapturePlugInErrorDomain, 213,
                                       "Frame %@ is not illuminated for safety reason!", count)
                         : ZRMakeError(ZRCapturePlugInErrorDomain, 206,
                                       "Frame %@ is not illuminated for unknown reason!", count);
        ZRLogHandle().write(LogLevel::Debug, [&] {
            return platform::format("%@\n%@", ZRVantorFrameDescription::csvRepresentationHeader(),
                                    description.csvRepresentation());
        });
        ZRLogHandle().write(LogLevel::Error, [&] {
            return platform::format("Frame %@ failed projection validation.", ordinal);
        });
        _stopWithError(std::move(error));
        return;
    }
    if (ordinal < _stopCount) {
        return;
    }
    ZRLogHandle().write(LogLevel::Debug,
                        [&] { return platform::format("Frame %@ is the last frame.", ordinal); });
    _stopWithError(nullptr);
}

void ZRVantorFaultExperiment::_stopWithError(platform::ErrorRef error) {
    const platform::MutexLock lock(_stopMutex);
    if (_stop.exchange(true)) {
        return;
    }
    const platform::Value counters =
        _stream->valueForProperty(kRylCaptureStreamProperty_ErrorCounters, nullptr);
    const bool stopped = _stream->stop(nullptr);

    if (error != nullptr) {
        ZRLogHandle().write(LogLevel::Debug, [] {
            return "We are stopping because there was an error. If stopping the stream fails, it "
                   "will be ignored.";
        });
        _error = std::move(error);
    } else if (!stopped) {
        ZRLogHandle().write(LogLevel::Debug,
                            [] { return "There was an error stopping the stream."; });
        _error = ZRMakeError(ZRCapturePlugInErrorDomain, 205, "Failed to stop stream!");
    } else if (counters.dictionary() != nullptr) {
        _errorCounters = *counters.dictionary();
    } else {
        _error = ZRMakeError(ZRCapturePlugInErrorDomain, 210,
                             "Failed to get error counters from zorvel.");
    }
    _done_semaphore.release();
}
