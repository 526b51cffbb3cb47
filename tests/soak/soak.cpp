// Many frames and many runs in one process, faults among them: every run has the outcome that its fault
// demands, in time, and memory, threads and descriptors stay as they are.
//
//     zr_soak FRAMES RUNS [SEED [--leak memory|block|thread|descriptor]]
//
// FRAMES through the projector fault experiment, in runs of any length, and RUNS of each of the three
// experiments. Prints the figures after each quarter. The exit status is 1 when an outcome is wrong, when
// threads or descriptors are left, and when memory grows.
//
// --leak leaves one on purpose with each of RUNS, to show that it is found. The projector then has no runs: each
// measurement would have to wait for their time-outs.
#include <array>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <map>
#include <memory>
#include <random>
#include <string>
#include <string_view>
#include <thread>
#include <typeindex>
#include <utility>
#include <vector>

#include <fcntl.h>
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
#include "tests/support/descriptors.h"
#include "tests/support/eventually.h"
#include "tests/support/hand_fed_camera.h"
#include "tests/support/result_values.h"
#include "vantor_counters/counter_experiment.h"
#include "vantor_fault/fault_experiment.h"

namespace {

using platform::Dictionary;
using platform::ImageBuffer;
using Clock = std::chrono::steady_clock;

// Seconds. Far above what a run takes, also on a busy machine; a pending time-out keeps its experiment until it has
// passed. No fault makes a run wait for it.
constexpr double kTimeout = 5;

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

// What is wrong in a run, and how it ends: with an error of that code, or with a result (0) of at least so many
// frames or images.
struct Fault {
    const char* name;
    std::int64_t code = 0;
    std::int64_t captured = 0;
    std::function<void()> arrange = [] {};
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
        _run(*experiment, {{"frameCount", frames}, {"timeout", kTimeout}},
             {fault.name, fault.code, frames});
        // The pending time-out keeps the experiment; the camera ends here.
        experiment->setStream(nullptr);
        experiment->setDevice(nullptr);
    }

    void counters() {
        auto profile = simulator::healthyMeterix();
        const std::array<Fault, 4> faults{{
            {"none"},
            {"no report", 100, 0, [&] { profile.report = kFails; }},
            {"no snapshot", 100, 0, [&] { profile.firstSnapshot = kFails; }},
            {"no count", 100, 0, [&] { profile.channels.back().count = std::nullopt; }},
        }};
        const Fault& fault = _any(faults);
        fault.arrange();
        platform::installServices({.meterix = meterixFacility(profile)});
        _run(*std::make_shared<ZRVantorMeterixExperiment>(), {}, fault);
    }

    void images() {
        auto profile = simulator::healthyHid();
        auto& sensor = profile.devices.at(1);
        const auto own = std::make_shared<const platform::Error>("sensor", 7, "soak");
        const std::array<Fault, 6> faults{{
            {"none", 0, 4},
            {"not opened", 3, 0, [&] { sensor.open = kFails; }},
            {"no power", 4, 0, [&] { sensor.featureReports[171] = kFails; }},
            {"no mode", 5, 0, [&] { sensor.featureReports[172] = kFails; }},
            {"an error of its own", 7, 0,
             [&] {
                 sensor.errorAtReport = {2, own};
             }},
            {"unplugged", 0, 2, [&] { sensor.unplugAtReport = 3; }},
        }};
        const Fault& fault = _any(faults);
        fault.arrange();
        platform::installServices({.hid = simulator::makeHidFacility(std::move(profile), 0),
                                   .display = simulator::makeDisplayService({}),
                                   .registry = simulator::makeDeviceRegistry({})});
        _run(*std::make_shared<ZRKirraImageExperiment>(), {{"images", 4}, {"timeout", 60}}, fault);
    }

    std::int64_t anyOf(std::int64_t least, std::int64_t most) {
        return std::uniform_int_distribution<std::int64_t>(least, most)(_random);
    }

  private:
    // Setup, run and teardown, as the host calls them.
    template <class Experiment>
    void _run(Experiment& experiment, const Dictionary& parameters, const Fault& fault) {
        const auto failRun = [&](const std::string& how) {
            fail(std::string("a run with the fault \"") + fault.name + "\" " + how);
        };
        if constexpr (std::is_base_of_v<ZRSetup, Experiment>) {
            if (!experiment.setupWithParameters(parameters, nullptr, nullptr)) {
                failRun("was not set up");
            }
        }
        const auto begin = Clock::now();
        platform::ErrorRef error;
        const auto result = experiment.run(&error);
        const std::chrono::duration<double> taken = Clock::now() - begin;
        if constexpr (std::is_base_of_v<ZRTeardown, Experiment>) {
            if (!experiment.teardown(nullptr)) {
                failRun("was not torn down");
            }
        }
        if ((result != nullptr ? 0 : error->code()) != fault.code) {
            failRun("ended with " +
                    (result != nullptr ? std::string("a result") : error->localizedDescription()));
        }
        // The time-out ends a run with a result, as the last frame does.
        if (taken.count() >= kTimeout) {
            failRun("ended late");
        }
        if (result == nullptr) {
            return;
        }
        const test::ResultValues values = test::valuesOf(*result);
        if (values.captured < static_cast<std::size_t>(fault.captured)) {
            failRun("has only " + std::to_string(values.captured) + " frames or images of " +
                    std::to_string(fault.captured));
        }
        const auto& first =
            _results.try_emplace({typeid(Experiment), fault.name}, values).first->second;
        if (!values.hasSameValues(first)) {
            failRun("has another result than the first");
        }
    }

    std::mt19937 _random;
    // The first of each experiment and fault.
    std::map<std::pair<std::type_index, std::string>, test::ResultValues> _results;
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

// From the totals that end the allocator's own report of its state: its heap without what is free in it, and the
// large blocks, which are mapped.
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
            last("<total type=\"fast\"") + last("<total type=\"mmap\"")) /
           1e3;
}

// Waits until the threads of earlier runs are gone, but for those that are left on purpose, and their time-outs have
// passed.
Figures settle(std::size_t leftThreads) {
    platform::installServices({});
    test::eventually([leftThreads] { return test::threadCount() == 1 + leftThreads; });
    malloc_trim(0);
    std::ifstream statm("/proc/self/statm");
    double pages = 0;
    double resident = 0;
    statm >> pages >> resident;
    return {kilobytesInUse(), resident * static_cast<double>(sysconf(_SC_PAGESIZE)) / 1e6,
            test::threadCount(), test::descriptorCount()};
}

// The allocator must count exactly: a cache of freed blocks per thread counts as in use, and a heap per thread keeps
// what it had. It reads this when the process starts.
void measureExactly(char** words) {
    constexpr const char* kName = "GLIBC_TUNABLES";
    constexpr const char* kExact = "glibc.malloc.tcache_count=0:glibc.malloc.arena_max=1";
    const char* const set = std::getenv(kName);
    if (set == nullptr || std::string_view(set) != kExact) {
        setenv(kName, kExact, 1);
        execv("/proc/self/exe", words);
        fail("cannot start itself anew");
    }
}

// Something that each run of a soak leaves on purpose.
struct Leak {
    std::string_view name;
    void (*leave)();
};
void* volatile lastBlock;

constexpr std::array<Leak, 5> kLeaks{{
    {"", [] {}},
    {"memory", [] { lastBlock = std::malloc(48); }},
    {"block", [] { lastBlock = std::malloc(1 << 20); }},  // mapped, and not resident
    {"thread", [] { std::thread(pause).detach(); }},
    {"descriptor", [] { open("/dev/null", O_RDONLY | O_CLOEXEC); }},
}};

// Kilobytes. An exact count moves by less than one.
constexpr double kSlack = 2;

const Leak& leakNamed(std::string_view name) {
    for (const Leak& leak : kLeaks) {
        if (leak.name == name) {
            return leak;
        }
    }
    fail("no such leak: " + std::string(name));
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
    const bool leaks = count == 6 && std::string_view(words[4]) == "--leak";
    if (count != 3 && count != 4 && !leaks) {
        fail("usage: zr_soak FRAMES RUNS [SEED [--leak memory|block|thread|descriptor]]");
    }
    measureExactly(words);
    const std::int64_t frames = number(words[1]);
    const std::int64_t runsOfEach = number(words[2]);
    const auto seed =
        count > 3 ? static_cast<unsigned>(number(words[3])) : std::random_device()() | 1U;
    const Leak& leak = leakNamed(leaks ? words[5] : "");
    std::printf("seed %u\n", seed);
    platform::setLogSink(nullptr, platform::LogLevel::Error);
    Soak runs(seed);

    constexpr std::int64_t kParts = 4;
    const auto partOf = [](std::int64_t amount, std::int64_t part) {
        return amount * part / kParts - amount * (part - 1) / kParts;
    };
    std::size_t leftThreads = 0;
    Figures first{};  // the first part fills what is allocated once
    for (std::int64_t part = 1; part <= kParts; ++part) {
        for (std::int64_t left = leaks ? 0 : partOf(frames, part); left > 0;) {
            const std::int64_t length = std::min(left, runs.anyOf(1, 20'000));
            runs.projector(length);
            left -= length;
        }
        for (std::int64_t run = partOf(runsOfEach, part); run > 0; --run) {
            if (!leaks) {
                runs.projector(runs.anyOf(1, 5));
            }
            runs.counters();
            runs.images();
            leak.leave();
            leftThreads += leak.name == "thread" ? 1 : 0;
        }
        const Figures now = settle(leftThreads);
        std::printf(
            "%12lld frames, %8lld runs of each: %9.1f kB allocated %7.1f MB resident %3zu threads "
            "%3zu descriptors\n",
            static_cast<long long>(frames * part / kParts),
            static_cast<long long>(runsOfEach * part / kParts), now.kilobytes, now.megabytes,
            now.threads, now.descriptors);
        std::fflush(stdout);
        first = part == 1 ? now : first;
        if (now.threads != 1) {
            fail(std::to_string(now.threads - 1) + " threads are left");
        }
        if (now.descriptors != first.descriptors) {
            fail(std::to_string(static_cast<std::int64_t>(now.descriptors - first.descriptors)) +
                 " descriptors are left");
        }
        // What is free stays resident in pieces, more or less of it by the order of events.
        if (now.kilobytes > first.kilobytes + kSlack || now.megabytes > 2 * first.megabytes) {
            std::array<char, 80> text{};
            std::snprintf(text.data(), text.size(), "memory grew by %.1f kB and %.1f MB resident",
                          now.kilobytes - first.kilobytes, now.megabytes - first.megabytes);
            fail(text.data());
        }
    }
    return 0;
}
