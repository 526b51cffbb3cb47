#include "host/report/html/bar_plot.h"

#include <algorithm>
#include <cmath>

#include <fmt/format.h>

#include "host/record/clean_text.h"
#include "host/report/html/axis.h"
#include "host/report/html/figure.h"

namespace host {

namespace {

// Pixels: a row's label, each of its marks below it, and the space to the next row.
constexpr double kLabel = 18;
constexpr double kMark = 12;
constexpr double kSpace = 8;
constexpr std::size_t kMostCharacters = 44;  // of a label: as many as a telephone is wide

std::string cut(const std::string& label) {
    std::size_t characters = 0;
    for (std::size_t at = 0; at < label.size(); ++at) {
        characters += (label[at] & 0xC0) != 0x80 ? 1 : 0;
        if (characters > kMostCharacters) {
            return label.substr(0, at) + "…";
        }
    }
    return label;
}

std::string markSvg(
    const BarMark& mark, const std::string& style, bool isBar, double down, const Axis& x) {
    if (!isDrawable(mark.value)) {
        return "";
    }
    const auto across = [&x](double value) { return 100 * x.at(value); };
    if (isBar) {
        const double from = std::min(across(0), across(mark.value));
        return fmt::format(
            R"(<rect class="bar {}" x="{:.2f}%" y="{:g}" width="{:.2f}%" height="8"/>)", style,
            from, down - 4, std::abs(across(mark.value) - across(0)));
    }
    std::string svg;
    if (isDrawable(mark.low) && isDrawable(mark.high)) {
        svg = fmt::format(
            R"(<line class="line {0}" x1="{1:.2f}%" x2="{2:.2f}%" y1="{3:g}" y2="{3:g}"/>)", style,
            across(mark.low), across(mark.high), down);
    }
    return svg + fmt::format(R"(<circle class="point {}" cx="{:.2f}%" cy="{:g}" r="4"/>)", style,
                             across(mark.value), down);
}

}  // namespace

std::string barPlot(const BarPlot& plot) {
    double least = std::numeric_limits<double>::infinity();
    double greatest = -least;
    const auto add = [&](double value) {
        if (isDrawable(value)) {
            least = std::min(least, value);
            greatest = std::max(greatest, value);
        }
    };
    for (const Bar& bar : plot.bars) {
        for (const BarMark& mark : bar.marks) {
            add(mark.value);
            add(mark.low);
            add(mark.high);
        }
    }
    if (least > greatest) {
        return "";
    }
    if (plot.areBars) {
        add(0);
    }
    const Axis x = Axis::toMarks(least, greatest);
    std::string svg = verticalGridSvg(x);
    double down = 0;
    for (const Bar& bar : plot.bars) {
        down += kLabel;
        svg += fmt::format(R"(<text class="row" x="0" y="{:g}">{}</text>)", down - 6,
                           htmlText(cut(bar.label)));
        for (std::size_t at = 0; at < bar.marks.size(); ++at) {
            svg += markSvg(bar.marks[at], plot.series[at].style, plot.areBars, down + kMark / 2, x);
            down += kMark;
        }
        down += kSpace;
        svg += "\n";
    }
    std::string entries;
    for (const BarSeries& series : plot.series) {
        entries += fmt::format(
            "<li><svg class=\"swatch\" width=\"28\" height=\"10\" aria-hidden=\"true\">"
            "<path class=\"line {0}\" d=\"M1 5h26\"/><circle class=\"point {0}\" cx=\"14\" "
            "cy=\"5\" r=\"4\"/></svg>"
            "{1}</li>\n",
            series.style, htmlText(series.name));
    }
    const std::string legend =
        plot.series.size() < 2 ? "" : "<ul class=\"legend\">\n" + entries + "</ul>\n";
    return figureHtml(plot.figure, fmt::format(R"(class="plot rows" style="height:{:g}px")", down),
                      svg, legend);
}

}  // namespace host
