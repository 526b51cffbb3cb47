// The counter-report experiment: the image signal processor's event counters as they stand now, one
// measurement per channel in the unit `events`. It streams nothing and changes nothing on the device.
//
// Threads  Everything runs on the calling thread; there is no waiting.
// Errors   All in ZRMeterixErrorDomain with code 100. The underlying error is the last one that the
//          counter-report facility gave during the run, if it gave any.
//            "Could not get simple channels."      there is no report of simple channels
//            "Could not sample the report."        the report could not be sampled
//            "Could not get the count of %@."      a channel (its name) has no count
#ifndef ZR_VANTOR_COUNTERS_COUNTER_EXPERIMENT_H
#define ZR_VANTOR_COUNTERS_COUNTER_EXPERIMENT_H

#include "frame/host_interface.h"

class ZRVantorMeterixExperiment final : public ZRExperiment {
  public:
    ZRDescription experimentDescription() const override;
    ZRExperimentResultRef run(platform::ErrorSlot error) override;
};

#endif
