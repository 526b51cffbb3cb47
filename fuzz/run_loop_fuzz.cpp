// A run loop against a naive model: a program of operations, which callbacks carry on, gives the same
// order of events on both. The clock stands still but where the program sets it.
//
// Input: operations, each a letter and what it needs (sources 0 to 3, observers 0 to 3, modes 0 to 3):
//   s     signals a source
//   a, r  add and remove a source in a mode
//   o, p  add and remove an observer in a mode
//   t     lets a quarter of a second pass
//   x, !  stop, and throw
//   R     runs a mode with one of eight limits
//   .     returns from the callback
// When a loop is about to wait for good, z lets the time pass, and any other digit adds and signals a source.
#include "platform/run_loop.h"

#include <cmath>

#include "fuzz/expect.h"
#include "fuzz/input.h"
#include "fuzz/naive_run_loop.h"

namespace {

using fuzz::NaiveLoop;

constexpr std::string_view kModes[] = {"a", "b", platform::kRunLoopDefaultMode,
                                       platform::kRunLoopCommonModes};
constexpr double kLimits[] = {0, -1, NAN, 0.5, 1, 10, INFINITY, 1e300};

// Plays the program on a loop and writes down what happens.
template <class Loop, class Source>
class Player {
  public:
    Player(Loop& loop, fuzz::Input input) : _loop(loop), _input(input) {
        fuzz::setNow(0);
        for (std::size_t k = 0; k < 4; ++k) {
            _sources.push_back(std::make_shared<Source>([this, k] {
                _say("source", k);
                _carryOn();
            }));
            _observers.push_back(_observer(platform::RunLoopAllActivities >> (k == 3 ? 6 : 0),
                                           1 - static_cast<int>(k) % 3,
                                           [this, k](std::uint32_t activity) {
                                               _say("observer", k * 1000 + activity);
                                               _carryOn();
                                           }));
        }
        _guard =
            _observer(platform::RunLoopBeforeWaiting, 99, [this](std::uint32_t) { _endWait(); });
        for (const std::string_view mode : kModes) {
            _loop.addObserver(_guard, mode);
        }
        while (!_input.isAtEnd()) {
            try {
                _carryOn();
            } catch (int number) {
                _say("thrown", static_cast<std::size_t>(number));
            }
        }
        for (const std::string_view mode : kModes) {
            _loop.removeObserver(_guard, mode);
            for (std::size_t k = 0; k < 4; ++k) {
                _loop.removeSource(_sources[k], mode);
                _loop.removeObserver(_observers[k], mode);
            }
        }
    }

    std::string events;

  private:
    static auto _observer(std::uint32_t activities,
                          int order,
                          std::function<void(std::uint32_t)> callback) {
        return std::make_shared<platform::RunLoopObserver>(
            platform::RunLoopObserver{activities, order, std::move(callback)});
    }
    void _say(const char* what, std::size_t number) {
        events += what;
        events += ' ' + std::to_string(number) + '\n';
    }
    void _carryOn() {
        while (!_input.isAtEnd()) {
            const char letter = _input.letter("saroptx!R.");
            const auto needs = [letter](std::string_view letters) {
                return letters.find(letter) != std::string_view::npos;
            };
            const std::size_t k = needs("sarop") ? _input.below(4) : 0;
            const std::string_view mode = needs("aropR") ? kModes[_input.below(4)] : "";
            switch (letter) {
                case 's':
                    _sources[k]->signal();
                    break;
                case 'a':
                    _loop.addSource(_sources[k], mode);
                    break;
                case 'r':
                    _loop.removeSource(_sources[k], mode);
                    break;
                case 'o':
                    _loop.addObserver(_observers[k], mode);
                    break;
                case 'p':
                    _loop.removeObserver(_observers[k], mode);
                    break;
                case 't':
                    fuzz::setNow(fuzz::now() + 0.25);
                    break;
                case 'x':
                    _loop.stop();
                    break;
                case '!':
                    throw static_cast<int>(_input.rest().size());
                case 'R':
                    _run(mode, kLimits[_input.below(8)]);
                    break;
                default:
                    return;
            }
        }
    }
    void _run(std::string_view mode, double limit) {
        if (_runs.size() == 4) {
            return;
        }
        _runs.emplace_back(mode, limit);
        try {
            _say("ended", static_cast<std::size_t>(_loop.run(mode, limit)));
        } catch (...) {
            _runs.pop_back();
            throw;
        }
        _runs.pop_back();
    }
    // The last observer before each wait, so that none lasts.
    void _endWait() {
        const auto& [mode, limit] = _runs.back();
        const char byte = _input.letter("z0123");
        if (_input.isAtEnd() && limit > 10) {
            _loop.stop();
        } else if (_input.isAtEnd() || (byte == 'z' && !(limit > 10))) {
            fuzz::setNow(fuzz::now() + 100);
        } else {
            const auto& source = _sources[static_cast<std::size_t>(byte) % 4];
            _loop.addSource(source, mode);
            source->signal();
        }
    }

    Loop& _loop;
    fuzz::Input _input;
    std::vector<std::shared_ptr<Source>> _sources;
    std::vector<std::shared_ptr<platform::RunLoopObserver>> _observers;
    std::shared_ptr<platform::RunLoopObserver> _guard;
    std::vector<std::pair<std::string_view, double>> _runs;
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const fuzz::Input input(data, size);
    NaiveLoop model;
    const Player<NaiveLoop, NaiveLoop::Source> expected(model, input);
    const Player<platform::RunLoop, platform::RunLoopSource> real(
        *platform::RunLoop::forThisThread(), input);
    if (real.events != expected.events) {
        std::fprintf(stderr, "the model:\n%sthe run loop:\n%s", expected.events.c_str(),
                     real.events.c_str());
    }
    fuzz::expect(real.events == expected.events, "the order of events");
    return 0;
}
