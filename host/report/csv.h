// Comma-separated values as RFC 4180 has them.
#ifndef ZR_HOST_REPORT_CSV_H
#define ZR_HOST_REPORT_CSV_H

#include <string>
#include <string_view>

#include "platform/value.h"

namespace host {

inline constexpr std::string_view kCsvLineEnd = "\r\n";

// The text as a field: in quotes where it needs them, and clean (host/record/clean_text.h).
std::string csvField(std::string_view text);

// A value as a field. A number is the shortest text that reads back to the same value, an integer all of its
// digits; nan, inf, -inf; true and false are 1 and 0. A text is itself, a list or dictionary is JSON text. The
// field is empty when there is nothing.
std::string csvField(const platform::Value& value);

// An object as JSON text in a field; empty when it has no entries.
std::string csvObject(const platform::MutableDictionary& entries);

}  // namespace host

#endif
