// A stream that cannot be created, for want of memory. Every allocation of this program comes here.
#include <cstdlib>
#include <new>
#include <utility>

#include "tests/kirra/kirra_bench.h"

namespace {

thread_local bool nextAllocationFails = false;

}  // namespace

// Not inlined: otherwise g++ reports the pair as a mismatch.
[[gnu::noinline]] void* operator new(std::size_t size) {
    void* memory = std::exchange(nextAllocationFails, false) ? nullptr : std::malloc(size);
    return memory != nullptr ? memory : throw std::bad_alloc();
}
[[gnu::noinline]] void operator delete(void* memory) noexcept {
    std::free(memory);
}
[[gnu::noinline]] void operator delete(void* memory, std::size_t /*size*/) noexcept {
    std::free(memory);
}

namespace {

class WithoutMemory : public test::KirraTest {};

TEST_F(WithoutMemory, NoStreamIsCreated) {
    install();
    for (platform::ErrorSlot slot : {&error, platform::ErrorSlot()}) {
        const auto experiment = make(1, 60);
        nextAllocationFails = true;
        EXPECT_EQ(experiment->run(slot), nullptr);
        EXPECT_FALSE(nextAllocationFails);
    }
    EXPECT_THAT(error, test::IsPlainError(ZRKirraImageExperimentErrorDomain, 3,
                                          "Failed to create kirra stream."));
    EXPECT_THAT(journal(), ::testing::IsEmpty());
}

}  // namespace
