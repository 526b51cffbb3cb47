#include "host/store/store_listener.h"

#include <exception>
#include <utility>

#include <fmt/format.h>

namespace host {

namespace {

using Clock = std::chrono::steady_clock;

// For how long a run that ended may bring others with it.
constexpr std::chrono::milliseconds kDeliveryTime{1000};

}  // namespace

StoreListener::StoreListener(const StoreOptions& options, Complain complain)
    : _store(options.where)
    , _spool(options.spoolFolder)
    , _attachments(options.attachments)
    , _complain(std::move(complain))
    , _patience(options.patience) {}

void StoreListener::runEnded(const RunRecord& run) {
    const auto start = Clock::now();
    bool isDown = _patience <= std::chrono::milliseconds(0);
    try {
        if (!isDown) {
            _store.setPatience(_patience);
            try {
                _store.write(*_session, run, _attachments);
            } catch (const StoreProblem& problem) {
                isDown = true;
                _complainOnce(
                    _toldOfStore,
                    fmt::format("store {}; the run is kept in {} until the store takes it",
                                problem.what(), _spool.folder().string()));
            }
        }
        if (isDown) {
            _spool.add(*_session, run, _attachments);
        } else {
            isDown = !_deliver();
        }
    } catch (const std::exception& exception) {
        _complainOnce(_toldOfSpool, fmt::format("a run is not in the store {}: {}", _store.name(),
                                                exception.what()));
    }
    if (isDown) {
        _patience -= std::chrono::duration_cast<std::chrono::milliseconds>(Clock::now() - start);
    }
}

bool StoreListener::_deliver() {
    const Spool::Delivery delivery = _spool.deliver(_store, kDeliveryTime);
    for (const std::string& line : delivery.setAside) {
        _complain("store " + _store.name() + ": a run that waited for it was set aside: " + line);
    }
    if (delivery.problem.has_value()) {
        _complainOnce(_toldOfStore,
                      fmt::format("store {}; {} runs wait in {}", delivery.problem->what(),
                                  delivery.waiting, _spool.folder().string()));
    }
    return !delivery.problem.has_value();
}

void StoreListener::_complainOnce(bool& isTold, const std::string& line) {
    if (!std::exchange(isTold, true)) {
        _complain(line);
    }
}

}  // namespace host
