// The promises of the counter reports (platform/welkin/meterix.h).
#include <algorithm>
#include <memory>
#include <utility>

#include "host/conformance/conformance.h"
#include "platform/welkin/meterix.h"

namespace host {

namespace {

using platform::ErrorSlot;
using platform::MeterixChannels;
using platform::MeterixSamples;

enum Check : std::size_t { Slot, Null, Count, Order, Direction };

constexpr Promise kPromises[] = {
    kSlotPromise,
    {"channel that is null", "No channel of simpleChannels() is null"},
    {"samples missing or too many", "sample() gives one sample per channel"},
    {"samples in another order than the channels", "sample() keeps the channels' order"},
    {"difference the wrong way round", "difference() is the later count less the baseline's"},
};

// Counts of ours: a device's own may be at the end of their range.
constexpr std::int64_t kBefore = 1;
constexpr std::int64_t kAfter = 6;

// The samples, had every channel with a count this one.
MeterixSamples withCount(const MeterixSamples& samples, std::int64_t count) {
    MeterixSamples counted;
    for (const WLMeterixSample& sample : samples) {
        const WLMeterixChannel& channel = sample.channel();
        counted.emplace_back(WLMeterixChannel(
            channel.sharedDescription(),
            channel.count().isPresent() ? platform::Number(count) : platform::Number()));
    }
    return counted;
}

void checkOrder(Checks& checks, const MeterixChannels& channels, const MeterixSamples& samples) {
    checks.decide(
        Count, samples.size() == channels.size(),
        platform::format("%lu samples for %lu channels", samples.size(), channels.size()));
    for (std::size_t at = 0; at < std::min(samples.size(), channels.size()); ++at) {
        const auto& is = samples[at].channel().channelDescription();
        const auto& wanted = *channels[at];
        const bool isSame = is.name() == wanted.name() && is.groupName() == wanted.groupName() &&
                            is.subGroupName() == wanted.subGroupName();
        checks.decide(Order, isSame,
                      platform::format("sample %lu is of %@, channel %lu is %@", at + 1, is.name(),
                                       at + 1, wanted.name()));
    }
}

void checkDirection(Checks& checks,
                    platform::MeterixFacility& facility,
                    const MeterixSamples& samples) {
    const MeterixSamples baseline = withCount(samples, kBefore);
    const MeterixSamples later = withCount(samples, kAfter);
    std::shared_ptr<const MeterixSamples> rise;
    const bool isAnswered = checks.answered([&] {
        rise = checks.call(Slot, "difference()", [&](ErrorSlot error) {
            return facility.difference(later, baseline, error);
        });
    });
    if (!isAnswered || rise == nullptr) {
        return;
    }
    for (const WLMeterixSample& sample : *rise) {
        const platform::Number count = sample.channel().count();
        if (count.isPresent()) {
            checks.decide(Direction, count.as<std::int64_t>() == kAfter - kBefore,
                          platform::format("%@ rose by %@, its difference is %@",
                                           sample.channel().channelDescription().name(),
                                           platform::Number(kAfter - kBefore), count.text()));
        }
    }
    checks.notChecked(Direction, "no channel has a count");
}

}  // namespace

std::vector<CheckRecord> checkMeterix(const devices::Device& device) {
    Checks checks(kPromises, device.unanswered);
    platform::MeterixFacility& facility = *device.services.meterix;
    const auto channels = checks.call(
        Slot, "simpleChannels()", [&](ErrorSlot error) { return facility.simpleChannels(error); });
    if (channels == nullptr) {
        return checks.records();
    }
    if (channels->empty()) {
        checks.giveUp("the device has no channel");
        return checks.records();
    }
    const auto nulls = std::count(channels->begin(), channels->end(), nullptr);
    checks.decide(
        Null, nulls == 0,
        platform::format("%@ of %lu channels are null", platform::Number(nulls), channels->size()));
    if (nulls != 0) {
        checks.giveUp("a channel is null");
        return checks.records();
    }
    // Half of them backwards too: a facility that gives its own order shows it then.
    const MeterixChannels backwards(channels->rbegin(), channels->rend());
    const MeterixChannels some(
        backwards.begin(),
        backwards.begin() + static_cast<std::ptrdiff_t>((backwards.size() + 1) / 2));
    std::shared_ptr<const MeterixSamples> all;
    for (const MeterixChannels* asked : {channels.get(), &some}) {
        const auto samples = checks.call(
            Slot, "sample()", [&](ErrorSlot error) { return facility.sample(*asked, error); });
        if (samples != nullptr) {
            checkOrder(checks, *asked, *samples);
            all = all == nullptr ? samples : all;
        }
    }
    if (all != nullptr) {
        checkDirection(checks, facility, *all);
    }
    return checks.records();
}

}  // namespace host
