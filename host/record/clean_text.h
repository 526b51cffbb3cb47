// Text that XML 1.0, HTML and a terminal can carry.
#ifndef ZR_HOST_RECORD_CLEAN_TEXT_H
#define ZR_HOST_RECORD_CLEAN_TEXT_H

#include <string>
#include <string_view>

namespace host {

// The text with U+FFFD in place of whatever is no UTF-8 or no character of XML 1.0 (control characters
// but for tab and line ends, say): names and messages may come from a device as they are.
std::string cleanText(std::string_view text);

// The clean text with &, <, >, " and ' as entities: for the content and the attributes of HTML.
std::string htmlText(std::string_view text);

// The text in one line that drives no terminal: every control character is a question mark.
std::string plainLine(std::string_view text);

}  // namespace host

#endif
