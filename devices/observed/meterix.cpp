#include "devices/observed/meterix.h"

#include <utility>

namespace observed {

namespace {

using platform::ErrorSlot;
using platform::MeterixChannels;
using platform::MeterixSamples;

class ObservedMeterix final : public platform::MeterixFacility {
  public:
    ObservedMeterix(std::shared_ptr<MeterixFacility> inner, Reporter reporter)
        : _inner(std::move(inner)), _reporter(std::move(reporter)) {}

    std::shared_ptr<const MeterixChannels> simpleChannels(ErrorSlot error) override {
        return _reporter.call({"simpleChannels()"}, error,
                              [&](ErrorSlot slot) { return _inner->simpleChannels(slot); });
    }

    std::shared_ptr<const MeterixSamples> sample(const MeterixChannels& channels,
                                                 ErrorSlot error) override {
        auto samples = _reporter.call(
            {"sample()"}, error, [&](ErrorSlot slot) { return _inner->sample(channels, slot); });
        if (samples != nullptr) {
            if (samples->size() != channels.size()) {
                _reporter.misused(platform::format("sample() returned %lu samples for %lu channels",
                                                   samples->size(), channels.size()));
            }
            _reporter.report([&](Observer& observer) { observer.countersSampled(*samples); });
        }
        return samples;
    }

    std::shared_ptr<const MeterixSamples> difference(const MeterixSamples& later,
                                                     const MeterixSamples& baseline,
                                                     ErrorSlot error) override {
        return _reporter.call({"difference()"}, error, [&](ErrorSlot slot) {
            return _inner->difference(later, baseline, slot);
        });
    }

  private:
    const std::shared_ptr<MeterixFacility> _inner;
    const Reporter _reporter;
};

}  // namespace

std::shared_ptr<platform::MeterixFacility> observeMeterix(
    std::shared_ptr<platform::MeterixFacility> facility, const Reporter& reporter) {
    return facility != nullptr ? std::make_shared<ObservedMeterix>(std::move(facility), reporter)
                               : nullptr;
}

}  // namespace observed
