// A frame's metadata: described, and built and then described.
#include <string>

#include <benchmark/benchmark.h>

#include "benchmarks/allocations.h"
#include "benchmarks/metadata.h"

namespace {

template <class Contender>
void describe(benchmark::State& state) {
    const auto built = Contender::build(metadata::frameEntries());
    std::uint64_t frame = 0;
    const std::uint64_t before = allocationsOfThisThread().count;
    for (auto _ : state) {
        const auto description = Contender::describe(++frame, {}, built);
        if (description == nullptr) {
            state.SkipWithError("no description");
            break;
        }
        benchmark::DoNotOptimize(description.get());
        benchmark::ClobberMemory();
    }
    state.counters["allocations"] = static_cast<double>(allocationsOfThisThread().count - before) /
                                    static_cast<double>(state.iterations());
    state.SetItemsProcessed(state.iterations());
}

template <class Contender>
void buildAndDescribe(benchmark::State& state) {
    const metadata::Entries entries = metadata::frameEntries();
    std::uint64_t frame = 0;
    for (auto _ : state) {
        const auto description = Contender::describe(++frame, {}, Contender::build(entries));
        if (description == nullptr) {
            state.SkipWithError("no description");
            break;
        }
        benchmark::DoNotOptimize(description.get());
        benchmark::ClobberMemory();
    }
    state.SetItemsProcessed(state.iterations());
}

template <class... Contenders>
bool registerFor() {
    (benchmark::RegisterBenchmark((std::string("describe/") + Contenders::kName).c_str(),
                                  describe<Contenders>),
     ...);
    (benchmark::RegisterBenchmark((std::string("build/") + Contenders::kName).c_str(),
                                  buildAndDescribe<Contenders>),
     ...);
    return true;
}
[[maybe_unused]] const bool registered = registerFor<metadata::Here,
                                                     metadata::FlatHashMap,
                                                     metadata::HashMap,
                                                     metadata::TreeMap,
                                                     metadata::RapidJson,
                                                     metadata::Nlohmann>();

}  // namespace
