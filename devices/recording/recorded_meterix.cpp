#include <utility>

#include "devices/recording/argument_values.h"
#include "devices/recording/recorded.h"

namespace recording {

namespace {

using platform::ErrorSlot;
using platform::MeterixChannels;
using platform::MeterixSamples;
using platform::Value;
using SamplesRef = std::shared_ptr<const MeterixSamples>;

Value valueOf(const SamplesRef& samples) {
    return samples != nullptr ? samplesValue(*samples) : Value();
}

class RecordedMeterix final : public platform::MeterixFacility {
  public:
    RecordedMeterix(std::shared_ptr<MeterixFacility> inner, RecorderRef recorder)
        : _inner(std::move(inner)), _recorder(std::move(recorder)) {}

    std::shared_ptr<const MeterixChannels> simpleChannels(ErrorSlot error) override {
        return _recorder->call(
            Operation::SimpleChannels, 0, {}, error,
            [&](ErrorSlot slot) { return _inner->simpleChannels(slot); },
            [](const auto& channels) {
                return channels != nullptr ? channelsValue(*channels) : Value();
            });
    }
    SamplesRef sample(const MeterixChannels& channels, ErrorSlot error) override {
        return _recorder->call(
            Operation::Sample, 0, channelsValue(channels), error,
            [&](ErrorSlot slot) { return _inner->sample(channels, slot); }, valueOf);
    }
    SamplesRef difference(const MeterixSamples& later,
                          const MeterixSamples& baseline,
                          ErrorSlot error) override {
        return _recorder->call(
            Operation::Difference, 0, platform::List{countsValue(later), countsValue(baseline)},
            error, [&](ErrorSlot slot) { return _inner->difference(later, baseline, slot); },
            valueOf);
    }

  private:
    const std::shared_ptr<MeterixFacility> _inner;
    const RecorderRef _recorder;
};

}  // namespace

std::shared_ptr<platform::MeterixFacility> recordMeterix(
    std::shared_ptr<platform::MeterixFacility> facility, const RecorderRef& recorder) {
    return facility != nullptr ? std::make_shared<RecordedMeterix>(std::move(facility), recorder)
                               : nullptr;
}

}  // namespace recording
