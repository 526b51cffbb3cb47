// Runs that lack memory. Every allocation of this program comes here.
#include <cstdlib>
#include <new>

#include "platform/services.h"
#include "tests/kirra/kirra_bench.h"
#include "tests/support/hand_fed_sensor.h"

namespace {

thread_local int allocationsToFailure = 0;  // 0: none fails

bool allocationFails() {
    return allocationsToFailure > 0 && --allocationsToFailure == 0;
}

}  // namespace

// Not inlined: otherwise g++ reports the pair as a mismatch.
[[gnu::noinline]] void* operator new(std::size_t size) {
    void* memory = allocationFails() ? nullptr : std::malloc(size);
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
        allocationsToFailure = 1;
        EXPECT_EQ(experiment->run(slot), nullptr);
        EXPECT_EQ(allocationsToFailure, 0);
    }
    EXPECT_THAT(error, test::IsPlainError(ZRKirraImageExperimentErrorDomain, 3,
                                          "Failed to create kirra stream."));
    EXPECT_THAT(journal(), ::testing::IsEmpty());
}

// Once it is opened, the n-th allocation fails.
struct StarvingSensor final : test::HandFedSensor {
    explicit StarvingSensor(int allocations) : n(allocations) {}
    void scheduleWithRunLoop(const std::shared_ptr<platform::RunLoop>& /*runLoop*/,
                             std::string_view /*mode*/) override {
        allocationsToFailure = n;
    }
    bool close(platform::ErrorSlot /*error*/) override {
        ++closed;
        return true;
    }
    const int n;
    int closed = 0;
};

TEST_F(WithoutMemory, AnOpenedStreamIsClosed) {
    install();
    auto services = platform::services();
    int failures = 0;
    for (bool failed = true; failed; failures += failed ? 1 : 0) {
        const auto sensor = std::make_shared<StarvingSensor>(failures + 1);
        services.hid = std::make_shared<test::OneSensorBus>(sensor);
        platform::installServices(services);
        const auto experiment = make(1, 60);
        try {
            experiment->run(nullptr);
            failed = false;
        } catch (const std::bad_alloc&) {
        }
        allocationsToFailure = 0;
        EXPECT_EQ(sensor->closed, 1) << "allocation " << sensor->n << " fails";
    }
    EXPECT_GT(failures, 0);
}

}  // namespace
