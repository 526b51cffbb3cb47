// The counter-report analysis: every expected counter channel was measured, and its limit admits
// only zero.
//
// Threads  Everything runs on the calling thread.
// Errors   ZRErrorDomain, code 6, "Missing measurement for %@" with the first name of
//          kVantorCounterChannelNames (in its order) that the experiment did not measure.
#ifndef ZR_VANTOR_COUNTERS_COUNTER_ANALYSIS_H
#define ZR_VANTOR_COUNTERS_COUNTER_ANALYSIS_H

#include "frame/host_interface.h"

class ZRVantorMeterixAnalysis final : public ZRAnalysis {
  public:
    ZRDescription analysisDescription() const override;

    // One measured result per name of kVantorCounterChannelNames, named after the channel, with the
    // experiment's own measurement and the limit "Max Reports" from 0 to 0 events. Measurements of
    // other channels are ignored.
    ZRAnalysisResultRef analyzeExperimentResult(const ZRExperimentResult& result,
                                                platform::ErrorSlot error) override;
};

#endif
