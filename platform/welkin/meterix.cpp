#include "platform/welkin/meterix.h"

#include <algorithm>
#include <iterator>

#include "platform/services.h"

WLMeterixSnapshot::WLMeterixSnapshot(std::shared_ptr<platform::MeterixFacility> facility,
                                     std::shared_ptr<const platform::MeterixSamples> samples)
    : _facility(std::move(facility)), _samples(std::move(samples)) {}

const platform::MeterixSamples& WLMeterixSnapshot::samples() const {
    static const platform::MeterixSamples& none = *new platform::MeterixSamples;
    return _samples != nullptr ? *_samples : none;
}

WLMeterixSnapshot WLMeterixSnapshot::snapshotWithBaseline(const WLMeterixSnapshot& baseline,
                                                          platform::ErrorSlot error) const {
    if (!*this || !baseline) {
        return {};
    }
    return {_facility, _facility->difference(*_samples, *baseline._samples, error)};
}

WLMeterix::WLMeterix(std::shared_ptr<platform::MeterixFacility> facility,
                     std::shared_ptr<const platform::MeterixChannels> channels)
    : _facility(std::move(facility)), _channels(std::move(channels)) {}

WLMeterix WLMeterix::reportWithOnlySimpleChannels(platform::ErrorSlot error) {
    auto facility = platform::services().meterix;
    if (facility == nullptr) {
        return {};
    }
    auto channels = facility->simpleChannels(error);
    return {std::move(facility), std::move(channels)};
}

WLMeterix WLMeterix::reportByFilteringChannels(const ChannelFilter& filter) const {
    if (!*this) {
        return {};
    }
    platform::MeterixChannels kept;
    kept.reserve(_channels->size());
    std::copy_if(_channels->begin(), _channels->end(), std::back_inserter(kept),
                 [&filter](const auto& description) { return filter(*description); });
    return {_facility, std::make_shared<const platform::MeterixChannels>(std::move(kept))};
}

WLMeterixSnapshot WLMeterix::snapshot(platform::ErrorSlot error) const {
    if (!*this) {
        return {};
    }
    return {_facility, _facility->sample(*_channels, error)};
}
