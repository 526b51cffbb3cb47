// A work queue against a naive model, a list: items run once each, in the order in which they were queued,
// with the tag of who queued them, and let go of what they own before the next one starts, also when items
// queue items, end holds and drop the queue.
//
// Input: operations, by the maker up to the first '.', then by each item up to the next one:
//   q     queues an item
//   Q     queues an item that owns too much to fit inside
//   n     queues an item with a delay of 0, -1, NaN or minus infinity: it is not delayed
//   d     queues an item with a delay of a nanosecond; these have an order of their own, and do nothing
//   h, u  hold the queue, and end a hold
//   g     changes the tag
//   x     drops the queue
#include "platform/work_queue.h"

#include <array>
#include <deque>
#include <limits>

#include "fuzz/expect.h"
#include "fuzz/input.h"
#include "platform/run_tag.h"
#include "platform/sync.h"
#include "tests/platform/threads.h"
#include "tests/support/eventually.h"

namespace {

using fuzz::expect;
using platform::WorkQueue;

constexpr double kNoDelay[] = {0, -1, std::numeric_limits<double>::quiet_NaN(),
                               -std::numeric_limits<double>::infinity()};

// How an item is queued, where it is not with one of those delays.
constexpr double kSmall = 1;
constexpr double kLarge = 2;

// What both do with the program.
template <class Queue>
class Player {
  public:
    Player(Queue& queue, fuzz::Input input) : _queue(queue), _input(input) {}

    // One item's operations, or the maker's.
    void carryOn(platform::RunTag tag) {
        for (char letter = '.';
             !_input.isAtEnd() && (letter = _input.letter("qQndhugx.")) != '.';) {
            switch (letter) {
                case 'q':
                    _queue.queue(++_queued, tag, kSmall);
                    break;
                case 'Q':
                    _queue.queue(++_queued, tag, kLarge);
                    break;
                case 'n':
                    _queue.queue(++_queued, tag, kNoDelay[_input.below(4)]);
                    break;
                case 'd':
                    _queue.delay(++_delayed);
                    break;
                case 'h':
                    _queue.hold();
                    break;
                case 'u':
                    _queue.letGo();
                    break;
                case 'g':
                    tag = _input.below(8);
                    break;
                case 'x':
                    _queue.drop();
                    break;
            }
        }
    }

  private:
    Queue& _queue;
    fuzz::Input _input;
    std::size_t _queued = 0;
    std::size_t _delayed = 0;
};

struct Model {
    explicit Model(fuzz::Input input) : player(*this, input) {
        player.carryOn(0);
        while (!items.empty()) {
            const auto [number, tag] = items.front();
            items.pop_front();
            events += "run " + std::to_string(number) + " tag " + std::to_string(tag) + "\n";
            ++count;
            player.carryOn(tag);
            events += "gone " + std::to_string(number) + "\n";
        }
    }
    void queue(std::size_t number, platform::RunTag tag, double /*how*/) {
        if (!isDropped) {
            items.emplace_back(number, tag);
        }
    }
    void delay(std::size_t number) {
        if (!isDropped) {
            delayed += "delayed " + std::to_string(number) + "\n";
            ++delayedCount;
        }
    }
    void hold() {}
    void letGo() {}
    void drop() { isDropped = true; }

    Player<Model> player;
    std::deque<std::pair<std::size_t, platform::RunTag>> items;
    bool isDropped = false;
    std::string events;
    std::string delayed;
    std::size_t count = 0;
    std::size_t delayedCount = 0;
};

// Outlive what a thread may still do with them. Each item that is over counts; a queue that loses one lets the
// maker wait for it in vain.
platform::Semaphore over{0};
platform::Semaphore delayedOver{0};

void waitFor(platform::Semaphore& semaphore, std::size_t count) {
    for (; count > 0; --count) {
        expect(semaphore.try_acquire_for(test::kGenerous), "no item is lost");
    }
}

struct Real {
    // Belongs to an item, and says when it is let go of.
    struct Trace {
        Trace(Real* to, std::size_t of) : real(to), number(of) {}
        Trace(Trace&& other) noexcept
            : real(std::exchange(other.real, nullptr)), number(other.number) {}
        ~Trace() {
            if (real != nullptr) {
                real->events += "gone " + std::to_string(number) + "\n";
                over.release();
            }
        }
        void run() const {
            const platform::RunTag tag = platform::currentRunTag();
            real->events += "run " + std::to_string(number) + " tag " + std::to_string(tag) + "\n";
            real->player.carryOn(tag);
        }
        Real* real;
        std::size_t number;
    };

    // The first item waits until the maker has queued its own.
    Real(fuzz::Input input, const Model& model) : player(*this, input) {
        platform::Semaphore start{0};
        made->async([&start] {
            start.acquire();
            over.release();
        });
        player.carryOn(0);
        start.release();
        waitFor(over, 1 + model.count);
        waitFor(delayedOver, model.delayedCount);
    }

    void queue(std::size_t number, platform::RunTag tag, double how) {
        if (made == nullptr) {
            return;
        }
        const platform::RunTagScope scope(tag);
        if (how == kLarge) {
            made->async([trace = Trace(this, number), large = std::array<char, 100>()] {
                static_cast<void>(large);
                trace.run();
            });
        } else if (how == kSmall) {
            made->async([trace = Trace(this, number)] { trace.run(); });
        } else {
            made->after(std::chrono::duration<double>(how),
                        [trace = Trace(this, number)] { trace.run(); });
        }
    }
    void delay(std::size_t number) {
        if (made != nullptr) {
            made->after(std::chrono::nanoseconds(1), [this, number] {
                delayed += "delayed " + std::to_string(number) + "\n";
                delayedOver.release();
            });
        }
    }
    void hold() {
        if (made != nullptr) {
            holds.push_back(std::make_unique<WorkQueue::Hold>(*made));
        }
    }
    void letGo() {
        if (!holds.empty()) {
            holds.pop_back();
        }
    }
    void drop() { made = nullptr; }

    std::unique_ptr<WorkQueue> made =
        std::make_unique<WorkQueue>("fuzz", WorkQueue::Priority::UserInteractive);
    std::vector<std::unique_ptr<WorkQueue::Hold>> holds;
    std::string events;
    std::string delayed;
    Player<Real> player;
};

// Waits until the threads of the queue and of the delayed items have ended: no run sees those of another.
void waitForThreads() {
    static const auto without = test::threadCount();
    expect(test::eventually([&] { return test::threadCount() <= without; }), "no thread is left");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const fuzz::Input input(data, size);
    waitForThreads();
    const Model model(input);
    Real real(input, model);
    real.holds.clear();
    real.drop();
    waitForThreads();
    if (real.events != model.events) {
        std::fprintf(stderr, "the model:\n%sthe queue:\n%s", model.events.c_str(),
                     real.events.c_str());
    }
    expect(real.events == model.events, "the order of items");
    expect(real.delayed == model.delayed, "the order of delayed items");
    return 0;
}
