#include "host/store/store_listener.h"

#include <exception>
#include <utility>

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/record/run_text.h"

namespace host {

namespace {

using Clock = std::chrono::steady_clock;

}  // namespace

StoreListener::StoreListener(const StoreOptions& options, Complain complain)
    : _store(options.where)
    , _spool(options.spoolFolder)
    , _attachments(options.attachments)
    , _deliveryTime(options.deliveryTime)
    , _complain(std::move(complain))
    , _patience(options.patience) {}

void StoreListener::runEnded(const RunRecord& run) {
    const auto start = Clock::now();
    if (_patience > std::chrono::milliseconds(0)) {
        _store.setPatience(_patience);
        if (_write(run)) {
            _deliver();
            return;
        }
    }
    _keep(run);
    _patience -= std::chrono::duration_cast<std::chrono::milliseconds>(Clock::now() - start);
}

bool StoreListener::_write(const RunRecord& run) {
    try {
        _store.write(*_session, run, _attachments);
        return true;
    } catch (const std::exception& exception) {
        _complainOnce(fmt::format("store {}; runs wait in {} until it takes them",
                                  plainLine(exception.what()), _spool.folder().string()));
        return false;
    }
}

// One that cannot be kept is lost: said of each.
void StoreListener::_keep(const RunRecord& run) {
    try {
        _spool.add(*_session, run, _attachments);
    } catch (const std::exception& exception) {
        _complain(fmt::format("store {}: run {} is not stored and cannot wait: {}", _store.name(),
                              plainLine(run.uuid), plainLine(exception.what())));
    }
}

void StoreListener::_deliver() {
    const auto start = Clock::now();
    const Spool::Delivery delivery = _spool.deliver(_store, _deliveryTime);
    for (const std::string& line : delivery.setAside) {
        _complain(
            fmt::format("store {}: a run that waited was set aside: {}", _store.name(), line));
    }
    if (delivery.problem.has_value()) {
        _complainOnce(fmt::format("store {}; {} in {}", *delivery.problem,
                                  plural(delivery.waiting, "run waits", "runs wait"),
                                  _spool.folder().string()));
        _patience -= std::chrono::duration_cast<std::chrono::milliseconds>(Clock::now() - start);
    }
}

void StoreListener::_complainOnce(const std::string& line) {
    if (!std::exchange(_isTold, true)) {
        _complain(line);
    }
}

}  // namespace host
