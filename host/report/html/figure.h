// What the drawings of the HTML pages have around them.
#ifndef ZR_HOST_REPORT_HTML_FIGURE_H
#define ZR_HOST_REPORT_HTML_FIGURE_H

#include <string>
#include <string_view>

#include "host/report/html/plot.h"

namespace host {

// The figure with its caption, the drawing's title and description for those who cannot see it, labels, and the
// legend, which is HTML. `attributes` are those of the drawing's svg element, `content` is what is in it.
std::string figureHtml(const Figure& figure,
                       std::string_view attributes,
                       std::string_view content,
                       std::string_view legend);

}  // namespace host

#endif
