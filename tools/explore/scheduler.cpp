#include "tools/explore/scheduler.h"

#include <algorithm>
#include <cstring>
#include <memory>
#include <system_error>
#include <utility>

#include <cxxabi.h>
#include <link.h>
#include <pthread.h>
#include <sys/resource.h>
#include <ucontext.h>

#if defined(__SANITIZE_ADDRESS__)
#include <sanitizer/common_interface_defs.h>
#endif

namespace interleavings {

namespace {

constexpr std::uint64_t kAlive = 0x616c697665616c69;
constexpr std::size_t kStack = 256 * 1024;
constexpr std::size_t kMostSteps = 20'000;  // of one execution
constexpr TimePoint kBegin{std::chrono::hours(1)};
constexpr std::chrono::microseconds kYield{40};

// The program's thread-local variables, which every fiber has for itself.
struct ThreadLocals {
    std::byte* live = nullptr;
    std::vector<std::byte> fresh;

    ThreadLocals() {
        dl_iterate_phdr(
            [](dl_phdr_info* info, std::size_t, void* self) {
                auto& locals = *static_cast<ThreadLocals*>(self);
                for (int at = 0; at < info->dlpi_phnum; ++at) {
                    const auto& header = info->dlpi_phdr[at];
                    if (header.p_type == PT_TLS && info->dlpi_tls_data != nullptr) {
                        locals.live = static_cast<std::byte*>(info->dlpi_tls_data);
                        locals.fresh.resize(header.p_memsz);
                        std::memcpy(locals.fresh.data(),
                                    reinterpret_cast<const void*>(info->dlpi_addr + header.p_vaddr),
                                    header.p_filesz);
                    }
                }
                return 1;  // the program itself comes first
            },
            this);
    }
};
const ThreadLocals& threadLocals() {
    static const ThreadLocals locals;
    return locals;
}

struct Destructor {
    void (*destroy)(void*);
    void* object;
};

// What the C++ library keeps of exceptions per thread (__cxa_eh_globals).
struct Exceptions {
    void* caught = nullptr;
    unsigned uncaught = 0;
};

using Stack = std::unique_ptr<std::byte[]>;

struct Fiber {
    unsigned number = 0;
    std::string name;
    std::function<void()> body;
    ucontext_t context{};
    Stack stack;
    void* fakeStack = nullptr;
    std::vector<std::byte> locals;
    std::vector<Destructor> destructors;
    Exceptions exceptions;

    const Object* waitsAt = nullptr;  // null: ready
    const char* waitsFor = "";
    TimePoint deadline = TimePoint::max();
    bool loosely = false;
    bool ended = false;
};

struct World {
    std::vector<std::unique_ptr<Fiber>> fibers;
    std::vector<Stack> stacks;  // to use again
    std::vector<Fiber*> options;
    Fiber* running = nullptr;  // null outside of an execution
    Fiber* nextUp = nullptr;
    ucontext_t outside{};
    void* outsideFakeStack = nullptr;
    const void* outsideStack = nullptr;
    std::size_t outsideSize = 0;
    Exceptions outsideExceptions;

    const std::function<unsigned(std::size_t, const Choice&)>* choose = nullptr;
    Execution execution;
    unsigned spent = 0;
    std::size_t steps = 0;
    unsigned startsThatMayFail = 0;
    bool traces = false;
    bool leavesOutApart = false;
    bool stoodStill = false;
    TimePoint now = kBegin;
};

World world;
long liveObjects = 0;
unsigned objectsMade = 0;
bool objectsAreApart = false;

Exceptions& exceptionsOfThisThread() {
    return *reinterpret_cast<Exceptions*>(abi::__cxa_get_globals());
}

// Back to execute(). An ended fiber does not come back.
void leaveFiber() {
    Fiber& from = *world.running;
    const ThreadLocals& locals = threadLocals();
    std::copy_n(locals.live, locals.fresh.size(), from.locals.begin());
    from.exceptions = std::exchange(exceptionsOfThisThread(), world.outsideExceptions);
#if defined(__SANITIZE_ADDRESS__)
    __sanitizer_start_switch_fiber(from.ended ? nullptr : &from.fakeStack, world.outsideStack,
                                   world.outsideSize);
#endif
    swapcontext(&from.context, &world.outside);
#if defined(__SANITIZE_ADDRESS__)
    __sanitizer_finish_switch_fiber(from.fakeStack, &world.outsideStack, &world.outsideSize);
#endif
}

void enterFiber(Fiber& fiber) {
    world.running = &fiber;
    std::copy_n(fiber.locals.begin(), fiber.locals.size(), threadLocals().live);
    world.outsideExceptions = std::exchange(exceptionsOfThisThread(), fiber.exceptions);
#if defined(__SANITIZE_ADDRESS__)
    __sanitizer_start_switch_fiber(&world.outsideFakeStack, fiber.stack.get(), kStack);
#endif
    swapcontext(&world.outside, &fiber.context);
#if defined(__SANITIZE_ADDRESS__)
    __sanitizer_finish_switch_fiber(world.outsideFakeStack, nullptr, nullptr);
#endif
    if (fiber.ended) {
        world.stacks.push_back(std::move(fiber.stack));
    }
    world.running = nullptr;
}

unsigned choose(unsigned free, unsigned rare, unsigned all) {
    if (all <= 1) {
        return 0;
    }
    Choice choice{0, free, rare, all, world.spent};
    choice.chosen = (*world.choose)(world.execution.order.size(), choice);
    world.spent += choice.chosen >= free ? 1 : 0;
    world.execution.order.push_back(choice);
    return choice.chosen;
}

bool isReady(const Fiber& fiber) {
    return !fiber.ended && (fiber.waitsAt == nullptr || fiber.deadline <= world.now);
}

// What the running thread does: goes on unless it is preempted, lets another go first, or cannot go on.
enum class Stance { Stays, Yields, Waits };

// The thread that goes on; null when none can.
Fiber* next(Stance stance) {
    std::vector<Fiber*>& options = world.options;
    options.clear();
    const auto add = [&](auto such) {
        for (const auto& fiber : world.fibers) {
            if (!fiber->ended && such(*fiber)) {
                options.push_back(fiber.get());
            }
        }
        return static_cast<unsigned>(options.size());
    };
    if (stance == Stance::Stays) {
        options.push_back(world.running);
    }
    add([](const Fiber& fiber) { return isReady(fiber) && &fiber != world.running; });
    if (stance == Stance::Yields) {
        options.push_back(world.running);
    }
    const auto ready = static_cast<unsigned>(options.size());
    // Waits that end early: at their deadline, and for no reason.
    const unsigned rare = add(
        [](const Fiber& fiber) { return !isReady(fiber) && fiber.deadline != TimePoint::max(); });
    if (ready == 0) {  // everything waits: time passes
        world.stoodStill = true;
        const auto earliest = std::min_element(
            options.begin(), options.end(),
            [](const Fiber* a, const Fiber* b) { return a->deadline < b->deadline; });
        return earliest != options.end() ? *earliest : nullptr;
    }
    const unsigned all = add([](const Fiber& fiber) {
        return !isReady(fiber) && fiber.deadline == TimePoint::max() && fiber.loosely;
    });
    return options[choose(stance == Stance::Waits ? ready : 1, rare, all)];
}

void reschedule(Stance stance) {
    Fiber* const chosen = next(stance);
    if (chosen != nullptr && chosen->waitsAt != nullptr) {
        if (chosen->deadline != TimePoint::max()) {
            world.now = std::max(world.now, chosen->deadline);
        }
        chosen->waitsAt = nullptr;
        chosen->deadline = TimePoint::max();
    }
    if (chosen != world.running) {
        world.nextUp = chosen;
        leaveFiber();
    }
}

template <class... Args>
void trace(fmt::format_string<Args...> text, Args&&... args) {
    if (world.traces) {
        world.execution.trace += world.running->name + ": ";
        world.execution.trace += fmt::format(text, std::forward<Args>(args)...) + '\n';
    }
    expect(++world.steps <= kMostSteps, "the threads go on for ever");
}

void runFiber() {
#if defined(__SANITIZE_ADDRESS__)
    __sanitizer_finish_switch_fiber(nullptr, &world.outsideStack, &world.outsideSize);
#endif
    Fiber& self = *world.running;
    try {
        self.body();
        self.body = nullptr;
        while (!self.destructors.empty()) {
            const Destructor last = self.destructors.back();
            self.destructors.pop_back();
            last.destroy(last.object);
        }
    } catch (const std::exception& error) {
        expect(false, "an exception left a thread: {}", error.what());
    }
    self.ended = true;
    reschedule(Stance::Waits);
}

Fiber& addFiber(std::function<void()> body) {
    auto made = std::make_unique<Fiber>();
    made->number = static_cast<unsigned>(world.fibers.size());
    made->name = fmt::format("thread {}", made->number);
    made->body = std::move(body);
    made->locals = threadLocals().fresh;
    if (!world.stacks.empty()) {
        made->stack = std::move(world.stacks.back());
        world.stacks.pop_back();
    } else {
        made->stack = std::make_unique_for_overwrite<std::byte[]>(kStack);
    }
    getcontext(&made->context);
    made->context.uc_stack.ss_sp = made->stack.get();
    made->context.uc_stack.ss_size = kStack;
    made->context.uc_link = nullptr;
    makecontext(&made->context, runFiber, 0);
    return *world.fibers.emplace_back(std::move(made));
}

// Who waits, and for what.
std::string standstill() {
    std::string text = "nothing can go on:";
    for (const auto& fiber : world.fibers) {
        if (!fiber->ended) {
            text += fmt::format("\n  {} waits in {}", fiber->name, fiber->waitsFor);
        }
    }
    return text;
}

}  // namespace

Object::Object(const char* kind)
    : _mark(kAlive), _kind(kind), _number(++objectsMade), _apart(objectsAreApart) {
    ++liveObjects;
}

Object::~Object() {
    if (world.running != nullptr) {
        for (const auto& fiber : world.fibers) {
            expect(fiber->waitsAt != this, "a {} ends while {} waits at it", _kind, fiber->name);
        }
    }
    static_cast<volatile std::uint64_t&>(_mark) = 0;
    --liveObjects;
}

void Object::_expectAlive(const char* operation) const {
    expect(static_cast<const volatile std::uint64_t&>(_mark) == kAlive,
           "{} is called on an object that has ended", operation);
}

void Object::step(const char* operation) const {
    if (world.running == nullptr) {
        return;
    }
    _expectAlive(operation);
    if (isLeftOut()) {
        return;
    }
    trace("{} {} {}", operation, _kind, _number);
    reschedule(Stance::Stays);
    _expectAlive(operation);
}

bool Object::isLeftOut() const {
    return _apart && world.leavesOutApart;
}

void Object::wait(const char* operation, TimePoint deadline, bool loosely) {
    _expectAlive(operation);
    Fiber& self = *world.running;
    trace("waits in {} {} {}", operation, _kind, _number);
    self.waitsAt = this;
    self.waitsFor = operation;
    self.deadline = deadline;
    self.loosely = loosely;
    reschedule(Stance::Waits);
    if (!loosely) {
        _expectAlive(operation);
    }
}

void Object::wakeOne() {
    _expectAlive("wakeOne");
    std::vector<Fiber*> waiting;
    for (const auto& fiber : world.fibers) {
        if (fiber->waitsAt == this) {
            waiting.push_back(fiber.get());
        }
    }
    if (!waiting.empty()) {
        const auto all = static_cast<unsigned>(waiting.size());
        waiting[choose(all, all, all)]->waitsAt = nullptr;
    }
}

void Object::wakeAll() {
    for (const auto& fiber : world.fibers) {
        if (fiber->waitsAt == this) {
            fiber->waitsAt = nullptr;
        }
    }
}

void start(std::function<void()> body) {
    if (world.startsThatMayFail > 0 && choose(2, 2, 2) == 1) {
        --world.startsThatMayFail;
        trace("cannot start a thread");
        throw std::system_error(std::make_error_code(std::errc::resource_unavailable_try_again));
    }
    const Fiber& made = addFiber(std::move(body));
    step("starts {}", made.name);
}

void note(std::string_view text) {
    trace("{}", text);
}

void makeApart(bool apart) {
    objectsAreApart = apart;
}

void leaveOutApart() {
    world.leavesOutApart = true;
}

bool isTraced() {
    return world.traces && world.running != nullptr;
}

void stepAs(const std::string& operation) {
    if (world.running != nullptr) {
        trace("{}", operation);
        reschedule(Stance::Stays);
    }
}

void yield() {
    world.now += kYield;
    trace("yields");
    reschedule(Stance::Yields);
}

void letStartsFail(unsigned number) {
    world.startsThatMayFail = number;
}

unsigned thisThread() {
    return world.running->number;
}

bool stoodStill() {
    return world.stoodStill;
}

void reach(std::string_view what) {
    world.execution.reached.push_back(what);
}

void fail(std::string text) {
    if (world.execution.failure.empty()) {
        world.execution.failure = std::move(text);
    }
    if (world.running != nullptr) {
        world.nextUp = nullptr;
        leaveFiber();
        std::abort();  // never resumed
    }
}

Execution execute(const std::function<void()>& body,
                  const std::function<void()>& after,
                  const std::function<unsigned(std::size_t place, const Choice& from)>& choose,
                  bool traces) {
    const long liveBefore = liveObjects;
    world.fibers.clear();
    world.choose = &choose;
    world.execution = {};
    world.spent = 0;
    world.steps = 0;
    world.startsThatMayFail = 0;
    world.traces = traces;
    world.leavesOutApart = false;
    world.stoodStill = false;
    world.now = kBegin;
    objectsMade = 0;

    world.nextUp = &addFiber(body);
    world.fibers.front()->name = "host";
    while (world.nextUp != nullptr) {
        enterFiber(*std::exchange(world.nextUp, nullptr));
    }
    if (world.execution.failure.empty()) {
        const bool ended = std::all_of(world.fibers.begin(), world.fibers.end(),
                                       [](const auto& fiber) { return fiber->ended; });
        expect(ended, "{}", standstill());
    }
    if (world.execution.failure.empty()) {
        after();
        expect(liveObjects == liveBefore, "{} objects are left over", liveObjects - liveBefore);
    }
    return std::move(world.execution);
}

}  // namespace interleavings

// What the product asks the system for, where the answer is the scheduler's.

std::chrono::steady_clock::time_point std::chrono::steady_clock::now() noexcept {
    return interleavings::world.now;
}

extern "C" {

// Threads name themselves: so does the trace.
int pthread_setname_np(pthread_t /*thread*/, const char* name) {
    interleavings::world.running->name = name;
    return 0;
}

int setpriority(__priority_which_t /*which*/, id_t /*who*/, int /*priority*/) noexcept {
    return 0;
}

// Registers the destructor of a thread-local variable.
int __cxa_thread_atexit(void (*destroy)(void*), void* object, void* /*module*/) noexcept {
    if (interleavings::world.running != nullptr) {
        interleavings::world.running->destructors.push_back({destroy, object});
    }
    return 0;
}
}
