// Many frames and many runs in one process, faults among them: every run has the outcome that its fault
// demands, and memory, threads and descriptors stay as they are.
//
//     zr_soak FRAMES RUNS [SEED]
//
// FRAMES through the projector fault experiment, in runs of any length; then RUNS of each of the three
// experiments. Prints the figures after each tenth. The exit status is 1 when an outcome is wrong, when
// threads or descriptors are left, and when memory grows.
#include <array>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iterator>
#include <memory>
#include <random>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <malloc.h>
#include <unistd.h>

#include "devices/simulator/display_service.h"
#include "devices/simulator/frame_metadata.h"
#include "devices/simulator/hid_sensor.h"
#include "devices/simulator/meterix_facility.h"
#include "kirra/image_experiment.h"
#include "platform/log.h"
#include "platform/services.h"
#include "tests/platform/threads.h"
#include "tests/support/eventually.h"
#include "tests/support/hand_fed_camera.h"
#include "vantor_counters/counter_experiment.h"
#include "vantor_fault/fault_experiment.h"

namespace {

using platform::Dictionary;
using platform::ImageBuffer;
using Clock = std::chrono::steady_clock;

// Seconds. Far above what a run takes; a pending time-out keeps its experiment until it has passed.
constexpr double kTimeout = 1;

const auto kFails = simulator::Fault::failing(nullptr);

[[noreturn]] void fail(const std::string& what) {
    std::fprintf(stderr, "soak: %s\n", what.c_str());
    std::exit(1);
}

// --- The devices -----------------------------------------------------------------------------------

using Image = std::shared_ptr<const ImageBuffer>;

// A lit frame in which one number is another; an absent one is missing.
Image imageWith(std::string_view key, platform::Value changed) {
    const auto camera = simulator::healthyCapture().streams.back();
    const platform::Value healthy = simulator::frameMetadata(camera, 1, 0);
    platform::MutableDictionary metadata;
    for (const auto& [name, value] : *healthy.dictionary()) {
        if (name != key) {
            metadata.set(name, value);
        } else if (changed.isPresent()) {
            metadata.set(name, changed);
        }
    }
    return test::bufferWith(Dictionary(std::move(metadata)));
}

// What is wrong in a run, and the code of its error; 0: it has a result.
struct CaptureFault {
    const char* name;
    std::int64_t code;
    Image image = nullptr;  // of the frame that ends the run
    bool starts = true;
    bool stops = true;
    bool hasCounters = true;
};

std::vector<CaptureFault> captureFaults() {
    const auto light = kRylCaptureStreamMetadata_InfraredLightSource;
    return {
        {.name = "none", .code = 0},
        {.name = "unlit", .code = 206, .image = imageWith(light, 0)},
        {.name = "a number is missing", .code = 206, .image = imageWith("HardwareEvents", {})},
        {.name = "a text for a number", .code = 206, .image = imageWith(light, "1")},
        {.name = "metadata are no dictionary", .code = 206, .image = test::bufferWith(7)},
        {.name = "no metadata", .code = 206, .image = std::make_shared<ImageBuffer>(Dictionary())},
        {.name = "no start", .code = 204, .starts = false},
        {.name = "no stop", .code = 205, .stops = false},
        {.name = "no error counters", .code = 210, .hasCounters = false},
    };
}

class FaultyCapture final : public test::HandFedCapture {
  public:
    // The fault shows in frame `at`, if it is one of a frame.
    FaultyCapture(const CaptureFault& fault, Image healthy, std::int64_t at)
        : HandFedCapture([image = fault.image, healthy = std::move(healthy), at](auto frame) {
            return frame == at && image != nullptr ? image : healthy;
        })
        , _fault(fault) {}

    platform::Value valueForProperty(std::string_view property,
                                     platform::ErrorSlot error) override {
        if (property == kRylCaptureStreamProperty_ErrorCounters && !_fault.hasCounters) {
            return {};
        }
        return HandFedCapture::valueForProperty(property, error);
    }
    bool start(platform::ErrorSlot error) override {
        return _fault.starts && HandFedCapture::start(error);
    }
    bool stop(platform::ErrorSlot error) override {
        return HandFedCapture::stop(error) && _fault.stops;
    }

  private:
    const CaptureFault& _fault;
};

std::shared_ptr<platform::MeterixFacility> meterixFacility(simulator::MeterixProfile profile) {
    return simulator::makeMeterixFacility(std::move(profile),
                                          std::make_shared<simulator::StreamProgress>());
}

// --- The runs --------------------------------------------------------------------------------------

// What is wrong in a run, how it is brought about, and the code of the run's error; 0: it has a result.
struct Fault {
    const char* name;
    std::int64_t code;
    std::function<void()> arrange;
};

class Soak {
  private:
    template <class Choices>
    auto& _any(Choices& choices) {
        return choices[static_cast<std::size_t>(
            anyOf(0, static_cast<std::int64_t>(std::size(choices)) - 1))];
    }

  public:
    explicit Soak(unsigned seed) : _random(seed) {}

    // One run of the projector fault experiment, of that many frames.
    void projector(std::int64_t frames) {
        const CaptureFault& fault = _any(_captureFaults);
        const auto capture = std::make_shared<FaultyCapture>(fault, _healthy, frames);
        platform::installServices({.capture = capture, .meterix = _meterix});
        const auto experiment = std::make_shared<ZRVantorFaultExperiment>();
        // A frame that is bad ends the run before its count does.
        _run(*experiment, {{"frameCount", frames}, {"timeout", kTimeout}}, fault.name, fault.code);
        // The pending time-out keeps the experiment; the camera ends here.
        experiment->setStream(nullptr);
        experiment->setDevice(nullptr);
    }

    void counters() {
        auto profile = simulator::healthyMeterix();
        const std::array<Fault, 4> faults{{
            {"none", 0, [] {}},
            {"no report", 100, [&] { profile.report = kFails; }},
            {"no snapshot", 100, [&] { profile.firstSnapshot = kFails; }},
            {"no count", 100, [&] { profile.channels.back().count = std::nullopt; }},
        }};
        const auto& [name, code, arrange] = _any(faults);
        arrange();
        platform::installServices({.meterix = meterixFacility(profile)});
        _run(*std::make_shared<ZRVantorMeterixExperiment>(), {}, name, code);
    }

    void images() {
        auto profile = simulator::healthyHid();
        auto& sensor = profile.devices.at(1);
        const auto own = std::make_shared<const platform::Error>("sensor", 7, "soak");
        const std::array<Fault, 6> faults{{
            {"none", 0, [] {}},
            {"not opened", 3, [&] { sensor.open = kFails; }},
            {"no power", 4, [&] { sensor.featureReports[171] = kFails; }},
            {"no mode", 5, [&] { sensor.featureReports[172] = kFails; }},
            {"an error of its own", 7,
             [&] {
                 sensor.errorAtReport = {2, own};
             }},
            {"unplugged", 0, [&] { sensor.unplugAtReport = 3; }},
        }};
        const auto& [name, code, arrange] = _any(faults);
        arrange();
        platform::installServices({.hid = simulator::makeHidFacility(std::move(profile), 0),
                                   .display = simulator::makeDisplayService({}),
                                   .registry = simulator::makeDeviceRegistry({})});
        _run(*std::make_shared<ZRKirraImageExperiment>(), {{"images", 4}, {"timeout", 60}}, name,
             code);
    }

    std::int64_t anyOf(std::int64_t least, std::int64_t most) {
        return std::uniform_int_distribution<std::int64_t>(least, most)(_random);
    }
    std::size_t timedOut() const { return _timedOut; }

  private:
    template <class Experiment>
    void _run(Experiment& experiment,
              const Dictionary& parameters,
              const char* fault,
              std::int64_t code) {
        if constexpr (std::is_base_of_v<ZRSetup, Experiment>) {
            if (!experiment.setupWithParameters(parameters, nullptr, nullptr)) {
                fail("a setup failed");
            }
        }
        const auto begin = Clock::now();
        platform::ErrorRef error;
        const auto result = experiment.run(&error);
        const std::int64_t got = result != nullptr ? 0 : error->code();
        // On a machine that stands still for so long, the time-out ends a run first, with a result.
        if (got != code && got == 0 &&
            std::chrono::duration<double>(Clock::now() - begin).count() >= kTimeout) {
            ++_timedOut;
        } else if (got != code) {
            fail(std::string("a run with the fault \"") + fault + "\" ended with " +
                 (result != nullptr ? std::string("a result") : error->localizedDescription()));
        }
    }

    std::mt19937 _random;
    std::size_t _timedOut = 0;
    const std::vector<CaptureFault> _captureFaults = captureFaults();
    const Image _healthy = imageWith("no such key", {});
    const std::shared_ptr<platform::MeterixFacility> _meterix =
        meterixFacility(simulator::healthyMeterix());
    const std::shared_ptr<platform::RunLoop> _runLoop = platform::RunLoop::forThisThread();
};

// --- The figures -----------------------------------------------------------------------------------

struct Figures {
    double kilobytes;  // allocated and not freed, by all of the process's threads
    double megabytes;  // resident, after what is free was given back
    std::size_t threads;
    std::size_t descriptors;
};

std::size_t descriptors() {
    return static_cast<std::size_t>(
        std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {}));
}

// From the totals that end the allocator's own report of its state.
double kilobytesInUse() {
    char* report = nullptr;
    std::size_t size = 0;
    std::FILE* stream = open_memstream(&report, &size);
    malloc_info(0, stream);
    std::fclose(stream);
    const std::string text(report, size);
    std::free(report);
    const auto last = [&text](const char* before) {
        const std::size_t at = text.rfind(before);
        if (at == std::string::npos) {
            fail("the allocator's report has another form");
        }
        return std::strtod(text.c_str() + text.find("size=\"", at) + 6, nullptr);
    };
    return (last("<system type=\"current\"") - last("<total type=\"rest\"") -
            last("<total type=\"fast\"")) /
           1e3;
}

// Waits until the threads of earlier runs are gone and their time-outs have passed.
Figures settle() {
    platform::installServices({});
    test::eventually([] { return test::threadCount() == 1; });
    malloc_trim(0);
    std::ifstream statm("/proc/self/statm");
    double pages = 0;
    double resident = 0;
    statm >> pages >> resident;
    return {kilobytesInUse(), resident * static_cast<double>(sysconf(_SC_PAGESIZE)) / 1e6,
            test::threadCount(), descriptors()};
}

// Kilobytes. The allocator keeps that much for threads of its choice.
constexpr double kSlack = 32;

// Does the work in tenths, and prints and compares the figures after each.
void soak(const char* what, std::int64_t amount, const std::function<void(std::int64_t)>& work) {
    // The first tenth fills what is allocated once.
    Figures first{};
    for (int tenth = 1; tenth <= 10; ++tenth) {
        work(amount * tenth / 10 - amount * (tenth - 1) / 10);
        const Figures now = settle();
        std::printf(
            "%12lld %s %9.1f kB allocated %7.1f MB resident %3zu threads %3zu descriptors\n",
            static_cast<long long>(amount * tenth / 10), what, now.kilobytes, now.megabytes,
            now.threads, now.descriptors);
        std::fflush(stdout);
        first = tenth == 1 ? now : first;
        if (now.threads != 1 || now.descriptors != first.descriptors) {
            fail("threads or descriptors are left");
        }
        // What is free stays resident in pieces, more or less of it by the order of events.
        if (now.kilobytes > first.kilobytes + kSlack || now.megabytes > 2 * first.megabytes) {
            fail("memory grew");
        }
    }
}

std::int64_t number(const char* text) {
    char* end = nullptr;
    const long long value = std::strtoll(text, &end, 10);
    if (end == text || *end != '\0' || value < 1) {
        fail(std::string("not a number above 0: ") + text);
    }
    return value;
}

}  // namespace

int main(int count, char** words) {
    if (count < 3 || count > 4) {
        fail("usage: zr_soak FRAMES RUNS [SEED]");
    }
    const auto seed =
        count == 4 ? static_cast<unsigned>(number(words[3])) : std::random_device()() | 1U;
    std::printf("seed %u\n", seed);
    platform::setLogSink(nullptr, platform::LogLevel::Error);
    Soak runs(seed);
    soak("frames     ", number(words[1]), [&](std::int64_t frames) {
        while (frames > 0) {
            const std::int64_t length = std::min(frames, runs.anyOf(1, 20'000));
            runs.projector(length);
            frames -= length;
        }
    });
    soak("runs of each", number(words[2]), [&](std::int64_t count_) {
        for (; count_ > 0; --count_) {
            runs.projector(runs.anyOf(1, 5));
            runs.counters();
            runs.images();
        }
    });
    std::printf("%zu runs of a stalled machine ended by their time-out\n", runs.timedOut());
    return 0;
}
