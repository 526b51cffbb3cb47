#include "devices/recording/argument_values.h"

#include <utility>

namespace recording {

namespace {

using platform::List;
using platform::MeterixChannels;
using platform::MeterixSamples;
using platform::MutableList;
using platform::Value;

Value channelValue(const WLMeterixChannelDescription& channel) {
    return List{channel.groupName(), channel.subGroupName(), channel.name()};
}

WLMeterixChannelDescriptionRef channelOf(const Value& value) {
    const List* parts = value.list();
    if (parts == nullptr || parts->size() != 3) {
        return nullptr;
    }
    const Value group = (*parts)[0];
    const Value subgroup = (*parts)[1];
    const Value name = (*parts)[2];
    if (group.string() == nullptr || subgroup.string() == nullptr || name.string() == nullptr) {
        return nullptr;
    }
    return std::make_shared<const WLMeterixChannelDescription>(*name.string(), *group.string(),
                                                               *subgroup.string());
}

// A list with describe(entry) of each entry.
template <class Entries, class Describe>
Value listValue(const Entries& entries, Describe describe) {
    MutableList list;
    list.reserve(entries.size());
    for (const auto& entry : entries) {
        list.emplace_back(describe(entry));
    }
    return List(std::move(list));
}

}  // namespace

Value channelsValue(const MeterixChannels& channels) {
    return listValue(channels, [](const auto& channel) { return channelValue(*channel); });
}

std::shared_ptr<const MeterixChannels> channelsOf(const Value& value) {
    if (value.list() == nullptr) {
        return nullptr;
    }
    auto channels = std::make_shared<MeterixChannels>();
    for (const Value& entry : *value.list()) {
        channels->push_back(channelOf(entry));
        if (channels->back() == nullptr) {
            return nullptr;
        }
    }
    return channels;
}

Value samplesValue(const MeterixSamples& samples) {
    return listValue(samples, [](const WLMeterixSample& sample) {
        const WLMeterixChannel& channel = sample.channel();
        return List{channelValue(channel.channelDescription()), channel.count()};
    });
}

std::shared_ptr<const MeterixSamples> samplesOf(const Value& value) {
    if (value.list() == nullptr) {
        return nullptr;
    }
    auto samples = std::make_shared<MeterixSamples>();
    for (const Value& entry : *value.list()) {
        const List* pair = entry.list();
        auto channel = pair != nullptr && pair->size() == 2 ? channelOf((*pair)[0]) : nullptr;
        if (channel == nullptr) {
            return nullptr;
        }
        samples->emplace_back(WLMeterixChannel(std::move(channel), (*pair)[1].asNumber()));
    }
    return samples;
}

Value countsValue(const MeterixSamples& samples) {
    return listValue(samples,
                     [](const WLMeterixSample& sample) { return sample.channel().count(); });
}

Value dictionariesValue(const std::vector<platform::Dictionary>& dictionaries) {
    return listValue(dictionaries, [](const platform::Dictionary& one) { return one; });
}

std::string bytesText(std::span<const std::byte> data) {
    std::string text;
    text.reserve(data.size());
    for (const std::byte byte : data) {
        text += static_cast<char>(byte);
    }
    return text;
}

}  // namespace recording
