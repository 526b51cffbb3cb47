// An image's way from its record to the dictionary in the result: the whole of a run of the image
// experiment, whose sensor sends all reports in one turn of the run loop.
#include <cstring>
#include <vector>

#include <rapidjson/document.h>

#include <benchmark/benchmark.h>
#include <nlohmann/json.hpp>

#include "benchmarks/allocations.h"
#include "kirra/image_experiment.h"
#include "platform/display.h"
#include "platform/run_loop.h"
#include "platform/services.h"
#include "tests/support/hand_fed_sensor.h"

namespace {

constexpr std::size_t kSamples = ZRKirraMendraImage::kSampleCount;

KirraImage record() {
    KirraImage image;
    for (std::size_t at = 0; at < image.bytes.size(); ++at) {
        image.bytes[at] = static_cast<std::byte>(at);
    }
    return image;
}

struct BurstSensor final : test::HandFedSensor {
    explicit BurstSensor(std::int64_t count) : images(count) {}

    void scheduleWithRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                             std::string_view mode) override {
        source = std::make_shared<platform::RunLoopSource>([this] {
            for (std::int64_t image = 0; image < images; ++image) {
                callback(118, report.bytes, nullptr);
            }
        });
        runLoop->addSource(source, mode);
        source->signal();
    }
    void unscheduleFromRunLoop(const std::shared_ptr<platform::RunLoop>& runLoop,
                               std::string_view mode) override {
        runLoop->removeSource(source, mode);
    }

    const std::int64_t images;
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

void here(benchmark::State& state) {
    const auto display = std::make_shared<PoweredDisplay>();
    platform::installServices(
        {.hid = std::make_shared<test::OneSensorBus>(std::make_shared<BurstSensor>(state.range(0))),
         .display = display,
         .registry = display});
    const auto runLoop = platform::RunLoop::forThisThread();
    const Allocations before = allocationsOfThisThread();
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
    const Allocations after = allocationsOfThisThread();
    const auto images = state.iterations() * state.range(0);
    state.SetItemsProcessed(images);
    state.counters["allocations"] =
        static_cast<double>(after.count - before.count) / static_cast<double>(images);
    state.counters["bytes"] =
        static_cast<double>(after.bytes - before.bytes) / static_cast<double>(images);
    platform::installServices({});
}

// A record read as a peer would: from the bytes, without a step in between.
struct Fields {
    explicit Fields(const KirraImage& image) {
        std::memcpy(&frameID, &image.bytes[4], 4);
        std::memcpy(&timestamp, &image.bytes[12], 4);
        std::memcpy(i, &image.bytes[16], sizeof i);
        std::memcpy(q, &image.bytes[208], sizeof q);
        std::memcpy(&temperature, &image.bytes[788], 4);
    }
    std::uint32_t frameID;
    std::uint32_t timestamp;
    std::int32_t i[kSamples];
    std::int32_t q[kSamples];
    float temperature;
};

rapidjson::Value samples(const std::int32_t (&from)[kSamples],
                         rapidjson::Document::AllocatorType& memory) {
    rapidjson::Value list(rapidjson::kArrayType);
    list.Reserve(kSamples, memory);
    for (const std::int32_t sample : from) {
        list.PushBack(sample, memory);
    }
    return list;
}

void rapidJson(benchmark::State& state) {
    const KirraImage image = record();
    for (auto _ : state) {
        rapidjson::Document images(rapidjson::kArrayType);
        auto& memory = images.GetAllocator();
        for (std::int64_t at = 0; at < state.range(0); ++at) {
            benchmark::DoNotOptimize(image.bytes.data());
            benchmark::ClobberMemory();
            const Fields fields(image);
            rapidjson::Value object(rapidjson::kObjectType);
            object.AddMember("frameID", fields.frameID, memory);
            object.AddMember("dScanI", samples(fields.i, memory), memory);
            object.AddMember("dScanQ", samples(fields.q, memory), memory);
            object.AddMember("tmonDataInC", fields.temperature, memory);
            object.AddMember("timestampInMilliseconds", fields.timestamp, memory);
            images.PushBack(object, memory);
        }
        benchmark::DoNotOptimize(images);
        benchmark::ClobberMemory();
    }
    state.SetItemsProcessed(state.iterations() * state.range(0));
}

void nlohmannJson(benchmark::State& state) {
    const KirraImage image = record();
    for (auto _ : state) {
        nlohmann::json images = nlohmann::json::array();
        for (std::int64_t at = 0; at < state.range(0); ++at) {
            benchmark::DoNotOptimize(image.bytes.data());
            benchmark::ClobberMemory();
            const Fields fields(image);
            images.push_back({{"frameID", fields.frameID},
                              {"dScanI", fields.i},
                              {"dScanQ", fields.q},
                              {"tmonDataInC", fields.temperature},
                              {"timestampInMilliseconds", fields.timestamp}});
        }
        benchmark::DoNotOptimize(images);
        benchmark::ClobberMemory();
    }
    state.SetItemsProcessed(state.iterations() * state.range(0));
}

void copiedBytes(benchmark::State& state) {
    const KirraImage image = record();
    for (auto _ : state) {
        std::vector<KirraImage> images;
        images.reserve(static_cast<std::size_t>(state.range(0)));
        for (std::int64_t at = 0; at < state.range(0); ++at) {
            images.push_back(image);
        }
        benchmark::DoNotOptimize(images.data());
        benchmark::ClobberMemory();
    }
    state.SetItemsProcessed(state.iterations() * state.range(0));
}

BENCHMARK(here)->Name("image/here")->Arg(1000)->Arg(10'000);
BENCHMARK(rapidJson)->Name("image/RapidJSON")->Arg(1000);
BENCHMARK(nlohmannJson)->Name("image/nlohmann::json")->Arg(1000);
BENCHMARK(copiedBytes)->Name("image/copied bytes")->Arg(1000);

}  // namespace
