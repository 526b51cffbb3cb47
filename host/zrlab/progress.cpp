#include "host/zrlab/progress.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include <fmt/format.h>

#include "host/zrlab/terminal.h"

namespace host {

namespace {

constexpr std::chrono::milliseconds kTerminalPeriod{100};
constexpr std::chrono::seconds kPlainPeriod{5};

}  // namespace

Progress::Progress(const RunPlan& plan, const RunRecorder& recorder, std::string prefix)
    : _recorder(recorder), _prefix(std::move(prefix)) {
    for (const CountParameter& count : kCountParameters) {
        const platform::Number wanted = plan.experiment.parameter(count.parameter);
        if (wanted.isPresent()) {
            _count = &count;
            _wanted = wanted.asDouble();
        }
    }
    _timeout = plan.experiment.parameter(kTimeoutParameter).asDouble();
    if (_count != nullptr) {
        _thread = std::thread([this] { _show(); });
    }
}

Progress::~Progress() {
    if (!_thread.joinable()) {
        return;
    }
    {
        const platform::MutexLock lock(_mutex);
        _over = true;
    }
    _changed.notifyAll();
    _thread.join();
    Terminal::shared().status("");
}

void Progress::_show() {
    Terminal& terminal = Terminal::shared();
    const bool onTerminal = terminal.progressIsTerminal();
    const std::chrono::milliseconds period = onTerminal ? kTerminalPeriod : kPlainPeriod;
    auto next = _began + period;
    const platform::MutexLock lock(_mutex);
    while (!_over) {
        _changed.waitUntil(_mutex, next);
        if (_over || std::chrono::steady_clock::now() < next) {
            continue;
        }
        next += period;
        // The lock stays held: it guards only the end, which has to wait for this line.
        if (onTerminal) {
            terminal.status(_text());
        } else {
            terminal.line(_text());
        }
    }
}

std::string Progress::_text() const {
    const double elapsed =
        std::chrono::duration<double>(std::chrono::steady_clock::now() - _began).count();
    const auto count = static_cast<double>(_count->counted == Counted::Frames ? _recorder.frames()
                                                                              : _recorder.images());
    std::string text = fmt::format("{}{:.0f} of {:.6g} {}, {:.1f} per second", _prefix, count,
                                   _wanted, _count->plural, elapsed > 0 ? count / elapsed : 0.0);
    const double left = std::max(0.0, std::ceil(_timeout - elapsed));
    if (_timeout >= 0 && std::isfinite(left)) {
        text += fmt::format(", {:.6g} s until the time-out", left);
    }
    // Last, so that a narrow terminal cuts it first.
    constexpr int kWidth = 24;
    const double share = _wanted > 0 ? std::min(count / _wanted, 1.0) : 0.0;
    const int full = static_cast<int>(std::lround(share * kWidth));
    for (int at = 0; at < kWidth && Terminal::shared().progressIsTerminal(); ++at) {
        text += at == 0 ? "  " : "";
        text += at < full ? "━" : "╌";
    }
    return text;
}

}  // namespace host
