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
// enter minimum, median and maximum. What the bench's limits found is counted apart.
class RepeatStatistics {
  public:
    explicit RepeatStatistics(std::string name) { _record.name = std::move(name); }

    void add(const RunRecord& run);

    // The figures of the runs added so far, results in the order in which they first came.
    RepeatRecord record() const;

  private:
    // The results of one sort, by name.
    class Tallies {
      public:
        void add(const ResultRecord& result);
        std::vector<ResultStatistics> statistics() const;

      private:
        struct Tally {
            ResultStatistics statistics;
            std::map<double, std::uint64_t> values;
        };
        std::vector<Tally> _tallies;
        std::map<std::string, std::size_t> _tallyOf;
    };

    RepeatRecord _record;
    Tallies _results;
    Tallies _benchResults;
};

}  // namespace host

#endif
