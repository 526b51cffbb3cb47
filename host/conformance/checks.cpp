#include "host/conformance/checks.h"

#include <utility>

namespace host {

using platform::MutexLock;

Checks::Checks(std::span<const Promise> promises, std::function<std::uint64_t()> unanswered)
    : _unanswered(std::move(unanswered)) {
    const MutexLock lock(_mutex);
    for (const Promise& promise : promises) {
        _records.push_back({.promise = promise});
    }
}

void Checks::kept(std::size_t check) {
    const MutexLock lock(_mutex);
    CheckRecord& record = _records[check];
    if (record.finding == Finding::NotChecked) {
        record.finding = Finding::Kept;
        record.detail.clear();
    }
}

void Checks::broken(std::size_t check, std::string_view how) {
    const MutexLock lock(_mutex);
    CheckRecord& record = _records[check];
    if (record.times++ == 0) {
        record.finding = Finding::Broken;
        record.detail = how;
    }
}

void Checks::giveUp(std::string_view why) {
    const MutexLock lock(_mutex);
    for (CheckRecord& record : _records) {
        if (record.finding == Finding::NotChecked && record.detail.empty()) {
            record.detail = why;
        }
    }
}

void Checks::notChecked(std::size_t check, std::string_view why) {
    const MutexLock lock(_mutex);
    if (_records[check].finding == Finding::NotChecked) {
        _records[check].detail = why;
    }
}

std::vector<CheckRecord> Checks::records() const {
    const MutexLock lock(_mutex);
    std::vector<CheckRecord> records = _records;
    for (CheckRecord& record : records) {
        if (_unanswered && !record.promise.isRecorded) {
            record = {.promise = record.promise, .detail = "a recording does not show it"};
        }
    }
    return records;
}

}  // namespace host
