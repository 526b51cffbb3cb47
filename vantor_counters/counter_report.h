// Counter reports as the plug-in's two counter-reading experiments use them: the two channel filters
// and the one rule by which a sample becomes a measurement. Any thread.
#ifndef ZR_VANTOR_COUNTERS_COUNTER_REPORT_H
#define ZR_VANTOR_COUNTERS_COUNTER_REPORT_H

#include "frame/host_interface.h"
#include "platform/welkin/meterix.h"

// The counter-report experiment's filter: the channels whose group name contains "Q71ISP" and whose
// subgroup name contains "Q71ISP Events".
bool isISPEventChannel(const WLMeterixChannelDescription& description);

// The fault experiment's filter: the channels whose subgroup name is exactly "Q71ISP Events",
// whatever their group.
bool isISPEventSubgroup(const WLMeterixChannelDescription& description);

// Stores each channel's count as a measurement in `events` under the channel's name, in the order of the
// samples; an entry of that name is replaced. A channel without a count counts as 0: whether that is an
// error is the caller's decision.
void storeMeasurements(const platform::MeterixSamples& samples, ZRExperimentResult& result);

#endif
