// Google Benchmark's main, in a process of two threads: reference counts and the allocator then work as they
// do in a process that has a device. Fails when the filter matches nothing.
#include <semaphore>
#include <thread>

#include <benchmark/benchmark.h>

int main(int count, char** arguments) {
    std::binary_semaphore over(0);
    std::jthread companion([&over] { over.acquire(); });
    benchmark::Initialize(&count, arguments);
    const bool ran = !benchmark::ReportUnrecognizedArguments(count, arguments) &&
                     benchmark::RunSpecifiedBenchmarks() > 0;
    over.release();
    return ran ? 0 : 1;
}
