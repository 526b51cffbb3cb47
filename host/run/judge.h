// Judging: measured results against their limits, and a run's verdict from them.
#ifndef ZR_HOST_RUN_JUDGE_H
#define ZR_HOST_RUN_JUDGE_H

#include "frame/host_interface.h"
#include "host/record/run_record.h"

namespace host {

// The result with its limit, judged: Within when the value is inside both bounds that are set (a
// closed bound's own value is inside, an open one's is not). NaN is not inside any limit, not even
// one without bounds, and a bound of NaN admits nothing. Units are not compared.
ResultRecord judge(const ZRMeasuredResult& result);

// Whether the value is inside both bounds, as above.
bool isWithin(double value, const LimitRecord& limit);

// The verdict of a run from its failures, its results, and what the bench's limits found where that is part of
// it. A result outside a limit is known to fail, whatever else could not be measured: Failed comes before the
// Error of a limit of the bench that could not be judged.
Verdict verdictOf(const RunRecord& run);

// The worse of two.
inline Verdict worse(Verdict a, Verdict b) {
    return a < b ? b : a;
}

}  // namespace host

#endif
