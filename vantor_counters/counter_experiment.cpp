#include "vantor_counters/counter_experiment.h"

#include "vantor_counters/counter_report.h"

ZRDescription ZRVantorMeterixExperiment::experimentDescription() const {
    return ZRDescription::descriptionWithSummary("Check for any Vantor IO  Reports.");
}

ZRExperimentResultRef ZRVantorMeterixExperiment::run(platform::ErrorSlot error) {
    using platform::fail;
    auto result = std::make_shared<ZRExperimentResult>();
    platform::ErrorRef reported;  // what the facility's calls of this run report

    const WLMeterix report = WLMeterix::reportWithOnlySimpleChannels(&reported);
    if (!report) {
        return fail(error, ZRMeterixErrorDomain, 100, reported, "Could not get simple channels.");
    }
    const WLMeterixSnapshot snapshot =
        report.reportByFilteringChannels(isISPEventChannel).snapshot(&reported);
    if (!snapshot) {
        return fail(error, ZRMeterixErrorDomain, 100, reported, "Could not sample the report.");
    }
    for (const WLMeterixSample& sample : snapshot.samples()) {
        const WLMeterixChannel& channel = sample.channel();
        if (!channel.count().isPresent()) {
            return fail(error, ZRMeterixErrorDomain, 100, reported,
                        "Could not get the count of %@.", channel.channelDescription().name());
        }
    }
    storeMeasurements(snapshot.samples(), *result);
    return result;
}
