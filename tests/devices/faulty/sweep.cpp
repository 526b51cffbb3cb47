#include "tests/devices/faulty/sweep.h"

#include <algorithm>
#include <chrono>
#include <thread>

#include "devices/observed/capture.h"
#include "devices/observed/observe.h"
#include "devices/simulator/device.h"
#include "kirra/image_experiment.h"
#include "tests/platform/threads.h"
#include "tests/support/capture_witness.h"
#include "tests/support/eventually.h"
#include "vantor_counters/counter_experiment.h"
#include "vantor_fault/fault_experiment.h"

namespace test {

namespace {

struct SilentSink final : platform::LogSink {
    void write(const platform::LogLine& /*line*/) override {}
};

// The threads of the process but for the one of the delayed items, which a pending time-out keeps.
Threads threads() {
    Threads names = threadNames();
    names.erase("delayed items");
    names.erase("");  // one that ended just now
    return names;
}

std::ptrdiff_t countOf(const std::vector<faulty::Step>& steps, std::string_view operation) {
    return std::count_if(steps.begin(), steps.end(),
                         [&](const faulty::Step& step) { return step.operation == operation; });
}

template <class Experiment>
std::shared_ptr<ZRExperiment> make() {
    return std::make_shared<Experiment>();
}

}  // namespace

const platform::ErrorRef kUntouched =
    std::make_shared<const platform::Error>("none", 0, "nothing was written");

const Subject kFaultExperiment = {
    make<ZRVantorFaultExperiment>,
    [](double timeout) {
        return platform::Dictionary{{"frameCount", kAskedFor}, {"timeout", timeout}};
    },
    5};
const Subject kCounterExperiment = {make<ZRVantorMeterixExperiment>,
                                    [](double /*timeout*/) { return platform::Dictionary(); }, 0};
const Subject kImageExperiment = {
    make<ZRKirraImageExperiment>,
    [](double timeout) {
        return platform::Dictionary{{"images", kAskedFor}, {"timeout", timeout}};
    },
    60};

platform::Services makeSmallDevice() {
    simulator::DeviceProfile profile;
    simulator::StreamProfile& camera = profile.capture.streams.back();
    camera.jitterMicroseconds = 0;
    camera.events = {{.frame = 1, .code = 1}};
    camera.errorCounters = platform::Dictionary{
        {kRylCaptureStreamPropertyValue_I2CErrorCount, 1},
        {kRylCaptureStreamPropertyValue_MIPIErrorCount, 2},
        {"LPDPErrorCount", 3},
        {"UARTErrorCount", 4},
        {"SIFErrorCount", 5},
        {"ProjectorErrorCount", 6},
    };
    profile.meterix.channels = {
        {.group = "Q71ISP",
         .subgroup = "Q71ISP Events",
         .name = "first",
         .count = 100,
         .riseAtFrame = 1,
         .riseBy = 5},
        {.group = "Q71ISP", .subgroup = "Q71ISP Events", .name = "second", .count = 0},
        {.group = "Q71ISP", .subgroup = "other", .name = "third", .count = 1000},
    };
    return simulator::makeDevice(profile, 0);
}

Sweep::Sweep() {
    // A sanitizer starts a thread of its own with the first one, which is listed for a moment after its end.
    std::thread([] { pthread_setname_np(pthread_self(), "first"); }).join();
    EXPECT_TRUE(eventually([] { return threadsNamed("first") == 0; }));
    _threads = threads();
    platform::setLogSink(std::make_shared<SilentSink>(), platform::LogLevel::Debug);
}

Sweep::~Sweep() {
    platform::installServices({});
    for (const Left& left : _left) {
        EXPECT_TRUE(eventually([&] { return left.experiment.expired(); }))
            << left.name << ": the experiment is left";
        EXPECT_TRUE(eventually([&] { return left.device.expired(); }))
            << left.name << ": an object of the device is left";
    }
    platform::setLogSink(nullptr, platform::LogLevel::Error);
}

Ending Sweep::run(const Subject& subject,
                  const faulty::FaultyDevice& device,
                  double timeout,
                  bool withSlot,
                  const std::string& name) {
    SCOPED_TRACE(name);
    const auto witness = std::make_shared<CaptureWitness>();
    const platform::Services services = observed::observe(device.services(), witness);
    platform::installServices(services);

    Ending ending;
    auto experiment = subject.make();
    _left.push_back({name, device.lifetime(), experiment});
    auto* setup = dynamic_cast<ZRSetup*>(experiment.get());
    const platform::ErrorSlot slot = withSlot ? &ending.error : nullptr;
    if (setup == nullptr ||
        setup->setupWithParameters(subject.parameters(timeout), nullptr, slot)) {
        using Clock = std::chrono::steady_clock;
        const Clock::time_point began = Clock::now();
        try {
            ending.result = experiment->run(slot);
        } catch (const std::exception& failure) {
            ending.exception = failure.what();
        }
        // A stop that is lost would show in nothing else: a run that times out has a result.
        const std::chrono::duration<double> seconds = Clock::now() - began;
        EXPECT_TRUE(timeout == 0 || timeout < subject.generous || seconds.count() < timeout)
            << "it waited for its time-out";
        if (auto* teardown = dynamic_cast<ZRTeardown*>(experiment.get())) {
            ending.isTornDown = teardown->teardown(withSlot ? &ending.teardownError : nullptr);
        }
    }

    // The calls of the stop are the same in every outcome but those of a stream that did not start.
    const std::vector<faulty::Step> steps = device.steps();
    const auto strikes = device.strikes();
    const bool startFailed = std::any_of(strikes.begin(), strikes.end(), [](const auto& strike) {
        return strike.text.find("call: start ") != std::string::npos;
    });
    const std::ptrdiff_t starts = startFailed ? 0 : countOf(steps, "start");
    EXPECT_EQ(countOf(steps, "stop"), starts);
    EXPECT_EQ(countOf(steps, "valueForProperty ErrorCounters"), starts);

    experiment = nullptr;  // with the sensor that it could not close
    const auto* capture = dynamic_cast<const observed::ObservedCapture*>(services.capture.get());
    EXPECT_TRUE(capture == nullptr || eventually([&] { return capture->lentBuffers() == 0; }));
    EXPECT_TRUE(eventually([&] { return threads() == _threads; }))
        << ::testing::PrintToString(threads());
    // The one rule that a fault breaks.
    std::vector<std::string> misuses = witness->waitForMisuses(0);
    std::erase_if(misuses, [](const std::string& what) {
        return what.starts_with("sample() returned 0 samples");
    });
    EXPECT_THAT(misuses, ::testing::IsEmpty());
    platform::installServices({});
    return ending;
}

}  // namespace test
