// Whatever a host passes as parameters: setup takes it or fails with the documented error, also without a
// slot for it, and the run that follows uses each value as its documentation reads it.
//
// Input: "frameCount=i3;timeout=d0.5;images=L2;" and anything else that a dictionary can hold.
#include "devices/simulator/frame_metadata.h"
#include "fuzz/clock.h"
#include "fuzz/expect.h"
#include "fuzz/input.h"
#include "fuzz/loop_sensor.h"
#include "fuzz/one_stream.h"
#include "fuzz/queues.h"
#include "fuzz/reading.h"
#include "kirra/image_experiment.h"
#include "vantor_fault/fault_analysis.h"
#include "vantor_fault/fault_experiment.h"

namespace {

using fuzz::expect;
using platform::Dictionary;
using platform::Number;

constexpr std::uint64_t kDelivered = 3;  // frames and images

void expectError(const platform::ErrorRef& error,
                 std::string_view domain,
                 std::int64_t code,
                 const std::string& text) {
    expect(error != nullptr && error->domain() == domain && error->code() == code &&
               error->localizedDescription() == text && error->underlyingError() == nullptr,
           "the documented error");
}

// The frames are validated as they come, and then the time-out passes.
void tryFault(const Dictionary& parameters) {
    const Number frameCount = parameters.number("frameCount");
    const auto timeout = static_cast<double>(fuzz::exactly(parameters.number("timeout")));
    const bool countIsNegative = fuzz::readAs<std::int64_t>(frameCount) < 0;
    const bool isRefused = countIsNegative || timeout < 0;

    const auto experiment = std::make_shared<ZRVantorFaultExperiment>();
    platform::ErrorRef error;
    expect(experiment->setupWithParameters(parameters, nullptr, nullptr) == !isRefused,
           "setup without a slot");
    expect(experiment->setupWithParameters(parameters, nullptr, &error) == !isRefused, "setup");
    expect((error != nullptr) == isRefused, "an error of a refusal only");
    if (isRefused) {
        expectError(
            error, ZRErrorDomain, 5,
            countIsNegative ? "frameCount cannot be negative!" : "timeout cannot be negative!");
    }
    static const auto camera = simulator::healthyCapture().streams.back();
    fuzz::installOneStream()->onStart = [](const WLRylFrameHandler& handler) {
        for (std::uint64_t frame = 1; frame <= kDelivered; ++frame) {
            handler(test::bufferWith(simulator::frameMetadata(camera, frame, 0)), {});
            fuzz::runQueued();
        }
    };
    error = nullptr;
    const auto result = experiment->run(&error);
    expect(result != nullptr && error == nullptr, "a result");
    // What was accepted before a refusal is kept.
    const auto wanted = countIsNegative ? 0 : fuzz::readAs<std::uint64_t>(frameCount);
    const auto received = std::min(std::max<std::uint64_t>(wanted, 1), kDelivered);
    expect((*result->measurements().find("FrameCount"))->doubleValue() ==
               static_cast<double>(received),
           "the frame count");
    const std::vector<double> delays = fuzz::takeDelays();
    const double expected = isRefused ? 0 : timeout;
    expect(delays.size() == 1 &&
               (delays[0] == expected || (std::isnan(delays[0]) && std::isnan(expected))),
           "the time-out");
    expect(experiment->teardown(nullptr), "teardown");
}

void tryAnalysis(const Dictionary& parameters) {
    ZRVantorFaultAnalysis analysis;
    platform::ErrorRef error;
    expect(analysis.setupWithParameters(parameters, nullptr, &error) && error == nullptr,
           "the analysis takes anything");
    const Number kept = analysis.frameCount();
    const Number given = parameters.number("frameCount");
    expect(kept.kind() == given.kind() && kept.text() == given.text(), "the number as it is");
}

// An image comes at each turn. Then the clock is set a second before the time-out's end, and behind it.
void tryImages(const Dictionary& parameters) {
    const auto wanted = fuzz::readAs<std::uint64_t>(parameters.number("images"));
    const auto timeout = fuzz::readAs<std::uint64_t>(parameters.number("timeout"));
    const bool isEndless = timeout > 9'223'372'036;  // seconds: the clock's end
    fuzz::setClock({});

    const auto runLoop = platform::RunLoop::forThisThread();
    const auto sensor = fuzz::installLoopSensor();
    std::uint32_t delivered = 0;
    sensor->turn = [&] {
        if (delivered < kDelivered) {
            const auto callback = sensor->callback;
            sensor->source->signal();
            callback(118, fuzz::reportBytes(KirraImage::kSize, 118, ++delivered), nullptr);
        }
    };
    int waits = 0;
    const auto observer = std::make_shared<platform::RunLoopObserver>();
    *observer = {platform::RunLoopBeforeWaiting, 0, [&](std::uint32_t /*activity*/) {
                     ++waits;
                     if (isEndless) {
                         fuzz::setClock(fuzz::TimePoint::max());
                         runLoop->stop();
                     } else if (waits == 1) {
                         fuzz::setClock(fuzz::TimePoint(std::chrono::seconds(timeout - 1)));
                         sensor->source->signal();
                     } else {
                         fuzz::setClock(timeout < 9'223'372'035
                                            ? fuzz::TimePoint(std::chrono::seconds(timeout + 1))
                                            : fuzz::TimePoint::max());
                     }
                 }};
    runLoop->addObserver(observer, platform::kRunLoopDefaultMode);

    const auto experiment = std::make_shared<ZRKirraImageExperiment>();
    platform::ErrorRef error;
    expect(experiment->setupWithParameters(parameters, nullptr, &error) && error == nullptr,
           "setup takes anything");
    const auto result = experiment->run(&error);
    runLoop->removeObserver(observer, platform::kRunLoopDefaultMode);

    const auto enough = std::max<std::uint64_t>(wanted, 1);
    const bool isEnough = enough <= kDelivered;
    const bool isInTime = isEndless || (timeout == 0 ? enough == 1 : isEnough);
    expect((result != nullptr) == isInTime, "a result in time");
    if (isInTime) {
        expect(
            result->auxiliaryData().find("images")->list()->size() == std::min(enough, kDelivered),
            "the number of images");
    } else {
        expectError(error, ZRKirraImageExperimentErrorDomain, 6,
                    "Timed out after " + std::to_string(timeout) + " seconds.");
        expect(waits == (timeout == 0 ? 0 : 2), "no sooner and no later");
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const Dictionary parameters = fuzz::Input(data, size).dictionary('\0');
    tryFault(parameters);
    tryAnalysis(parameters);
    tryImages(parameters);
    return 0;
}
