// RepeatStatistics: figures of each measured result over the repetitions of a run.
#ifndef ZR_HOST_RUN_REPEAT_STATISTICS_H
#define ZR_HOST_RUN_REPEAT_STATISTICS_H

#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "host/record/run_record.h"

namespace host {

// Keeps each distinct value once with its number of occurrences, so that the median is exact and memory
// grows with the number of distinct values, not of runs. An experiment without an analysis is counted
// by its measurements, which have no limit. A NaN counts as a run outside its limit and does not
// enter minimum, median and maximum.
class RepeatStatistics {
  public:
    explicit RepeatStatistics(std::string name) { _record.name = std::move(name); }

    void add(const RunRecord& run);

    // The figures of the runs added so far, results in the order in which they first came.
    RepeatRecord record() const;

  private:
    struct Tally {
        ResultStatistics statistics;
        std::map<double, std::uint64_t> values;
    };
    void _count(const ResultStatistics& result, double value);

    RepeatRecord _record;
    std::vector<Tally> _tallies;
    std::map<std::string, std::size_t> _tallyOf;
};

}  // namespace host

#endif
