// Line drawings and heat maps as SVG in a figure of an HTML page.
//
// No scripts and no fixed width: the data are stretched to the available space, texts and strokes keep
// their size. However long a run was, a drawing has a bounded number of points or cells. Lines differ by
// colour and dashes; each drawing has a title and a description for readers who cannot see it.
#ifndef ZR_HOST_REPORT_HTML_PLOT_H
#define ZR_HOST_REPORT_HTML_PLOT_H

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

namespace host {

struct Point {
    double x;  // must be drawable, and not fall from point to point
    double y;  // NaN where there is none: the line has a gap
};

struct Series {
    std::string name;
    std::string style;  // class of the style sheet: hue-a, hue-b, hue-c; and dotted, dashed
    std::vector<Point> points;
};

// An area between two lines with the same x.
struct Band {
    std::string name;
    std::string style;
    std::vector<Point> lower;
    std::vector<Point> upper;
};

// What a figure says in words.
struct Figure {
    std::string id;  // unique in the page
    std::string title;
    std::string caption;  // what is drawn and the figures to know
    std::string xLabel;
    std::string yLabel;
    int level = 4;  // of its title as a heading
};

// A place between two x at which something is missing: an upright line.
struct Gap {
    double x;
    std::string text;  // says what is missing; shown on hovering
};

struct LinePlot {
    Figure figure;
    bool wholeX = true;   // x counts something
    bool wholeY = false;  // y is a state, a whole number
    std::vector<Series> series;
    std::vector<Band> bands;
    std::vector<Gap> gaps;
    // Not drawn, but the axes reach them: for drawings that are compared with one another.
    std::vector<Point> room = {};
};

// Nothing is drawn, and the text is empty, when no point has a drawable y.
std::string linePlot(const LinePlot& plot);

struct HeatMap {
    Figure figure;
    // One column per x, starting at 1; cells from bottom to top; NaN for a missing cell.
    std::vector<std::vector<double>> columns;
};

// Neighbouring columns become one, of their means, when there are too many. Empty when no cell is
// drawable.
std::string heatMap(const HeatMap& map);

// At most that many columns are drawn.
inline constexpr std::size_t kMostColumns = 200;

// At most about `most` of the points, in the same order: of each group of neighbours the least and the
// greatest, so that no peak is lost.
std::vector<Point> decimated(const std::vector<Point>& points, std::size_t most);

}  // namespace host

#endif
