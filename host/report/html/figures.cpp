#include "host/report/html/figures.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <functional>
#include <iterator>
#include <limits>
#include <optional>
#include <vector>

#include <fmt/format.h>

#include "host/record/frame_gap.h"
#include "host/record/run_text.h"
#include "host/report/html/axis.h"
#include "host/report/html/plot.h"

namespace host {

namespace {

constexpr double kNone = std::numeric_limits<double>::quiet_NaN();

// "Least 33.32, median 33.33, greatest 66.67 ms (frame 17)."; `place` says where the greatest is.
std::string spreadText(const std::vector<Point>& points,
                       std::string_view unit,
                       const std::function<std::string(double x)>& place) {
    std::vector<Point> drawn;
    std::copy_if(points.begin(), points.end(), std::back_inserter(drawn),
                 [](const Point& point) { return isDrawable(point.y); });
    if (drawn.empty()) {
        return "No values.";
    }
    std::stable_sort(drawn.begin(), drawn.end(),
                     [](const Point& a, const Point& b) { return a.y < b.y; });
    return fmt::format("Least {:.2f}, median {:.2f}, greatest {:.2f} {} at {}.", drawn.front().y,
                       drawn[drawn.size() / 2].y, drawn.back().y, unit, place(drawn.back().x));
}

// The drawings of a run's frames, over their received numbers.
class FrameFigures {
  public:
    FrameFigures(const std::vector<FrameRecord>& frames, const std::string& id)
        : _frames(frames), _id(id), _lost(gapsIn(frames)) {}

    std::string html() const {
        return _timing(&FrameRecord::presentation, "clock", "Frame interval, device's clock",
                       "Between presentation times.") +
               _timing(&FrameRecord::delivered, "arrival", "Frame interval, arrival",
                       "Real time between two deliveries.") +
               _temperatures() + _light();
    }

  private:
    // A value of each frame. The line is broken where frames were lost.
    std::vector<Point> _points(
        const std::function<std::optional<double>(std::size_t at)>& value) const {
        std::vector<Point> points;
        points.reserve(_frames.size() + _lost.size());
        auto gap = _lost.begin();
        for (std::size_t at = 0; at < _frames.size(); ++at) {
            if (gap != _lost.end() && gap->after == &_frames[at]) {
                points.push_back({_gapX(*gap++), kNone});
            }
            points.push_back({static_cast<double>(_frames[at].number), value(at).value_or(kNone)});
        }
        return points;
    }

    static double _gapX(const FrameGap& gap) {
        return (static_cast<double>(gap.before->number) + static_cast<double>(gap.after->number)) /
               2;
    }

    LinePlot _plot(std::string_view suffix,
                   std::string title,
                   std::string caption,
                   std::string yLabel) const {
        LinePlot plot{.figure = {.id = fmt::format("{}-{}", _id, suffix),
                                 .title = std::move(title),
                                 .caption = std::move(caption),
                                 .xLabel = "frame, as received",
                                 .yLabel = std::move(yLabel)},
                      .series = {},
                      .bands = {},
                      .gaps = {}};
        for (const FrameGap& gap : _lost) {
            plot.gaps.push_back({_gapX(gap), gapText(gap)});
        }
        return plot;
    }

    // Milliseconds since the frame before.
    std::string _timing(double FrameRecord::*clock,
                        std::string_view suffix,
                        const std::string& title,
                        const std::string& what) const {
        std::vector<Point> points = _points([&](std::size_t at) {
            return at > 0 ? std::optional((_frames[at].*clock - _frames[at - 1].*clock) * 1000)
                          : std::nullopt;
        });
        const auto place = [this](double x) {
            const auto frame = std::find_if(
                _frames.begin(), _frames.end(),
                [x](const FrameRecord& one) { return static_cast<double>(one.number) == x; });
            return frameText(*frame);
        };
        LinePlot plot = _plot(suffix, title, what + " " + spreadText(points, "ms", place),
                              "ms since the frame before");
        plot.series = {{title, "hue-a", std::move(points)}};
        return linePlot(plot);
    }

    std::string _temperatures() const {
        // The hue shows the sensor, the dashes its state.
        static constexpr const char* kHues[] = {"hue-a", "hue-b", "hue-c"};
        static constexpr const char* kDashes[] = {" dotted", " dashed", ""};
        LinePlot plot =
            _plot("temperatures", "Temperatures",
                  "As the frames' metadata states them, in the device's own unit. A line has a gap "
                  "where a frame lacks the value.",
                  "device's own unit");
        for (std::size_t at = 0; at < kTemperatureCount; ++at) {
            std::vector<Point> points =
                _points([&](std::size_t frame) { return _frames[frame].temperatures[at]; });
            const bool drawn = std::any_of(points.begin(), points.end(),
                                           [](const Point& point) { return isDrawable(point.y); });
            if (drawn) {
                const TemperatureEntry& entry = kTemperatures[at];
                plot.series.push_back({std::string(entry.name),
                                       std::string(kHues[static_cast<std::size_t>(entry.sensor)]) +
                                           kDashes[static_cast<std::size_t>(entry.state)],
                                       std::move(points)});
            }
        }
        return linePlot(plot);
    }

    std::string _light() const {
        LinePlot plot =
            _plot("light", "Light source",
                  "Which light lit a frame, as its metadata states it: 1 the dots, 2 the "
                  "flood, anything else neither.",
                  "light source");
        plot.wholeY = true;
        plot.series = {{"light source", "hue-c",
                        _points([&](std::size_t at) { return _frames[at].lightSource; })}};
        return linePlot(plot);
    }

    const std::vector<FrameRecord>& _frames;
    const std::string& _id;
    const std::vector<FrameGap> _lost;
};

// One list of samples of every image; NaN where a sample is not a number.
std::vector<std::vector<double>> samplesOf(const platform::List& images,
                                           const platform::List* ImageView::*list) {
    std::vector<std::vector<double>> all;
    all.reserve(images.size());
    for (const platform::Value& image : images) {
        std::vector<double>& samples = all.emplace_back();
        const platform::List* held = ImageView(image).*list;
        for (std::size_t at = 0; held != nullptr && at < held->size(); ++at) {
            const platform::Number sample = (*held)[at].asNumber();
            samples.push_back(sample.isPresent() ? sample.asDouble() : kNone);
        }
    }
    return all;
}

Series curve(const std::string& name,
             const std::string& style,
             const std::vector<std::vector<double>>& images) {
    Series series{name, style, {}};
    for (std::size_t at = 0; at < images.back().size(); ++at) {
        series.points.push_back({static_cast<double>(at), images.back()[at]});
    }
    return series;
}

Band envelope(const std::string& name,
              const std::string& style,
              const std::vector<std::vector<double>>& images) {
    Band band{name, style, {}, {}};
    for (std::size_t at = 0; at < images.back().size(); ++at) {
        double least = kNone;
        double greatest = kNone;
        for (const auto& samples : images) {
            if (at < samples.size()) {
                least = std::fmin(least, samples[at]);  // ignores NaN
                greatest = std::fmax(greatest, samples[at]);
            }
        }
        band.lower.push_back({static_cast<double>(at), least});
        band.upper.push_back({static_cast<double>(at), greatest});
    }
    return band;
}

std::string sampleFigures(const platform::List& images, const std::string& id) {
    const auto samplesI = samplesOf(images, &ImageView::samplesI);
    const auto samplesQ = samplesOf(images, &ImageView::samplesQ);
    std::string figures =
        linePlot({.figure = {.id = id + "-curve",
                             .title = "Samples of the last image",
                             .caption = fmt::format(
                                 "Lines: the last image, frame ID {}. Areas: the range of all {}.",
                                 ImageView(images[images.size() - 1]).frameId.text(),
                                 plural(images.size(), "image", "images")),
                             .xLabel = "sample",
                             .yLabel = "sample value"},
                  .series = {curve("I", "hue-a", samplesI), curve("Q", "hue-b dashed", samplesQ)},
                  .bands = {envelope("I, all images", "hue-a", samplesI),
                            envelope("Q, all images", "hue-b", samplesQ)},
                  .gaps = {}});
    for (const auto& [name, samples] : {std::pair("I", &samplesI), std::pair("Q", &samplesQ)}) {
        figures += heatMap({.figure = {.id = fmt::format("{}-map-{}", id, name),
                                       .title = fmt::format("{} samples over the images", name),
                                       .caption = "Bright is high, dark is low.",
                                       .xLabel = "image",
                                       .yLabel = "sample"},
                            .columns = *samples});
    }
    return figures;
}

std::string imageTemperatureFigure(const platform::List& images, const std::string& id) {
    std::vector<Point> points;
    const double start = ImageView(images[0]).milliseconds.asDouble();
    double latest = 0;
    for (const platform::Value& value : images) {
        const ImageView image(value);
        // If the clock goes back, the line must not.
        latest = std::max(latest, (image.milliseconds.asDouble() - start) / 1000);
        points.push_back({latest, image.celsius.isPresent() ? image.celsius.asDouble() : kNone});
    }
    const auto after = [](double x) { return fmt::format("{:g} s", x); };
    return linePlot({.figure = {.id = id,
                                .title = "Temperature",
                                .caption = "The sensor's temperature monitor. " +
                                           spreadText(points, "°C", after),
                                .xLabel = "seconds on the sensor's clock since the first image",
                                .yLabel = "°C"},
                     .wholeX = false,
                     .series = {{"temperature", "hue-c", points}},
                     .bands = {},
                     .gaps = {}});
}

}  // namespace

std::string frameFigures(const RunRecord& run, const std::string& id) {
    return FrameFigures(run.frames, id).html();
}

std::string repetitionFigure(const RepeatRecord& repeat, const std::string& id) {
    std::vector<Point> points;
    for (const RepetitionOutcome& one : repeat.outcomes) {
        points.push_back({static_cast<double>(points.size() + 1), one.seconds});
    }
    const auto run = [](double x) { return fmt::format("run {:g}", x); };
    const std::string caption = spreadText(points, "s", run);
    return linePlot({.figure = {.id = id + "-seconds",
                                .title = "Seconds of each run",
                                .caption = caption,
                                .xLabel = "run",
                                .yLabel = "seconds"},
                     .series = {{"seconds", "hue-a", std::move(points)}},
                     .bands = {},
                     .gaps = {}});
}

std::string imageFigures(const RunRecord& run, const std::string& id) {
    const platform::List* images = imagesOf(run.auxiliaryData);
    if (images == nullptr || images->empty()) {
        return "";
    }
    return sampleFigures(*images, id) + imageTemperatureFigure(*images, id + "-temperature");
}

}  // namespace host
