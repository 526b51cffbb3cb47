#include "devices/linux/counters.h"

#include <cerrno>
#include <string>
#include <unordered_map>
#include <utility>
#include <variant>

#include "devices/linux/device_log.h"
#include "devices/linux/system_problem.h"
#include "platform/sync.h"

namespace linux_device {

namespace {

using platform::ErrorSlot;
using platform::MeterixChannels;
using platform::MeterixSamples;
using platform::Number;

class Channel {
  public:
    explicit Channel(CounterChannel described) : _described(std::move(described)) {}

    // The count now. `streamStarts` was read before. Throws a SystemProblem.
    Number count(const Machine& machine, std::uint64_t streamStarts) {
        const NumberSource& source = _described.count;
        if (const auto* constant = std::get_if<Constant>(&source.source)) {
            return source.conversion.apply(constant->value);
        }
        const Number number =
            source.conversion.apply(readNumber(machine, std::get<FileNumber>(source.source)));
        if (_described.restarts == Restarts::Never) {
            return number;
        }
        const auto counted = number.as<std::int64_t>();
        const bool hasRestarted =
            _described.restarts == Restarts::AtStreamStart && streamStarts != _starts;
        if (hasRestarted || counted < _last) {
            _before += _last;
        }
        _last = counted;
        _starts = streamStarts;
        return _before + counted;
    }

    // Logs that it has no count, once in a row.
    void miss(const std::string& reason) {
        if (!std::exchange(_isMissing, true)) {
            logProblem("counter " + _described.name + ": " + reason);
        }
    }
    void found() { _isMissing = false; }

  private:
    const CounterChannel _described;
    std::int64_t _before = 0;  // what was counted until the last restart
    std::int64_t _last = 0;
    std::uint64_t _starts = 0;
    bool _isMissing = false;
};

class LinuxMeterix final : public platform::MeterixFacility {
  public:
    LinuxMeterix(std::vector<CounterChannel> channels,
                 Machine machine,
                 std::shared_ptr<const StreamStarts> starts)
        : _machine(std::move(machine)), _starts(std::move(starts)) {
        auto all = std::make_shared<MeterixChannels>();
        for (CounterChannel& channel : channels) {
            all->push_back(std::make_shared<const WLMeterixChannelDescription>(
                channel.name, channel.group, channel.subgroup));
            _channels.emplace(all->back().get(), std::move(channel));
        }
        _all = std::move(all);
    }

    std::shared_ptr<const MeterixChannels> simpleChannels(ErrorSlot /*error*/) override {
        return _all;
    }

    std::shared_ptr<const MeterixSamples> sample(const MeterixChannels& channels,
                                                 ErrorSlot /*error*/) override {
        auto samples = std::make_shared<MeterixSamples>();
        samples->reserve(channels.size());
        const platform::MutexLock lock(_mutex);
        for (const WLMeterixChannelDescriptionRef& description : channels) {
            samples->emplace_back(WLMeterixChannel(description, _countOf(description.get())));
        }
        return samples;
    }

    std::shared_ptr<const MeterixSamples> difference(const MeterixSamples& later,
                                                     const MeterixSamples& baseline,
                                                     ErrorSlot error) override {
        std::unordered_map<const WLMeterixChannelDescription*, Number> before;
        for (const WLMeterixSample& sample : baseline) {
            before.emplace(&sample.channel().channelDescription(), sample.channel().count());
        }
        auto samples = std::make_shared<MeterixSamples>();
        samples->reserve(later.size());
        for (const WLMeterixSample& sample : later) {
            const WLMeterixChannel& channel = sample.channel();
            const std::string& name = channel.channelDescription().name();
            const Number start = before[&channel.channelDescription()];
            const Number end = channel.count();
            if (!start.isPresent() || !end.isPresent()) {
                return platform::fail(error, kLinuxErrorDomain, ENODATA, nullptr,
                                      "counter %@ had no count %@", name,
                                      start.isPresent() ? "at the end" : "at the beginning");
            }
            const auto rise = end.as<std::int64_t>() - start.as<std::int64_t>();
            if (rise < 0) {
                return platform::fail(
                    error, kLinuxErrorDomain, ERANGE, nullptr,
                    "counter %@ fell from %@ to %@; \"restarts\" in its description says when it "
                    "starts anew",
                    name, start, end);
            }
            samples->emplace_back(WLMeterixChannel(channel.sharedDescription(), rise));
        }
        return samples;
    }

  private:
    Number _countOf(const WLMeterixChannelDescription* description) ZR_REQUIRES(_mutex) {
        const auto known = _channels.find(description);
        if (known == _channels.end()) {
            return {};
        }
        Channel& channel = known->second;
        try {
            // Before the file: a stream that starts in between restarts the count for the next sample.
            const Number count = channel.count(_machine, _starts->load());
            channel.found();
            return count;
        } catch (const SystemProblem& problem) {
            channel.miss(problem.what());
            return {};
        }
    }

    const Machine _machine;
    const std::shared_ptr<const StreamStarts> _starts;
    std::shared_ptr<const MeterixChannels> _all;

    platform::Mutex _mutex;
    std::unordered_map<const WLMeterixChannelDescription*, Channel> _channels ZR_GUARDED_BY(_mutex);
};

}  // namespace

std::shared_ptr<platform::MeterixFacility> makeMeterixFacility(
    std::vector<CounterChannel> channels,
    const Machine& machine,
    std::shared_ptr<const StreamStarts> starts) {
    return std::make_shared<LinuxMeterix>(std::move(channels), machine, std::move(starts));
}

}  // namespace linux_device
