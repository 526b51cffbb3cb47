// What the calling thread has allocated with operator new since it started.
#ifndef ZR_BENCHMARKS_ALLOCATIONS_H
#define ZR_BENCHMARKS_ALLOCATIONS_H

#include <cstdint>

struct Allocations {
    std::uint64_t count = 0;
    std::uint64_t bytes = 0;  // as asked for
};

Allocations allocationsOfThisThread();

#endif
