// Look-ups in dictionaries of the sizes that metadata, counter results and channel lists have.
#include <map>
#include <string>
#include <unordered_map>
#include <vector>

#include <benchmark/benchmark.h>

#include "platform/value.h"

namespace {

std::vector<std::string> keys(std::int64_t count) {
    std::vector<std::string> made;
    for (std::int64_t i = 0; i < count; ++i) {
        // Scattered, with a common beginning, as channel names have.
        made.push_back("channel " + std::to_string(i * 7919 % 100'003) + " errors");
    }
    return made;
}

template <class Find>
void lookUp(benchmark::State& state, const std::vector<std::string>& names, Find find) {
    for (auto _ : state) {
        for (const std::string_view name : names) {
            benchmark::DoNotOptimize(find(name));
        }
    }
    state.SetItemsProcessed(state.iterations() * state.range(0));
}

void dictionary(benchmark::State& state) {
    const auto names = keys(state.range(0));
    platform::MutableDictionary growing;
    for (const auto& name : names) {
        growing.set(name, 1);
    }
    const platform::Dictionary made(std::move(growing));
    lookUp(state, names, [&made](std::string_view name) { return made.number(name); });
}

void treeMapBaseline(benchmark::State& state) {
    const auto names = keys(state.range(0));
    std::map<std::string, platform::Value, std::less<>> made;
    for (const auto& name : names) {
        made.emplace(name, 1);
    }
    lookUp(state, names,
           [&made](std::string_view name) { return made.find(name)->second.asNumber(); });
}

void hashMapBaseline(benchmark::State& state) {
    struct Hash {
        using is_transparent = void;
        std::size_t operator()(std::string_view text) const {
            return std::hash<std::string_view>()(text);
        }
    };
    const auto names = keys(state.range(0));
    std::unordered_map<std::string, platform::Value, Hash, std::equal_to<>> made;
    for (const auto& name : names) {
        made.emplace(name, 1);
    }
    lookUp(state, names,
           [&made](std::string_view name) { return made.find(name)->second.asNumber(); });
}

BENCHMARK(dictionary)->Arg(8)->Arg(64)->Arg(1024);
BENCHMARK(treeMapBaseline)->Arg(8)->Arg(64)->Arg(1024);
BENCHMARK(hashMapBaseline)->Arg(8)->Arg(64)->Arg(1024);

}  // namespace
