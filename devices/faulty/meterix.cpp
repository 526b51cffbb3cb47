#include <utility>

#include "devices/faulty/decorators.h"

namespace faulty {

namespace {

using platform::ErrorSlot;
using platform::MeterixChannels;
using platform::MeterixSamples;
using ChannelsRef = std::shared_ptr<const MeterixChannels>;
using SamplesRef = std::shared_ptr<const MeterixSamples>;

constexpr Way kChannelWays[] = {Way::WithError, Way::WithoutError, Way::Empty};
constexpr Way kSampleWays[] = {Way::WithError, Way::WithoutError, Way::AbsentValue, Way::Empty};

SamplesRef damaged(const SamplesRef& samples, Way way) {
    auto result = std::make_shared<MeterixSamples>();
    if (way == Way::AbsentValue && samples != nullptr) {
        for (const WLMeterixSample& sample : *samples) {
            result->emplace_back(WLMeterixChannel(sample.channel().sharedDescription(), {}));
        }
    }
    return result;
}

class FaultyMeterix final : public platform::MeterixFacility {
  public:
    FaultyMeterix(std::shared_ptr<MeterixFacility> inner, InjectorRef injector)
        : _inner(std::move(inner)), _injector(std::move(injector)) {}

    ChannelsRef simpleChannels(ErrorSlot error) override {
        return _injector->call(
            "simpleChannels", {}, kChannelWays, error,
            [&] { return _inner->simpleChannels(error); },
            [](const auto& /*channels*/, Way /*way*/) -> ChannelsRef {
                return std::make_shared<const MeterixChannels>();
            });
    }
    SamplesRef sample(const MeterixChannels& channels, ErrorSlot error) override {
        return _injector->call(
            "sample", {}, kSampleWays, error, [&] { return _inner->sample(channels, error); },
            damaged);
    }
    SamplesRef difference(const MeterixSamples& later,
                          const MeterixSamples& baseline,
                          ErrorSlot error) override {
        return _injector->call(
            "difference", {}, kSampleWays, error,
            [&] { return _inner->difference(later, baseline, error); }, damaged);
    }

  private:
    const std::shared_ptr<MeterixFacility> _inner;
    const std::shared_ptr<Injector> _injector;
};

}  // namespace

std::shared_ptr<platform::MeterixFacility> decorateMeterix(
    std::shared_ptr<platform::MeterixFacility> facility, InjectorRef injector) {
    return std::make_shared<FaultyMeterix>(std::move(facility), std::move(injector));
}

}  // namespace faulty
