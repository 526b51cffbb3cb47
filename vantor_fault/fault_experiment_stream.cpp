// The middle of a run: receives and validates frames, and stops once.
#include <system_error>
#include <utility>

#include "frame/shared_helpers.h"
#include "vantor_fault/fault_experiment.h"
#include "vantor_fault/frame_description.h"

using platform::LogLevel;

namespace {

// Queues an item, or drops it when there is no thread to run it: handlers and items must not throw. That
// happens only after the stop, when the queues are not held any more and the item would change nothing.
// The exhaustion of memory ends the process: a frame that is lost would falsify the result.
template <class Item>
void queueOrDrop(platform::WorkQueue& queue, Item item) noexcept {
    try {
        queue.async(std::move(item));
    } catch (const std::system_error&) {
    }
}

// The two light sources that count as the projector's.
bool isLit(const ZRVantorFrameDescription& description) {
    const auto source = description.infraredLightSource().as<std::int32_t>();
    return source == 1 || source == 2;
}

}  // namespace

void ZRVantorFaultExperiment::_handlePixelBuffer(platform::ImageBufferRef buffer,
                                                 platform::MediaTime withTimeStamp) {
    queueOrDrop(_receivingQueue,
                [weak = weak_from_this(), buffer = std::move(buffer), withTimeStamp]() mutable {
                    if (const auto self = weak.lock()) {
                        self->_receiveFrame(std::move(buffer), withTimeStamp);
                    }
                });
}

void ZRVantorFaultExperiment::_handleEvent(std::int32_t event,
                                           platform::MediaTime withTimeStamp,
                                           std::int64_t /*info*/) {
    queueOrDrop(_receivingQueue, [event, withTimeStamp] {
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

    const platform::Value* attachment =
        buffer != nullptr
            ? &buffer->attachment(kRylCaptureSampleBufferAttachmentKey_MetadataDictionary)
            : nullptr;
    if (attachment == nullptr || !attachment->isPresent()) {
        _stopWithError(ZRMakeError(ZRCapturePlugInErrorDomain, 206, "Frame metadata is missing!"));
        return;
    }
    const platform::Dictionary* metadata = attachment->dictionary();
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
    queueOrDrop(_processingQueue, [self = shared_from_this(), description = std::move(description),
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
