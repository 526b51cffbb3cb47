// The support library's counter reports over the counter-report facility Meterix.
//
// The device's drivers publish counters as channels. A report selects channels, a snapshot holds
// their counts at one moment or the difference between two moments.
//
// Absence. A report and a snapshot are handles that may be absent, and every operation on an absent
// one yields an absent result and reports no error. So a sequence of calls needs one check, at its
// end. An operation that fails yields an absent handle and, when the facility gave an error, stores
// it in the slot.
//
// Values with shared, immutable contents: copy them; any thread may read them.
#ifndef ZR_PLATFORM_WELKIN_METERIX_H
#define ZR_PLATFORM_WELKIN_METERIX_H

#include <functional>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "platform/error.h"
#include "platform/number.h"

class WLMeterixChannelDescription {
  public:
    WLMeterixChannelDescription(std::string name, std::string groupName, std::string subGroupName)
        : _name(std::move(name))
        , _groupName(std::move(groupName))
        , _subGroupName(std::move(subGroupName)) {}

    const std::string& name() const { return _name; }
    const std::string& groupName() const { return _groupName; }        // the publishing group
    const std::string& subGroupName() const { return _subGroupName; }  // within the group

  private:
    std::string _name;
    std::string _groupName;
    std::string _subGroupName;
};

using WLMeterixChannelDescriptionRef = std::shared_ptr<const WLMeterixChannelDescription>;

// A channel as a snapshot saw it.
class WLMeterixChannel {
  public:
    // `description` must not be null.
    WLMeterixChannel(WLMeterixChannelDescriptionRef description, platform::Number count)
        : _description(std::move(description)), _count(count) {}

    const WLMeterixChannelDescription& channelDescription() const { return *_description; }
    // The same, shared: for a facility that makes another channel with it.
    const WLMeterixChannelDescriptionRef& sharedDescription() const { return _description; }
    // The channel's value in the snapshot; absent when the channel has no count.
    const platform::Number& count() const { return _count; }

  private:
    WLMeterixChannelDescriptionRef _description;
    platform::Number _count;
};

class WLMeterixSample {
  public:
    explicit WLMeterixSample(WLMeterixChannel channel) : _channel(std::move(channel)) {}

    const WLMeterixChannel& channel() const { return _channel; }

  private:
    WLMeterixChannel _channel;
};

namespace platform {

using MeterixChannels = std::vector<WLMeterixChannelDescriptionRef>;  // none is null
using MeterixSamples = std::vector<WLMeterixSample>;

// What a device implements. A null result is a failure, with or without an error in the slot. Any
// thread may call.
class MeterixFacility {
  public:
    virtual ~MeterixFacility() = default;

    // Every channel of the system that carries a single count.
    virtual std::shared_ptr<const MeterixChannels> simpleChannels(ErrorSlot error) = 0;

    // The channels' counts now, one sample per channel, in the channels' order.
    virtual std::shared_ptr<const MeterixSamples> sample(const MeterixChannels& channels,
                                                         ErrorSlot error) = 0;

    // Channel by channel, the later count less the baseline's. What becomes of a channel that one side
    // lacks is the implementation's choice.
    virtual std::shared_ptr<const MeterixSamples> difference(const MeterixSamples& later,
                                                             const MeterixSamples& baseline,
                                                             ErrorSlot error) = 0;
};

}  // namespace platform

class WLMeterixSnapshot {
  public:
    // An absent snapshot.
    WLMeterixSnapshot() = default;
    WLMeterixSnapshot(std::shared_ptr<platform::MeterixFacility> facility,
                      std::shared_ptr<const platform::MeterixSamples> samples);

    explicit operator bool() const { return _samples != nullptr; }

    // One sample per channel, in the report's order; none when the snapshot is absent.
    const platform::MeterixSamples& samples() const;

    // The difference of this snapshot and an earlier one of the same report; absent when either is.
    WLMeterixSnapshot snapshotWithBaseline(const WLMeterixSnapshot& baseline,
                                           platform::ErrorSlot error) const;

  private:
    std::shared_ptr<platform::MeterixFacility> _facility;
    std::shared_ptr<const platform::MeterixSamples> _samples;
};

class WLMeterix {
  public:
    // True keeps the channel.
    using ChannelFilter = std::function<bool(const WLMeterixChannelDescription&)>;

    // An absent report.
    WLMeterix() = default;

    explicit operator bool() const { return _channels != nullptr; }

    // A report over all simple channels of the system; absent without a facility.
    static WLMeterix reportWithOnlySimpleChannels(platform::ErrorSlot error);

    // A report of the channels that the filter keeps.
    WLMeterix reportByFilteringChannels(const ChannelFilter& filter) const;

    // The counts of the report's channels now.
    WLMeterixSnapshot snapshot(platform::ErrorSlot error) const;

  private:
    WLMeterix(std::shared_ptr<platform::MeterixFacility> facility,
              std::shared_ptr<const platform::MeterixChannels> channels);

    std::shared_ptr<platform::MeterixFacility> _facility;
    std::shared_ptr<const platform::MeterixChannels> _channels;
};

#endif
