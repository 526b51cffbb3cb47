// Google Benchmark's main, in a process of two threads: reference counts and the allocator then work as they
// do in a process that has a device.
#include <semaphore>
#include <thread>

#include <benchmark/benchmark.h>

int main(int count, char** arguments) {
    std::binary_semaphore over(0);
    std::jthread companion([&over] { over.acquire(); });
    benchmark::Initialize(&count, arguments);
    if (!benchmark::ReportUnrecognizedArguments(count, arguments)) {
        benchmark::RunSpecifiedBenchmarks();
    }
    over.release();
    return 0;
}
