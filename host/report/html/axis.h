// Axis: one axis of a drawing, its range and its marks.
#ifndef ZR_HOST_REPORT_HTML_AXIS_H
#define ZR_HOST_REPORT_HTML_AXIS_H

#include <string>
#include <utility>
#include <vector>

namespace host {

// Whether a value can be drawn: finite, and far enough from the limits of a double to calculate with.
bool isDrawable(double value);

class Axis {
  public:
    // From `least` to `greatest`, both drawable. An axis of whole numbers has marks at whole numbers only.
    Axis(double least, double greatest, bool whole);

    // Around the values with some air above and below, so that a line that hardly moves looks flat.
    static Axis around(double least, double greatest);

    // Widened to the next round values, so that both ends have a mark.
    static Axis toMarks(double least, double greatest);

    // Where the value stands: 0 at the axis's start, 1 at its end.
    double at(double value) const { return (value - _least) / (_greatest - _least); }

    // Round values within the range, with their texts.
    std::vector<std::pair<double, std::string>> marks() const;

  private:
    double _least;
    double _greatest;
    bool _whole;
};

// The grid lines and the texts of both axes, as SVG that does not depend on the drawing's width.
std::string axesSvg(const Axis& x, const Axis& y);

// Upright grid lines and their texts, of a drawing whose rows have names.
std::string verticalGridSvg(const Axis& x);

}  // namespace host

#endif
