// Makes the measured results of an analysis with their limits, as both analyses do. Each limit, bound and
// value is an object of its own; those of one type share an allocation. One thread at a time.
#ifndef ZR_VANTOR_COUNTERS_LIMITED_RESULTS_H
#define ZR_VANTOR_COUNTERS_LIMITED_RESULTS_H

#include <cstddef>
#include <string_view>
#include <utility>

#include "frame/host_interface.h"
#include "platform/shared_block.h"

class LimitedResults {
  public:
    // `count`: how many results will be made.
    explicit LimitedResults(std::size_t count);

    MeasurementRef value(double value, const ZRDimensionlessUnit& unit) {
        return _values.make(value, unit);
    }
    ZRBoundRef closedBound(MeasurementRef value) { return _bounds.make(std::move(value), false); }

    // The measurement under the name by which it is judged. A bound may be null.
    ZRMeasuredResultRef result(std::string_view name,
                               MeasurementRef measurement,
                               std::string_view limitName,
                               ZRBoundRef lowerBound,
                               ZRBoundRef upperBound);

  private:
    platform::SharedBlock<Measurement> _values;
    platform::SharedBlock<ZRBound> _bounds;
    platform::SharedBlock<ZRLimit> _limits;
    platform::SharedBlock<ZRMeasuredResult> _results;
};

#endif
