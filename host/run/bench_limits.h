// BenchLimits: the limits of the bench, as their file gives them.
//
// The module judges what it names limits for. A file of limits puts bounds on the rest: measurements that the
// module only records, and figures of frames and images. limits/limits.schema.json describes the format.
#ifndef ZR_HOST_RUN_BENCH_LIMITS_H
#define ZR_HOST_RUN_BENCH_LIMITS_H

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "host/record/run_record.h"

namespace host {

// A limit on one quantity of the runs of one name.
struct BenchLimit {
    std::string run;                    // the diagnostic or experiment
    std::optional<std::size_t> figure;  // its place in kFigures; nothing: a measurement
    std::string measurement;            // its name
    LimitRecord limit;                  // named after the file; has a bound
    bool partOfVerdict;
};

// Reads the file. Throws a Problem (kExitUsage) with the first thing that is wrong with it: it cannot be read,
// is not strict JSON, a key is unknown, none of `runnable` has the name that limits are given for, a limit has
// no bounds or such that admit nothing. Whether a run has a measurement is only known when it has run.
std::vector<BenchLimit> readBenchLimits(const std::string& path,
                                        const std::vector<std::string>& runnable);

}  // namespace host

#endif
