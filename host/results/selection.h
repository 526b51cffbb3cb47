// Selection: which runs a question is about.
#ifndef ZR_HOST_RESULTS_SELECTION_H
#define ZR_HOST_RESULTS_SELECTION_H

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "host/store/store.h"

namespace host {

// As the command line gave it. Every text that is not empty must be met.
struct Filter {
    std::optional<std::int64_t> since = {};  // microseconds since 1970, UTC; the first that counts
    std::optional<std::int64_t> until = {};  // and the first that does not
    std::string station = {};
    std::string part = {};
    std::string lot = {};
    std::string diagnostic = {};
    std::string version = {};  // of the program

    // Names and texts for people.
    std::vector<std::pair<std::string, std::string>> scope() const;
};

// What is asked beside the question's name.
struct Asked {
    Filter filter = {};
    std::string subject = {};       // a unit's serial number, a measurement's name
    std::string by = "diagnostic";  // of yield: see yieldGroups()
    bool measurements = false;      // of stations
    std::int64_t limit = 0;         // rows at most; 0 for all
    std::string commandLine = {};   // that asks, for the record
};

// The moment that `text` names, in microseconds since 1970: a date or a date and time (UTC), or a time before
// `now`: "90m", "12h", "7d", "2w". With `toEnd` a date alone means its end. Throws a Problem (kExitUsage) that
// names the option.
std::int64_t momentOf(std::string_view option,
                      const std::string& text,
                      std::int64_t now,
                      bool toEnd);

// The moment as reports show it: "2026-11-25 12:00:00"; the day of it.
std::string momentText(std::int64_t moment);
std::string dayText(std::int64_t moment);

// The filter as SQL, with its parameters. Further parameters can be added.
class Selection {
  public:
    explicit Selection(const Filter& filter);

    // Where runs are, with their stations and units (NULL for a run without one).
    static constexpr std::string_view kRuns =
        "runs JOIN stations ON stations.id = runs.station_id LEFT JOIN units ON units.id = "
        "runs.unit_id";

    // A condition on the rows of kRuns.
    const std::string& condition() const { return _condition; }

    // Adds a parameter and returns its name in SQL.
    std::string add(Cell value);

    // Where a result comes from: kAnalysis, kExperiment or kBench, a limit of the bench.
    static constexpr std::string_view kSource = "(1 - results.of_analysis + results.by_bench)";

    // `sql` with {runs}, {selected} and {source} in place of the three above; its rows.
    Rows rows(Store& store, std::string_view sql) const;

  private:
    std::string _condition;
    Row _parameters;
};

// One sentence for each name of the filter that no run has, with the nearest that one has.
std::vector<std::string> unknownNames(Store& store, const Filter& filter);

inline constexpr std::int64_t kAnalysis = 0;
inline constexpr std::int64_t kExperiment = 1;
inline constexpr std::int64_t kBench = 2;
// "analysis", "experiment", "bench".
std::string sourceName(std::int64_t source);

// What a row holds. Missing numbers are NaN, missing texts empty.
std::int64_t integerAt(const Row& row, std::size_t column);
double numberAt(const Row& row, std::size_t column);
std::optional<double> optionalAt(const Row& row, std::size_t column);
const std::string& textAt(const Row& row, std::size_t column);

}  // namespace host

#endif
