#include "host/report/html/plot.h"

#include <algorithm>
#include <array>
#include <iterator>
#include <limits>

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/report/html/axis.h"
#include "host/report/html/figure.h"

namespace host {

namespace {

constexpr std::size_t kMostPoints = 1000;
// With fewer points than this each is marked.
constexpr std::size_t kFewPoints = 40;
// The user units of a drawing's data, stretched to its box.
constexpr double kWidth = 2000;
constexpr double kHeight = 1000;
// Gaps that are closer to each other than this share of the axis are drawn as one.
constexpr double kGapWidth = 1.0 / 250;
constexpr int kLevels = 16;  // colours of a heat map: classes level-0 to level-15

struct Range {
    double least = std::numeric_limits<double>::infinity();
    double greatest = -std::numeric_limits<double>::infinity();

    void add(double value) {
        if (isDrawable(value)) {
            least = std::min(least, value);
            greatest = std::max(greatest, value);
        }
    }
    bool empty() const { return least > greatest; }
};

// A path's command to a point, in user units: "M" moves there, "L" draws a line.
class Scale {
  public:
    Scale(const Axis& x, const Axis& y) : _x(x), _y(y) {}

    std::string operator()(char command, const Point& point) const {
        return fmt::format("{}{:.0f} {:.0f}", command, kWidth * _x.at(point.x),
                           kHeight * (1 - _y.at(point.y)));
    }

  private:
    const Axis& _x;
    const Axis& _y;
};

// A subpath for each run of points that have a y. Its last coordinate is repeated, so that a point on
// its own has a line's round end.
std::string pathOf(const std::vector<Point>& points, const Scale& scale) {
    std::string path;
    bool down = false;
    for (const Point& point : points) {
        const bool drawn = isDrawable(point.y);
        if (drawn) {
            path += scale(down ? 'L' : 'M', point);
        } else if (down) {
            path += "h0";
        }
        down = drawn;
    }
    return path + (down ? "h0" : "");
}

std::string dotsOf(const std::vector<Point>& points, const Scale& scale) {
    std::string path;
    for (const Point& point : points) {
        if (isDrawable(point.y)) {
            path += scale('M', point) + "h0";
        }
    }
    return path;
}

std::string seriesSvg(const Series& series, const Scale& scale, const LinePlot& plot) {
    const std::vector<Point> points = decimated(series.points, kMostPoints);
    const bool isState = plot.wholeY;
    // Marks on many lines would hide the dashes.
    const bool isMarked = points.size() <= kFewPoints && plot.series.size() <= 2;
    std::string svg;
    // Nothing lies between two states, so no line joins them.
    if (!isState) {
        svg +=
            fmt::format(R"(<path class="line {}" d="{}"/>)", series.style, pathOf(points, scale));
    }
    if (isState || isMarked) {
        svg +=
            fmt::format(R"(<path class="dots {}" d="{}"/>)", series.style, dotsOf(points, scale));
    }
    return svg;
}

std::string bandSvg(const Band& band, const Scale& scale) {
    std::string outline;
    const auto add = [&](const Point& point) {
        if (isDrawable(point.y)) {
            outline += scale(outline.empty() ? 'M' : 'L', point);
        }
    };
    std::for_each(band.lower.begin(), band.lower.end(), add);
    std::for_each(band.upper.rbegin(), band.upper.rend(), add);
    return fmt::format(R"(<path class="band {}" d="{}z"/>)", band.style, outline);
}

std::string gapsSvg(const std::vector<Gap>& gaps, const Axis& x) {
    std::string svg;
    double last = -1;
    for (const Gap& gap : gaps) {
        const double at = x.at(gap.x);
        if (at - last >= kGapWidth) {
            svg += fmt::format(
                "<line class=\"gap\" x1=\"{0:.2f}%\" x2=\"{0:.2f}%\" y1=\"0\" "
                "y2=\"100%\"><title>{1}</title></line>",
                100 * at, htmlText(gap.text));
            last = at;
        }
    }
    return svg;
}

std::string legendEntry(std::string_view shape, const std::string& style, const std::string& name) {
    return fmt::format(
        "<li><svg class=\"swatch\" width=\"28\" height=\"10\" aria-hidden=\"true\">"
        "<path class=\"{} {}\" d=\"{}\"/></svg>{}</li>\n",
        shape, style, shape == "band" ? "M0 0h28v10h-28z" : "M1 5h26", htmlText(name));
}

std::string legendOf(const LinePlot& plot) {
    if (plot.series.size() + plot.bands.size() < 2) {
        return "";
    }
    std::string entries;
    for (const Series& series : plot.series) {
        entries += legendEntry("line", series.style, series.name);
    }
    for (const Band& band : plot.bands) {
        entries += legendEntry("band", band.style, band.name);
    }
    return "<ul class=\"legend\">\n" + entries + "</ul>\n";
}

std::string figureOf(const Figure& figure,
                     const std::string& axes,
                     std::string_view viewBox,
                     std::string_view kind,
                     const std::string& data,
                     const std::string& legend) {
    return figureHtml(figure, "class=\"plot\"",
                      fmt::format(R"({}
<svg class="{}" viewBox="{}" preserveAspectRatio="none" width="100%" height="100%">
{}
</svg>)",
                                  axes, kind, viewBox, data),
                      legend);
}

// The means of groups of neighbouring columns, all made equally tall.
std::vector<std::vector<double>> merged(const HeatMap& map, std::size_t group, std::size_t rows) {
    std::vector<std::vector<double>> columns;
    for (std::size_t first = 0; first < map.columns.size(); first += group) {
        const std::size_t past = std::min(first + group, map.columns.size());
        std::vector<double>& column = columns.emplace_back(rows);
        for (std::size_t row = 0; row < rows; ++row) {
            double sum = 0;
            double count = 0;
            for (std::size_t at = first; at < past; ++at) {
                const auto& cells = map.columns[at];
                if (row < cells.size() && isDrawable(cells[row])) {
                    sum += cells[row];
                    ++count;
                }
            }
            column[row] = sum / count;  // NaN when there is none
        }
    }
    return columns;
}

// A path for each colour, made of the stretches of cells beside each other that have it.
std::string cellsSvg(const std::vector<std::vector<double>>& columns,
                     std::size_t rows,
                     const Range& range) {
    const double span = range.greatest - range.least;
    const auto levelOf = [&](double value) {
        if (!isDrawable(value)) {
            return -1;
        }
        const double share = span > 0 ? (value - range.least) / span : 0.5;
        return std::min(static_cast<int>(share * kLevels), kLevels - 1);
    };
    std::array<std::string, kLevels> paths;
    for (std::size_t row = 0; row < rows; ++row) {
        for (std::size_t at = 0; at < columns.size();) {
            const int level = levelOf(columns[at][row]);
            std::size_t past = at + 1;
            while (past < columns.size() && levelOf(columns[past][row]) == level) {
                ++past;
            }
            if (level >= 0) {
                paths[static_cast<std::size_t>(level)] +=
                    fmt::format("M{} {}h{}v1h-{}z", at, rows - 1 - row, past - at, past - at);
            }
            at = past;
        }
    }
    std::string svg;
    for (std::size_t level = 0; level < paths.size(); ++level) {
        if (!paths[level].empty()) {
            svg += fmt::format("<path class=\"level-{}\" d=\"{}\"/>\n", level, paths[level]);
        }
    }
    return svg;
}

std::string colourLegend(const Range& range) {
    std::string bar;
    for (int level = 0; level < kLevels; ++level) {
        bar += fmt::format(R"(<rect class="level-{}" x="{}" width="1" height="1"/>)", level, level);
    }
    return fmt::format(
        "<p class=\"legend\">{:.6g} <svg class=\"ramp\" viewBox=\"0 0 {} 1\" "
        "preserveAspectRatio=\"none\" aria-hidden=\"true\">{}</svg> {:.6g}</p>\n",
        range.least, kLevels, bar, range.greatest);
}

}  // namespace

std::vector<Point> decimated(const std::vector<Point>& points, std::size_t most) {
    if (points.size() <= most) {
        return points;
    }
    const std::size_t groups = most / 2;
    std::vector<Point> kept;
    kept.reserve(2 * groups);
    for (std::size_t group = 0; group < groups; ++group) {
        std::vector<Point> drawn;
        const auto at = points.begin();
        std::copy_if(at + static_cast<std::ptrdiff_t>(group * points.size() / groups),
                     at + static_cast<std::ptrdiff_t>((group + 1) * points.size() / groups),
                     std::back_inserter(drawn),
                     [](const Point& point) { return isDrawable(point.y); });
        if (drawn.empty()) {
            kept.push_back({at[static_cast<std::ptrdiff_t>(group * points.size() / groups)].x,
                            std::numeric_limits<double>::quiet_NaN()});
            continue;
        }
        auto [least, greatest] = std::minmax_element(
            drawn.begin(), drawn.end(), [](const Point& a, const Point& b) { return a.y < b.y; });
        kept.push_back(*std::min(least, greatest));
        if (least != greatest) {
            kept.push_back(*std::max(least, greatest));
        }
    }
    return kept;
}

std::string linePlot(const LinePlot& plot) {
    Range across;
    Range up;
    const auto measure = [&](const std::vector<Point>& points) {
        for (const Point& point : points) {
            across.add(point.x);
            up.add(point.y);
        }
    };
    for (const Series& series : plot.series) {
        measure(series.points);
    }
    for (const Band& band : plot.bands) {
        measure(band.lower);
        measure(band.upper);
    }
    if (up.empty()) {
        return "";
    }
    measure(plot.room);
    const Axis x(across.least, across.greatest, plot.wholeX);
    const Axis y = plot.wholeY ? Axis(up.least - 0.5, up.greatest + 0.5, true)
                               : Axis::around(up.least, up.greatest);
    const Scale scale(x, y);
    Figure figure = plot.figure;
    if (!plot.gaps.empty()) {
        figure.caption += " An upright line stands where frames were lost.";
    }
    std::string data;
    for (const Band& band : plot.bands) {
        data += bandSvg(band, scale);
    }
    for (const Series& series : plot.series) {
        data += seriesSvg(series, scale, plot);
    }
    return figureOf(figure, axesSvg(x, y) + gapsSvg(plot.gaps, x),
                    fmt::format("0 0 {} {}", kWidth, kHeight), "lines", data, legendOf(plot));
}

std::string heatMap(const HeatMap& map) {
    std::size_t rows = 0;
    for (const auto& column : map.columns) {
        rows = std::max(rows, column.size());
    }
    const std::size_t group =
        std::max<std::size_t>(1, (map.columns.size() + kMostColumns - 1) / kMostColumns);
    const auto columns = merged(map, group, rows);
    Range range;
    for (const auto& column : columns) {
        std::for_each(column.begin(), column.end(), [&](double cell) { range.add(cell); });
    }
    if (range.empty()) {
        return "";
    }
    Figure figure = map.figure;
    if (group > 1) {
        figure.caption += fmt::format(" A column is the mean of {} neighbours.", group);
    }
    // Cells are drawn around their whole numbers.
    const Axis x(0.5, static_cast<double>(map.columns.size()) + 0.5, true);
    const Axis y(-0.5, static_cast<double>(rows) - 0.5, true);
    // The last group may be smaller: its column is cut, so that the marks stay where they belong.
    const double width = static_cast<double>(map.columns.size()) / static_cast<double>(group);
    return figureOf(figure, axesSvg(x, y), fmt::format("0 0 {:g} {}", width, rows), "cells",
                    cellsSvg(columns, rows, range), colourLegend(range));
}

}  // namespace host
