#include "host/run/figure.h"

#include <cmath>
#include <cstdlib>

namespace host {

namespace {

constexpr std::size_t kInterval = 1;
constexpr std::size_t kArrivalInterval = 2;
constexpr std::size_t kFirstTemperature = 3;
constexpr std::size_t kImageTemperature = kFirstTemperature + kTemperatureCount;
constexpr std::size_t kImageAmplitude = kImageTemperature + 1;
static_assert(kImageAmplitude + 1 == kFigureCount);

// A float through its own shortest text, or 86.1 would be judged and shown as 86.0999984741211.
double asWritten(const platform::Number& number) {
    return number.kind() == platform::Number::Kind::Float
               ? std::strtod(number.text().c_str(), nullptr)
               : number.asDouble();
}

// To the nanosecond, or a difference of 33.334 ms would be 33.33400000000009.
double milliseconds(double seconds) {
    return std::round(seconds * 1e9) / 1e6;
}

// Absent when the image has no samples.
std::optional<double> amplitudeOf(const ImageView& image) {
    if (image.samplesI == nullptr || image.samplesQ == nullptr) {
        return std::nullopt;
    }
    Range amplitudes;
    const std::size_t count = std::min(image.samplesI->size(), image.samplesQ->size());
    for (std::size_t at = 0; at < count; ++at) {
        amplitudes.add(std::hypot((*image.samplesI)[at].asNumber().asDouble(),
                                  (*image.samplesQ)[at].asNumber().asDouble()));
    }
    return amplitudes.isEmpty() ? std::nullopt : std::optional(amplitudes.greatest());
}

}  // namespace

void Figures::addFrame(const FrameRecord& frame) {
    if (_last.has_value()) {
        _ranges[kInterval].add(milliseconds(frame.presentation - _last->presentation));
        _ranges[kArrivalInterval].add(milliseconds(frame.delivered - _last->delivered));
    }
    for (std::size_t at = 0; at < kTemperatureCount; ++at) {
        if (frame.temperatures[at].has_value()) {
            _ranges[kFirstTemperature + at].add(*frame.temperatures[at]);
        }
    }
    _last = frame;
}

void Figures::addRest(const RunRecord& run) {
    if (run.framesLost.has_value()) {
        _ranges[kFramesLostFigure].add(static_cast<double>(*run.framesLost));
    }
    const platform::List* images = imagesOf(run.auxiliaryData);
    for (std::size_t at = 0; images != nullptr && at < images->size(); ++at) {
        const platform::Value value = (*images)[at];
        const ImageView image(value);
        if (image.celsius.isPresent()) {
            _ranges[kImageTemperature].add(asWritten(image.celsius));
        }
        if (const std::optional<double> amplitude = amplitudeOf(image)) {
            _ranges[kImageAmplitude].add(*amplitude);
        }
    }
}

}  // namespace host
