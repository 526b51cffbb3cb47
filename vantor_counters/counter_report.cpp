#include "vantor_counters/counter_report.h"

#include "platform/shared_block.h"

namespace {

constexpr std::string_view kGroup = "Q71ISP";
constexpr std::string_view kSubgroup = "Q71ISP Events";
constexpr std::size_t kRoomPerName = 44;  // most names are shorter

}  // namespace

bool isISPEventChannel(const WLMeterixChannelDescription& description) {
    return description.groupName().find(kGroup) != std::string::npos &&
           description.subGroupName().find(kSubgroup) != std::string::npos;
}

bool isISPEventSubgroup(const WLMeterixChannelDescription& description) {
    return description.subGroupName() == kSubgroup;
}

void storeMeasurements(const platform::MeterixSamples& samples, ZRExperimentResult& result) {
    auto& measurements = result.measurements();
    const std::size_t count = measurements.size() + samples.size();
    measurements.reserve(count, count * kRoomPerName);
    platform::SharedBlock<Measurement> made(samples.size());
    for (const WLMeterixSample& sample : samples) {
        const WLMeterixChannel& channel = sample.channel();
        measurements.set(channel.channelDescription().name(),
                         made.make(channel.count().asDouble(), ZRDimensionlessUnit::events()));
    }
}
