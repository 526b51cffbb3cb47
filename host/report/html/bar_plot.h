// Horizontal bars, or points with their intervals, one row for each name: SVG in a figure of an HTML page, with
// the promises of plot.h.
#ifndef ZR_HOST_REPORT_HTML_BAR_PLOT_H
#define ZR_HOST_REPORT_HTML_BAR_PLOT_H

#include <limits>
#include <string>
#include <vector>

#include "host/report/html/plot.h"

namespace host {

// NaN where there is none.
struct BarMark {
    double value = std::numeric_limits<double>::quiet_NaN();
    double low = std::numeric_limits<double>::quiet_NaN();  // the interval's ends
    double high = std::numeric_limits<double>::quiet_NaN();
};

struct Bar {
    std::string label;
    std::vector<BarMark> marks;  // one for each series
};

struct BarSeries {
    std::string name;
    std::string style;  // hue-a, hue-b, hue-c
};

struct BarPlot {
    Figure figure;         // its xLabel is of the values, its yLabel of the rows
    bool areBars = false;  // bars from zero, or else points with their intervals
    std::vector<BarSeries> series;
    std::vector<Bar> bars;
};

// From above to below. Empty when no value is drawable.
std::string barPlot(const BarPlot& plot);

}  // namespace host

#endif
