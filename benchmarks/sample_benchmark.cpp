// A snapshot's samples become measurements, and the sixty expected ones measured results.
#include <algorithm>
#include <map>
#include <memory>
#include <random>
#include <string>
#include <unordered_map>
#include <vector>

#include <benchmark/benchmark.h>

#include "benchmarks/metadata.h"
#include "platform/string_key.h"
#include "vantor_counters/counter_analysis.h"
#include "vantor_counters/counter_report.h"
#include "vantor_counters/expected_channels.h"

namespace {

// As many channels, the expected ones among them, in no order that is the same for every contender.
platform::MeterixSamples channels(std::int64_t count) {
    std::vector<std::string> names(kVantorCounterChannelNames.begin(),
                                   kVantorCounterChannelNames.end());
    while (names.size() < static_cast<std::size_t>(count)) {
        names.push_back("channel " + std::to_string(names.size()) + " errors");
    }
    std::mt19937 random(1);
    std::shuffle(names.begin(), names.end(), random);
    platform::MeterixSamples samples;
    for (std::string& name : names) {
        samples.emplace_back(WLMeterixChannel(std::make_shared<const WLMeterixChannelDescription>(
                                                  std::move(name), "Q71ISP", "Q71ISP Events"),
                                              0));
    }
    return samples;
}

struct Here {
    static constexpr const char* kName = "here";
    static ZRAnalysisResultRef run(const platform::MeterixSamples& samples) {
        ZRExperimentResult result;
        storeMeasurements(samples, result);
        return ZRVantorMeterixAnalysis().analyzeExperimentResult(result, nullptr);
    }
};

// The same measurements, measured results and limits; the measurements in another map.
template <class Map>
struct OtherMap {
    static ZRAnalysisResultRef run(const platform::MeterixSamples& samples) {
        Map measurements;
        for (const WLMeterixSample& sample : samples) {
            measurements.insert_or_assign(
                sample.channel().channelDescription().name(),
                std::make_shared<const Measurement>(sample.channel().count().asDouble(),
                                                    ZRDimensionlessUnit::events()));
        }
        auto analysis = std::make_shared<ZRAnalysisResult>();
        for (const std::string_view name : kVantorCounterChannelNames) {
            const auto found = measurements.find(name);
            if (found == measurements.end()) {
                return nullptr;
            }
            auto measured = std::make_shared<ZRMeasuredResult>(std::string(name), found->second);
            auto limit = std::make_shared<ZRLimit>("Max Reports");
            const auto zero =
                std::make_shared<const Measurement>(0.0, ZRDimensionlessUnit::events());
            limit->setLowerBound(std::make_shared<const ZRBound>(zero, false));
            limit->setUpperBound(std::make_shared<const ZRBound>(zero, false));
            measured->setLimit(std::move(limit));
            analysis->measuredResults().push_back(std::move(measured));
        }
        return analysis;
    }
};
struct TreeMap : OtherMap<std::map<std::string, MeasurementRef, std::less<>>> {
    static constexpr const char* kName = "std::map";
};
struct HashMap
    : OtherMap<
          std::unordered_map<std::string, MeasurementRef, metadata::TextHash, std::equal_to<>>> {
    static constexpr const char* kName = "std::unordered_map";
};

// Each sample's name is read and hashed, and nothing made of it: what the samples' own memory costs.
void readNames(benchmark::State& state) {
    const platform::MeterixSamples samples = channels(state.range(0));
    for (auto _ : state) {
        for (const WLMeterixSample& sample : samples) {
            benchmark::DoNotOptimize(
                platform::StringKey(sample.channel().channelDescription().name()).hash());
        }
    }
    state.SetItemsProcessed(state.iterations() * state.range(0));
}

template <class Contender>
void measure(benchmark::State& state) {
    const platform::MeterixSamples samples = channels(state.range(0));
    for (auto _ : state) {
        const ZRAnalysisResultRef result = Contender::run(samples);
        if (result == nullptr || result->measuredResults().size() != 60) {
            state.SkipWithError("no analysis");
            break;
        }
        benchmark::DoNotOptimize(result.get());
        benchmark::ClobberMemory();
    }
    state.SetItemsProcessed(state.iterations() * state.range(0));
}

template <class... Contenders>
bool registerFor() {
    for (const std::int64_t count : {60, 1000, 10'000, 100'000}) {
        (benchmark::RegisterBenchmark((std::string("samples/") + Contenders::kName).c_str(),
                                      measure<Contenders>)
             ->Arg(count),
         ...);
        benchmark::RegisterBenchmark("samples/names read only", readNames)->Arg(count);
    }
    return true;
}
[[maybe_unused]] const bool registered = registerFor<Here, TreeMap, HashMap>();

}  // namespace
