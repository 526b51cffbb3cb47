// What every HTML page of the program begins and ends with.
#ifndef ZR_HOST_REPORT_HTML_PAGE_FRAME_H
#define ZR_HOST_REPORT_HTML_PAGE_FRAME_H

#include <string>
#include <string_view>

namespace host {

// The head with the style sheet, and the link to the element "results". The title is plain text.
std::string pageStart(std::string_view title);

inline constexpr std::string_view kPageEnd = "</body>\n</html>\n";

// An entry of a list of facts; `name` is HTML, the others are plain text.
std::string factHtml(std::string_view name, std::string_view value, std::string_view more = "");

}  // namespace host

#endif
