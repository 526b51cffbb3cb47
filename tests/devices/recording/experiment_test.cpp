// The experiments on a device that is recorded, and on its replay: the same results.
#include <chrono>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "devices/observed/observe.h"
#include "devices/recording/recorder.h"
#include "devices/recording/replayed.h"
#include "devices/simulator/device.h"
#include "kirra/image_experiment.h"
#include "tests/devices/recording/recordings.h"
#include "tests/support/capture_witness.h"
#include "vantor_counters/counter_experiment.h"
#include "vantor_fault/fault_experiment.h"

namespace test {

namespace {

using platform::Dictionary;

struct Subject {
    const char* name;
    std::shared_ptr<ZRExperiment> (*make)();
    Dictionary parameters;
};

template <class Experiment>
std::shared_ptr<ZRExperiment> make() {
    return std::make_shared<Experiment>();
}

// What the experiment returned, as text: its error, or its measurements and images.
std::string outcomeOf(const Subject& subject, const platform::Services& device) {
    const auto witness = std::make_shared<CaptureWitness>();
    platform::installServices(observed::observe(device, witness));
    const auto experiment = subject.make();
    platform::ErrorRef error;
    ZRExperimentResultRef result;
    auto* setup = dynamic_cast<ZRSetup*>(experiment.get());
    if (setup == nullptr || setup->setupWithParameters(subject.parameters, nullptr, &error)) {
        result = experiment->run(&error);
    }
    if (auto* teardown = dynamic_cast<ZRTeardown*>(experiment.get())) {
        teardown->teardown(&error);
    }
    platform::installServices({});
    EXPECT_THAT(witness->waitForMisuses(0), ::testing::IsEmpty());
    if (result == nullptr) {
        return error != nullptr ? error->localizedDescription() : "no error";
    }
    std::string text;
    for (const auto& [name, measurement] : result->measurements()) {
        // Further frames may have been counted before the stop.
        const double value = measurement->doubleValue();
        text += platform::format("%@ %lf\n", name, name == "FrameCount" ? value >= 5 : value);
    }
    return text +
           recording::callText(recording::Operation::Property, Dictionary(result->auxiliaryData()));
}

TEST(RecordedExperiments, HaveTheSameResultsOnTheReplay) {
    const auto runLoop = platform::RunLoop::forThisThread();
    const Subject subjects[] = {
        {"fault", make<ZRVantorFaultExperiment>, {{"frameCount", 5}, {"timeout", 60}}},
        {"counters", make<ZRVantorMeterixExperiment>, {}},
        {"images", make<ZRKirraImageExperiment>, {{"images", 3}, {"timeout", 60}}},
    };
    simulator::DeviceProfile healthy;
    simulator::DeviceProfile broken;
    simulator::StreamProfile& stream = broken.capture.streams.back();
    stream.events = {{.frame = 1, .code = 7, .info = 9}, {.frame = 3, .code = 8, .info = 9}};
    stream.overrides.resize(2);
    stream.overrides[0].frames = {2, 2};
    stream.overrides[0].dropped = true;
    stream.overrides[1].frames = {4, 4};
    stream.overrides[1].set.set(kRylCaptureStreamMetadata_InfraredLightSource, 0);
    stream.framesAfterStop = 3;
    broken.hid.devices[1].unplugAtReport = 3;
    broken.meterix.channels[5].riseAtFrame = 1;
    broken.meterix.channels[5].riseBy = 4;
    for (const simulator::DeviceProfile& profile : {healthy, broken}) {
        for (const Subject& subject : subjects) {
            SCOPED_TRACE(subject.name);
            Tape tape;
            recording::Session session = kSession;
            session.services = {"capture", "meterix", "hid", "display", "registry"};
            const auto recorder = recording::Recorder::start(
                session, [&](std::string_view bytes) { tape.write(bytes); });
            const std::string recorded =
                outcomeOf(subject, recorder->record(simulator::makeDevice(profile, 100)));
            recorder->finish();
            const auto script = std::make_shared<recording::Script>(tape.recording(), 1);
            EXPECT_EQ(outcomeOf(subject, {.capture = recording::replayCapture(script),
                                          .meterix = recording::replayMeterix(script),
                                          .hid = recording::replayHid(script),
                                          .display = recording::replayDisplay(script),
                                          .registry = recording::replayRegistry(script)}),
                      recorded);
            EXPECT_FALSE(recorded.empty());
        }
    }
}

}  // namespace

}  // namespace test
