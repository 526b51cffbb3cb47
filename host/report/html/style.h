// The style sheet of the HTML report: the content of style.css.
#ifndef ZR_HOST_REPORT_HTML_STYLE_H
#define ZR_HOST_REPORT_HTML_STYLE_H

#include <string_view>

namespace host {

extern const std::string_view kReportStyle;

}  // namespace host

#endif
