// What a log line costs when its level is off, and when it is on and the sink takes no time.
#include "platform/log.h"

#include <cstdio>

#include <benchmark/benchmark.h>

#include "platform/text_format.h"

namespace {

using platform::LogLevel;

class IdleSink final : public platform::LogSink {
  public:
    void write(const platform::LogLine& line) override { benchmark::DoNotOptimize(line); }
};

void writeLines(benchmark::State& state, LogLevel minimum) {
    platform::setLogSink(std::make_shared<IdleSink>(), minimum);
    const platform::Log log("benchmarks", "log");
    std::int64_t frame = 0;
    for (auto _ : state) {
        ++frame;
        log.write(LogLevel::Debug,
                  [frame] { return platform::format("Processing frame %d of %@", frame, "all"); });
        benchmark::DoNotOptimize(frame);
    }
    platform::setLogSink(nullptr, LogLevel::Default);
    state.SetItemsProcessed(state.iterations());
}

void lineThatIsOff(benchmark::State& state) {
    writeLines(state, LogLevel::Default);
}
void noLineBaseline(benchmark::State& state) {
    std::int64_t frame = 0;
    for (auto _ : state) {
        ++frame;
        benchmark::DoNotOptimize(frame);
    }
    state.SetItemsProcessed(state.iterations());
}
void lineThatIsOn(benchmark::State& state) {
    writeLines(state, LogLevel::Debug);
}
void printedLineBaseline(benchmark::State& state) {
    long long frame = 0;
    for (auto _ : state) {
        ++frame;
        char line[64];
        std::snprintf(line, sizeof line, "Processing frame %lld of %s", frame, "all");
        benchmark::DoNotOptimize(line);
    }
    state.SetItemsProcessed(state.iterations());
}

BENCHMARK(lineThatIsOff)->Name("log-off/here");
BENCHMARK(noLineBaseline)->Name("log-off/no line");
BENCHMARK(lineThatIsOn)->Name("log-on/here");
BENCHMARK(printedLineBaseline)->Name("log-on/snprintf");

}  // namespace
