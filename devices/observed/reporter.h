// Reporter: what the decorators report through.
#ifndef ZR_DEVICES_OBSERVED_REPORTER_H
#define ZR_DEVICES_OBSERVED_REPORTER_H

#include <memory>
#include <string>
#include <string_view>
#include <utility>

#include "devices/observed/observer.h"
#include "platform/error.h"
#include "platform/text_format.h"

namespace observed {

// A call to the device, as reports name it.
struct Call {
    std::string_view operation;  // with its parentheses
    std::string_view property = {};

    std::string text() const {
        return property.empty() ? std::string(operation)
                                : platform::format("%@ of %@", operation, property);
    }
};

// Any thread.
class Reporter {
  public:
    explicit Reporter(std::weak_ptr<Observer> observer) : _observer(std::move(observer)) {}

    // Calls `report` with the observer, unless it is gone.
    template <class Report>
    void report(Report report) const {
        if (const auto observer = _observer.lock()) {
            report(*observer);
        }
    }

    void misused(std::string_view what) const {
        report([&](Observer& observer) { observer.misused(what); });
    }
    // "CALL was called WHEN".
    void misused(const Call& call, std::string_view when) const {
        report([&](Observer& observer) {
            observer.misused(platform::format("%@ was called %@", call, when));
        });
    }

    // Calls the device with a slot and reports the error that ends up there; then hands it on.
    template <class Operation>
    auto call(const Call& call, platform::ErrorSlot error, Operation operation) const {
        platform::ErrorRef stored;
        auto result = operation(&stored);
        if (stored != nullptr) {
            report([&](Observer& observer) { observer.errorReported(call.text(), stored); });
            if (error != nullptr) {
                *error = std::move(stored);
            }
        }
        return result;
    }

  private:
    std::weak_ptr<Observer> _observer;
};

}  // namespace observed

#endif
