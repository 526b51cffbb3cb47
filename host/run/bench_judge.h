// BenchJudge: judges runs by the limits of the bench.
#ifndef ZR_HOST_RUN_BENCH_JUDGE_H
#define ZR_HOST_RUN_BENCH_JUDGE_H

#include <string_view>
#include <utility>
#include <vector>

#include "host/record/run_record.h"
#include "host/run/bench_limits.h"
#include "host/run/figure.h"

namespace host {

// Keeps figures, not frames, so memory does not grow with the length of a run.
//
// Threads  One call at a time. begin() before the run's first frame, judge() when all of them have been added.
class BenchJudge {
  public:
    explicit BenchJudge(std::vector<BenchLimit> limits) : _limits(std::move(limits)) {}

    // Whether it needs the frames of runs, and whether any limit is on runs of that name.
    bool followsFrames() const;
    bool hasLimitsFor(std::string_view run) const;

    void begin() { _figures = {}; }
    void add(const FrameBatch& batch);

    // What the limits on the run find, in the order of their file. A figure of several values gives one
    // result for its least value when the limit has a lower bound, and one for its greatest when it has an
    // upper one. What the run does not have is NotMeasured, with a note that says why.
    std::vector<BenchResult> judge(const RunRecord& run);

  private:
    const std::vector<BenchLimit> _limits;
    Figures _figures;
};

}  // namespace host

#endif
