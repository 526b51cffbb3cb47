#include "benchmarks/allocations.h"

#include <cstdlib>
#include <new>

namespace {

thread_local Allocations allocated;

}  // namespace

Allocations allocationsOfThisThread() {
    return allocated;
}

[[gnu::noinline]] void* operator new(std::size_t size) {
    ++allocated.count;
    allocated.bytes += size;
    void* memory = std::malloc(size);
    return memory != nullptr ? memory : throw std::bad_alloc();
}
[[gnu::noinline]] void* operator new(std::size_t size, std::align_val_t alignment) {
    ++allocated.count;
    allocated.bytes += size;
    const auto step = static_cast<std::size_t>(alignment);
    void* memory = std::aligned_alloc(step, (size + step - 1) / step * step);
    return memory != nullptr ? memory : throw std::bad_alloc();
}
[[gnu::noinline]] void operator delete(void* memory) noexcept {
    std::free(memory);
}
[[gnu::noinline]] void operator delete(void* memory, std::size_t /*size*/) noexcept {
    std::free(memory);
}
[[gnu::noinline]] void operator delete(void* memory, std::align_val_t /*alignment*/) noexcept {
    std::free(memory);
}
[[gnu::noinline]] void operator delete(void* memory,
                                       std::size_t /*size*/,
                                       std::align_val_t /*alignment*/) noexcept {
    std::free(memory);
}
