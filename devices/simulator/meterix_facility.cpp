#include "devices/simulator/meterix_facility.h"

#include <atomic>
#include <unordered_map>
#include <utility>

namespace simulator {

namespace {

class SimulatedMeterix final : public platform::MeterixFacility {
  public:
    SimulatedMeterix(MeterixProfile profile, std::shared_ptr<const StreamProgress> progress)
        : _profile(std::move(profile)), _progress(std::move(progress)) {
        auto all = std::make_shared<platform::MeterixChannels>();
        for (const CounterChannel& channel : _profile.channels) {
            all->push_back(std::make_shared<const WLMeterixChannelDescription>(
                channel.name, channel.group, channel.subgroup));
            _channelOf.emplace(all->back().get(), &channel);
        }
        _all = std::move(all);
    }

    std::shared_ptr<const platform::MeterixChannels> simpleChannels(
        platform::ErrorSlot error) override {
        return _profile.report.strikes(error) ? nullptr : _all;
    }

    std::shared_ptr<const platform::MeterixSamples> sample(
        const platform::MeterixChannels& channels, platform::ErrorSlot error) override {
        const bool first = !_sampled.exchange(true);
        const Fault& fault = first ? _profile.firstSnapshot : _profile.laterSnapshots;
        if (fault.strikes(error)) {
            return nullptr;
        }
        auto samples = std::make_shared<platform::MeterixSamples>();
        samples->reserve(channels.size());
        for (const WLMeterixChannelDescriptionRef& description : channels) {
            samples->emplace_back(WLMeterixChannel(description, _countOf(description.get())));
        }
        return samples;
    }

    std::shared_ptr<const platform::MeterixSamples> difference(
        const platform::MeterixSamples& later,
        const platform::MeterixSamples& baseline,
        platform::ErrorSlot error) override {
        if (_profile.difference.strikes(error)) {
            return nullptr;
        }
        std::unordered_map<const WLMeterixChannelDescription*, platform::Number> before;
        for (const WLMeterixSample& sample : baseline) {
            before.emplace(&sample.channel().channelDescription(), sample.channel().count());
        }
        auto samples = std::make_shared<platform::MeterixSamples>();
        samples->reserve(later.size());
        for (const WLMeterixSample& sample : later) {
            const WLMeterixChannel& channel = sample.channel();
            const auto known = before.find(&channel.channelDescription());
            const platform::Number start = known != before.end() ? known->second : 0;
            platform::Number rise;
            if (start.isPresent() && channel.count().isPresent()) {
                rise = channel.count().as<std::int64_t>() - start.as<std::int64_t>();
            }
            samples->emplace_back(WLMeterixChannel(channel.sharedDescription(), rise));
        }
        return samples;
    }

  private:
    platform::Number _countOf(const WLMeterixChannelDescription* description) const {
        const auto known = _channelOf.find(description);
        if (known == _channelOf.end() || !known->second->count.has_value()) {
            return {};
        }
        const CounterChannel& channel = *known->second;
        const double seconds = static_cast<double>(_progress->microseconds.load()) / 1e6;
        std::uint64_t count = *channel.count;
        count += platform::Number(channel.risePerSecond * seconds).as<std::uint64_t>();
        if (channel.riseAtFrame != 0 && _progress->frames.load() >= channel.riseAtFrame) {
            count += channel.riseBy;
        }
        return count;
    }

    const MeterixProfile _profile;
    const std::shared_ptr<const StreamProgress> _progress;
    std::shared_ptr<const platform::MeterixChannels> _all;
    std::unordered_map<const WLMeterixChannelDescription*, const CounterChannel*> _channelOf;
    // Whether a snapshot was taken; several threads may take the first together.
    std::atomic<bool> _sampled{false};
};

}  // namespace

std::shared_ptr<platform::MeterixFacility> makeMeterixFacility(
    MeterixProfile profile, std::shared_ptr<const StreamProgress> progress) {
    return std::make_shared<SimulatedMeterix>(std::move(profile), std::move(progress));
}

}  // namespace simulator
