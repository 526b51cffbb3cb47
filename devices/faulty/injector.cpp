#include "devices/faulty/injector.h"

#include <algorithm>
#include <memory>
#include <string>

#include "devices/faulty/faulty_device.h"

namespace faulty {

std::optional<Strike> Injector::take(StepKind kind,
                                     std::string_view operation,
                                     std::string_view detail,
                                     std::span<const Way> ways) {
    const platform::MutexLock lock(_mutex);
    Taken& taken = _taken[static_cast<std::size_t>(kind)];
    Step step{.place = {kind, ++taken.count}, .operation = std::string(operation), .ways = ways};
    if (!detail.empty()) {
        step.operation += ' ';
        step.operation += detail;
    }
    const auto fault = std::find_if(_faults.begin(), _faults.end(), [&](const Fault& one) {
        return one.place == step.place &&
               std::find(ways.begin(), ways.end(), one.way) != ways.end();
    });
    std::optional<Strike> strike;
    if (fault != _faults.end()) {
        strike = Strike{.fault = *fault, .text = step.text(fault->way), .error = nullptr};
        if (fault->way == Way::WithError) {
            strike->error = std::make_shared<const platform::Error>(
                kErrorDomain, static_cast<std::int64_t>(step.place.number), strike->text);
        }
        _strikes.push_back(*strike);
    }
    if (step.place.number <= FaultyDevice::kMostSteps) {
        taken.first.push_back(std::move(step));
    }
    return strike;
}

std::vector<Step> Injector::steps() const {
    const platform::MutexLock lock(_mutex);
    std::vector<Step> steps;
    for (const Taken& taken : _taken) {
        steps.insert(steps.end(), taken.first.begin(), taken.first.end());
    }
    return steps;
}

std::vector<Strike> Injector::strikes() const {
    const platform::MutexLock lock(_mutex);
    return _strikes;
}

}  // namespace faulty
