#include "vantor_counters/counter_report.h"

namespace {

constexpr std::string_view kGroup = "Q71ISP";
constexpr std::string_view kSubgroup = "Q71ISP Events";

}  // namespace

bool isISPEventChannel(const WLMeterixChannelDescription& description) {
    return description.groupName().find(kGroup) != std::string::npos &&
           description.subGroupName().find(kSubgroup) != std::string::npos;
}

bool isISPEventSubgroup(const WLMeterixChannelDescription& description) {
    return description.subGroupName() == kSubgroup;
}

void storeMeasurement(const WLMeterixChannel& channel, ZRExperimentResult& result) {
    result.measurements().set(channel.channelDescription().name(),
                              std::make_shared<const Measurement>(channel.count().asDouble(),
                                                                  ZRDimensionlessUnit::events()));
}
