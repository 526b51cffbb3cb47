// Numbers and values as JSON: the one rule for all reports in JSON.
//
// Integers stay integers, floating point has the shortest digits that read back to the same value,
// booleans are true and false; NaN and the infinities, which JSON cannot carry, are the strings "nan",
// "inf" and "-inf"; what is absent is null.
#ifndef ZR_HOST_REPORT_JSON_VALUE_H
#define ZR_HOST_REPORT_JSON_VALUE_H

#include <nlohmann/json.hpp>

#include "platform/number.h"
#include "platform/value.h"

namespace host {

nlohmann::ordered_json jsonOf(double value);
nlohmann::ordered_json jsonOf(const platform::Number& number);
nlohmann::ordered_json jsonOf(const platform::Value& value);

}  // namespace host

#endif
