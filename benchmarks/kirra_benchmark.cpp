// What an image costs from its report to the dictionary in the result, time and memory, beside a
// baseline that keeps the same values as plain structs.
#include <array>
#include <atomic>
#include <cstdlib>
#include <cstring>
#include <new>

#include <benchmark/benchmark.h>

#include "kirra/image_experiment.h"
#include "platform/display.h"
#include "tests/support/hand_fed_sensor.h"

namespace {

std::atomic<std::uint64_t> allocations{0};
std::atomic<std::uint64_t> allocatedBytes{0};

}  // namespace

[[gnu::noinline]] void* operator new(std::size_t size) {
    ++allocations;
    allocatedBytes += size;
    void* memory = std::malloc(size);
    return memory != nullptr ? memory : throw std::bad_alloc();
}
[[gnu::noinline]] void operator delete(void* memory) noexcept {
    std::free(memory);
}
[[gnu::noinline]] void operator delete(void* memory, std::size_t /*size*/) noexcept {
    std::free(memory);
}

namespace {

KirraImage record() {
    KirraImage image;
    for (std::size_t at = 0; at < image.bytes.size(); ++at) {
        image.bytes[at] = static_cast<std::byte>(at);
    }
    return image;
}

// Sends one report a turn of the run loop, for as long as it is scheduled.
struct TirelessSensor final : test::HandFedSensor {
    void scheduleWithRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                             std::string_view mode) override {
        source = std::make_shared<platform::RunLoopSource>([this] {
            source->signal();
            callback(118, report.bytes, nullptr);
        });
        runLoop->addSource(source, mode);
        source->signal();
    }
    void unscheduleFromRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                               std::string_view mode) override {
        runLoop->removeSource(source, mode);
    }

    const KirraImage report = record();
    std::shared_ptr<platform::RunLoopSource> source;
};

struct PoweredDisplay final : platform::DisplayService, platform::DeviceRegistry {
    int mainDisplay(platform::DisplayId& display) override {
        display = 1;
        return 0;
    }
    platform::RegistryObject registryObject(platform::DisplayId display) override {
        return display;
    }
    platform::Value property(platform::RegistryObject /*object*/,
                             std::string_view /*name*/) override {
        return platform::Dictionary{{platform::kDisplayPowerInfo,
                                     platform::Dictionary{{platform::kDisplayPowerInfoPanel, 1}}}};
    }
};

// Counts what one iteration of `images` allocates; reported for each image.
class Tally {
  public:
    explicit Tally(std::int64_t images) : _images(static_cast<double>(images)) {}

    void report(benchmark::State& state) const {
        const double times = _images * static_cast<double>(state.iterations());
        state.counters["allocations"] = static_cast<double>(allocations - _allocations) / times;
        state.counters["bytes"] = static_cast<double>(allocatedBytes - _bytes) / times;
        state.SetItemsProcessed(static_cast<std::int64_t>(times));
    }

  private:
    double _images;
    std::uint64_t _allocations = allocations;
    std::uint64_t _bytes = allocatedBytes;
};

// A whole run: opened, captured, turned into dictionaries, dropped.
void captureImages(benchmark::State& state) {
    const auto display = std::make_shared<PoweredDisplay>();
    platform::installServices(
        {.hid = std::make_shared<test::OneSensorBus>(std::make_shared<TirelessSensor>()),
         .display = display,
         .registry = display});
    const auto runLoop = platform::RunLoop::forThisThread();
    const Tally tally(state.range(0));
    for (auto _ : state) {
        const auto experiment = std::make_shared<ZRKirraImageExperiment>();
        experiment->setupWithParameters({{"images", state.range(0)}, {"timeout", 3600}}, nullptr,
                                        nullptr);
        const auto result = experiment->run(nullptr);
        if (result == nullptr || result->auxiliaryData().find("images")->list()->size() !=
                                     static_cast<std::size_t>(state.range(0))) {
            state.SkipWithError("the run failed");
            break;
        }
    }
    tally.report(state);
    platform::installServices({});
}

// The same values, twice as there: parsed and kept, then copied into what is handed out.
void plainStructsBaseline(benchmark::State& state) {
    struct Plain {
        std::uint32_t frameID;
        std::uint32_t timestamp;
        float temperature;
        std::array<std::int32_t, 96> samples;
    };
    const KirraImage image = record();
    const Tally tally(state.range(0));
    for (auto _ : state) {
        std::vector<Plain> images;
        for (std::int64_t at = 0; at < state.range(0); ++at) {
            Plain plain;
            std::memcpy(&plain.frameID, &image.bytes[4], 4);
            std::memcpy(&plain.timestamp, &image.bytes[12], 4);
            std::memcpy(&plain.temperature, &image.bytes[788], 4);
            std::memcpy(plain.samples.data(), &image.bytes[16], sizeof plain.samples);
            images.push_back(plain);
        }
        std::vector<Plain> result = images;
        benchmark::DoNotOptimize(result.data());
    }
    tally.report(state);
}

BENCHMARK(captureImages)->Arg(25)->Arg(1000)->Arg(100'000)->Unit(benchmark::kMillisecond);
// Takes 2.8 GB.
BENCHMARK(captureImages)->Arg(1'000'000)->Iterations(1)->Unit(benchmark::kMillisecond);
BENCHMARK(plainStructsBaseline)->Arg(25)->Arg(1000)->Arg(100'000)->Unit(benchmark::kMillisecond);
BENCHMARK(plainStructsBaseline)->Arg(1'000'000)->Iterations(1)->Unit(benchmark::kMillisecond);

}  // namespace
