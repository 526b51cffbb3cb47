// Text that XML 1.0, HTML and a terminal can carry.
#ifndef ZR_HOST_RECORD_CLEAN_TEXT_H
#define ZR_HOST_RECORD_CLEAN_TEXT_H

#include <cstddef>
#include <string>
#include <string_view>

namespace host {

// The text with U+FFFD in place of whatever is not UTF-8 or not a character of XML 1.0 (such as control
// characters other than tab and line ends): names and messages may come from a device as they are.
std::string cleanText(std::string_view text);

// The clean text with &, <, >, " and ' as entities: for the content and the attributes of HTML.
std::string htmlText(std::string_view text);

// The text in one line that cannot control a terminal: every control character becomes a question mark.
std::string plainLine(std::string_view text);

// How many characters of a terminal the UTF-8 text takes, near enough: its code points.
std::size_t widthOf(std::string_view text);

}  // namespace host

#endif
