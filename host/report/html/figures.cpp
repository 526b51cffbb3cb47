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

#include "host/record/run_text.h"
#include "host/report/html/axis.h"
#include "host/report/html/plot.h"

namespace host {

namespace {

constexpr double kNone = std::numeric_limits<double>::quiet_NaN();

// "Least 33.32, median 33.33, greatest 66.67 ms (frame 17)."
std::string spreadText(const std::vector<Point>& points,
                       std::string_view unit,
                       std::string_view place) {
    std::vector<Point> drawn;
    std::copy_if(points.begin(), points.end(), std::back_inserter(drawn),
                 [](const Point& point) { return isDrawable(point.y); });
    if (drawn.empty()) {
        return "No values.";
    }
    std::stable_sort(drawn.begin(), drawn.end(),
                     [](const Point& a, const Point& b) { return a.y < b.y; });
    return fmt::format("Least {:.2f}, median {:.2f}, greatest {:.2f} {} ({}).", drawn.front().y,
                       drawn[drawn.size() / 2].y, drawn.back().y, unit,
                       fmt::format(fmt::runtime(place), drawn.back().x));
}

// A value of each frame over the frame's number.
std::vector<Point> overFrames(
    const std::vector<FrameRecord>& frames,
    const std::function<std::optional<double>(const FrameRecord&)>& value) {
    std::vector<Point> points;
    points.reserve(frames.size());
    for (const FrameRecord& frame : frames) {
        points.push_back({static_cast<double>(frame.number), value(frame).value_or(kNone)});
    }
    return points;
}

// Milliseconds since the frame before, over the frame's number.
std::vector<Point> intervals(const std::vector<FrameRecord>& frames, double FrameRecord::*clock) {
    std::vector<Point> points;
    for (std::size_t at = 1; at < frames.size(); ++at) {
        points.push_back({static_cast<double>(frames[at].number),
                          (frames[at].*clock - frames[at - 1].*clock) * 1000});
    }
    return points;
}

std::string timingFigure(const std::vector<FrameRecord>& frames,
                         double FrameRecord::*clock,
                         const std::string& id,
                         const std::string& title,
                         const std::string& what) {
    const std::vector<Point> points = intervals(frames, clock);
    return linePlot({.figure = {.id = id,
                                .title = title,
                                .caption = what + " " + spreadText(points, "ms", "frame {:g}"),
                                .xLabel = "frame",
                                .yLabel = "ms since the frame before"},
                     .series = {{title, "hue-a", points}},
                     .bands = {}});
}

std::string temperatureFigure(const std::vector<FrameRecord>& frames, const std::string& id) {
    // The hue shows the sensor, the dashes its state.
    static constexpr const char* kHues[] = {"hue-a", "hue-b", "hue-c"};
    static constexpr const char* kDashes[] = {" dotted", " dashed", ""};
    LinePlot plot{.figure = {.id = id,
                             .title = "Temperatures",
                             .caption = "As the frames' metadata states them, in the device's own "
                                        "unit. A gap is a frame without the value.",
                             .xLabel = "frame",
                             .yLabel = "device's own unit"},
                  .series = {},
                  .bands = {}};
    for (std::size_t at = 0; at < kTemperatureCount; ++at) {
        std::vector<Point> points =
            overFrames(frames, [at](const FrameRecord& frame) { return frame.temperatures[at]; });
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

std::string lightFigure(const std::vector<FrameRecord>& frames, const std::string& id) {
    const std::vector<Point> points =
        overFrames(frames, [](const FrameRecord& frame) { return frame.lightSource; });
    return linePlot({.figure = {.id = id,
                                .title = "Light source",
                                .caption = "Which light lit a frame, as its metadata states it: 1 "
                                           "the dots, 2 the flood, anything else neither.",
                                .xLabel = "frame",
                                .yLabel = "light source"},
                     .wholeY = true,
                     .series = {{"light source", "hue-c", points}},
                     .bands = {}});
}

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
                            envelope("Q, all images", "hue-b", samplesQ)}});
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
    return linePlot({.figure = {.id = id,
                                .title = "Temperature",
                                .caption = "The sensor's temperature monitor. " +
                                           spreadText(points, "°C", "after {:g} s"),
                                .xLabel = "seconds on the sensor's clock since the first image",
                                .yLabel = "°C"},
                     .wholeX = false,
                     .series = {{"temperature", "hue-c", points}},
                     .bands = {}});
}

}  // namespace

std::string frameFigures(const RunRecord& run, const std::string& id) {
    const auto& frames = run.frames;
    return timingFigure(frames, &FrameRecord::presentation, id + "-clock",
                        "Frame interval, device's clock", "Between presentation times.") +
           timingFigure(frames, &FrameRecord::delivered, id + "-arrival", "Frame interval, arrival",
                        "Real time between two deliveries.") +
           temperatureFigure(frames, id + "-temperatures") + lightFigure(frames, id + "-light");
}

std::string imageFigures(const RunRecord& run, const std::string& id) {
    const platform::List* images = imagesOf(run.auxiliaryData);
    if (images == nullptr || images->empty()) {
        return "";
    }
    return sampleFigures(*images, id) + imageTemperatureFigure(*images, id + "-temperature");
}

}  // namespace host
