#include "tests/vantor_fault/fault_bench.h"

#include "devices/simulator/frame_metadata.h"
#include "tests/support/one_stream_capture.h"

namespace test {

namespace {

// A device of hand-fed streams, and the plug-in that has it.
struct HandFedCapture final : WLISPCapturePlugIn, WLRylCaptureDevice {
    explicit HandFedCapture(WLRylCaptureStreamList all) : list(std::move(all)) {}

    std::shared_ptr<WLRylCaptureDevice> device(platform::ErrorSlot /*error*/) override {
        return std::make_shared<HandFedCapture>(list);
    }
    std::optional<WLRylCaptureStreamList> streams(platform::ErrorSlot /*error*/) override {
        return list;
    }
    bool requestControlOfStreams(const WLRylCaptureStreamList& /*streams*/,
                                 platform::ErrorSlot /*error*/) override {
        return true;
    }
    bool invalidate(platform::ErrorSlot /*error*/) override { return true; }

    const WLRylCaptureStreamList list;
};

template <class Handler>
Handler handlerOf(const ZRVantorFaultExperiment& experiment, std::string_view key) {
    const platform::Value handlers = experiment.stream()->valueForProperty(
        kRylCaptureStreamProperty_VideoOutputHandlers, nullptr);
    return *handlers[kRylCaptureStreamVideoOutputID_PrimaryScaler][key].object<Handler>();
}

}  // namespace

HandFedStream::HandFedStream() {
    values.set(kRylCaptureStreamProperty_PortType, kRylCapturePortType_FrontFacingInfraredCamera);
    values.set(kRylCaptureStreamProperty_ErrorCounters, platform::Dictionary());
}

platform::ErrorRef serviceError(std::string_view text) {
    return std::make_shared<const platform::Error>("service", 7, std::string(text));
}

FaultTest::FaultTest() {
    capture = simulator::healthyCapture();
    capture.streams = {capture.streams.back()};
    camera().jitterMicroseconds = 0;
    platform::setLogSink(log, platform::LogLevel::Debug);
}

FaultTest::~FaultTest() {
    log->release();
    for (const Made& made : _made) {  // so that none logs into the next test
        EXPECT_TRUE(eventually([&] { return made.experiment.use_count() <= made.pending; }));
    }
    EXPECT_TRUE(eventually([&] { return liveBuffers() == 0; })) << liveBuffers() << " buffers held";
    platform::installServices({});
    _plugIn = nullptr;
    EXPECT_THAT(_witness->waitForMisuses(0), ::testing::IsEmpty());
    platform::setLogSink(nullptr, platform::LogLevel::Error);
}

simulator::FrameOverride& FaultTest::at(std::uint64_t frame) {
    simulator::FrameOverride& range = camera().overrides.emplace_back();
    range.frames = {.first = frame, .last = frame};
    return range;
}

void FaultTest::install() {
    const auto progress = std::make_shared<simulator::StreamProgress>();
    _plugIn = observed::observeCapture(simulator::makeCapturePlugIn(capture, speed, progress),
                                       observed::Reporter(_witness));
    platform::installServices(
        {.capture = _plugIn, .meterix = simulator::makeMeterixFacility(meterix, progress)});
}

void FaultTest::install(WLRylCaptureStreamList streams) {
    platform::installServices({.capture = std::make_shared<HandFedCapture>(std::move(streams)),
                               .meterix = simulator::makeMeterixFacility(
                                   meterix, std::make_shared<simulator::StreamProgress>())});
}

std::shared_ptr<ZRVantorFaultExperiment> FaultTest::make(double frameCount,
                                                         double timeout,
                                                         std::string_view port) {
    auto experiment = std::make_shared<Experiment>(port);
    EXPECT_TRUE(experiment->setupWithParameters({{"frameCount", frameCount}, {"timeout", timeout}},
                                                nullptr, nullptr));
    _made.push_back({experiment, timeout >= kLate ? 1 : 0});
    return experiment;
}

ZRExperimentResultRef FaultTest::run(double frameCount, double timeout) {
    install();
    const auto experiment = make(frameCount, timeout);
    auto result = experiment->run(&error);
    experiment->teardown(nullptr);
    return result;
}

WLRylFrameHandler FaultTest::frameHandler(const Experiment& experiment) {
    return handlerOf<WLRylFrameHandler>(experiment,
                                        kRylCaptureStreamVideoOutputHandlerKey_PixelBufferHandler);
}

WLRylEventHandler FaultTest::eventHandler(const Experiment& experiment) {
    return handlerOf<WLRylEventHandler>(experiment,
                                        kRylCaptureStreamVideoOutputHandlerKey_EventHandler);
}

platform::ImageBufferRef FaultTest::buffer() {
    const auto profile = simulator::healthyCapture().streams.back();
    return bufferWith(simulator::frameMetadata(profile, 1, 0));
}

std::size_t FaultTest::liveBuffers() const {
    return _plugIn != nullptr ? _plugIn->lentBuffers() : 0;
}

}  // namespace test
