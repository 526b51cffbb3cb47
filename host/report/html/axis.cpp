#include "host/report/html/axis.h"

#include <algorithm>
#include <cmath>

#include <fmt/format.h>

namespace host {

namespace {

constexpr double kMostMarks = 5;

// The least of 1, 2, 5, 10, 20, … times a power of ten that is not below `span` / kMostMarks.
double roundStep(double span) {
    const double raw = span / kMostMarks;
    const double power = std::pow(10.0, std::floor(std::log10(raw)));
    for (const double factor : {1.0, 2.0, 5.0}) {
        if (raw <= factor * power) {
            return factor * power;
        }
    }
    return 10 * power;
}

std::string markText(double value, double step) {
    constexpr struct {
        double unit;
        const char* suffix;
    } kScales[] = {{1e9, " G"}, {1e6, " M"}};
    if (step >= 1e12) {
        return fmt::format("{:.3g}", value);
    }
    for (const auto& [unit, suffix] : kScales) {
        if (step * kMostMarks >= unit && value != 0) {
            return fmt::format("{:g}{}", value / unit, suffix);
        }
    }
    const int decimals = std::clamp(static_cast<int>(-std::floor(std::log10(step))), 0, 9);
    return fmt::format("{:.{}f}", value, decimals);
}

std::string xMarksSvg(const Axis& x) {
    std::string svg;
    for (const auto& [value, text] : x.marks()) {
        svg += fmt::format(
            "<text class=\"mark\" x=\"{:.2f}%\" y=\"100%\" dy=\"1.6em\" "
            "text-anchor=\"middle\">{}</text>",
            100 * x.at(value), text);
    }
    return svg;
}

}  // namespace

bool isDrawable(double value) {
    return std::abs(value) < 1e100;
}

Axis::Axis(double least, double greatest, bool whole)
    : _least(least), _greatest(greatest), _whole(whole) {
    if (!(_least < _greatest)) {
        _least -= 0.5;
        _greatest += 0.5;
    }
}

Axis Axis::around(double least, double greatest) {
    const double middle = (least + greatest) / 2;
    const double half = std::max((greatest - least) * 0.56, std::abs(middle) * 0.005);
    return half > 0 ? Axis(middle - half, middle + half, false) : Axis(-1, 1, false);
}

Axis Axis::toMarks(double least, double greatest) {
    const Axis tight(least, greatest, false);
    const double step = roundStep(tight._greatest - tight._least);
    return {std::floor(tight._least / step + 1e-6) * step,
            std::ceil(tight._greatest / step - 1e-6) * step, false};
}

std::vector<std::pair<double, std::string>> Axis::marks() const {
    double step = roundStep(_greatest - _least);
    if (_whole) {
        step = std::max(step, 1.0);
    }
    std::vector<std::pair<double, std::string>> marks;
    const double first = std::ceil(_least / step - 1e-6);
    for (int count = 0; count <= 2 * kMostMarks; ++count) {
        const double value = (first + count) * step + 0.0;  // no minus zero
        if (value > _greatest + step * 1e-6) {
            break;
        }
        std::string text = markText(value, step);
        if (text.front() == '-') {
            text = "\u2212" + text.substr(1);
        }
        marks.emplace_back(value, std::move(text));
    }
    return marks;
}

std::string axesSvg(const Axis& x, const Axis& y) {
    std::string svg;
    for (const auto& [value, text] : y.marks()) {
        const double down = 100 * (1 - y.at(value));
        svg += fmt::format(
            "<line class=\"grid\" x1=\"0\" x2=\"100%\" y1=\"{0:.2f}%\" y2=\"{0:.2f}%\"/>"
            "<text class=\"mark\" x=\"-8\" y=\"{0:.2f}%\" dy=\".35em\" "
            "text-anchor=\"end\">{1}</text>",
            down, text);
    }
    return svg + xMarksSvg(x);
}

std::string verticalGridSvg(const Axis& x) {
    std::string svg;
    for (const auto& [value, text] : x.marks()) {
        svg += fmt::format(R"(<line class="grid" x1="{0:.2f}%" x2="{0:.2f}%" y1="0" y2="100%"/>)",
                           100 * x.at(value));
    }
    return svg + xMarksSvg(x);
}

}  // namespace host
