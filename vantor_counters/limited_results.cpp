#include "vantor_counters/limited_results.h"

#include <string>
#include <utility>

LimitedResults::LimitedResults(std::size_t count)
    : _values(count), _bounds(2 * count), _limits(count), _results(count) {}

ZRMeasuredResultRef LimitedResults::result(std::string_view name,
                                           MeasurementRef measurement,
                                           std::string_view limitName,
                                           ZRBoundRef lowerBound,
                                           ZRBoundRef upperBound) {
    auto limit = _limits.make(std::string(limitName));
    limit->setLowerBound(std::move(lowerBound));
    limit->setUpperBound(std::move(upperBound));
    auto result = _results.make(std::string(name), std::move(measurement));
    result->setLimit(std::move(limit));
    return result;
}
