// Figures: what limits of the bench can be put on besides measurements, and how a run's frames and images give
// them.
#ifndef ZR_HOST_RUN_FIGURE_H
#define ZR_HOST_RUN_FIGURE_H

#include <algorithm>
#include <array>
#include <cmath>
#include <cstddef>
#include <iterator>
#include <limits>
#include <optional>
#include <string_view>

#include "host/record/plugin_data.h"
#include "host/record/run_record.h"

namespace host {

// The least and the greatest value of a quantity over a run. One that is not a number makes both so.
class Range {
  public:
    void add(double value) {
        const bool isNumber = !std::isnan(value) && !std::isnan(_least);
        _least = isNumber ? std::min(_least, value) : kNaN;
        _greatest = isNumber ? std::max(_greatest, value) : kNaN;
        _isEmpty = false;
    }
    bool isEmpty() const { return _isEmpty; }
    double least() const { return _least; }
    double greatest() const { return _greatest; }

  private:
    static constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
    double _least = std::numeric_limits<double>::infinity();
    double _greatest = -std::numeric_limits<double>::infinity();
    bool _isEmpty = true;
};

enum class FigureGroup { Frames, Images };

struct FigureEntry {
    FigureGroup group;
    std::string_view key;  // in a file of limits
    std::string_view name;
    std::string_view unit;
};

// The figures, those of frames first, the temperatures of frames in the order of kTemperatures. A lower bound
// is on the least value of a run, an upper one on the greatest. A temperature of frames is in the device's own
// unit. The amplitude of an image is the greatest √(I² + Q²) of its samples, in the sensor's own unit.
inline constexpr FigureEntry kFigures[] = {
    {FigureGroup::Frames, "lost", "frames lost", "frames"},
    {FigureGroup::Frames, "interval", "frame interval", "ms"},
    {FigureGroup::Frames, "arrivalInterval", "frame arrival interval", "ms"},
    {FigureGroup::Frames, "NTCTemperatureIdle", "NTC idle", ""},
    {FigureGroup::Frames, "NTCTemperatureStandby", "NTC standby", ""},
    {FigureGroup::Frames, "NTCTemperatureActive", "NTC active", ""},
    {FigureGroup::Frames, "DIETemperatureIdle", "DIE idle", ""},
    {FigureGroup::Frames, "DIETemperatureStandby", "DIE standby", ""},
    {FigureGroup::Frames, "DIETemperatureActive", "DIE active", ""},
    {FigureGroup::Frames, "floodActiveTemperature", "Flood active", ""},
    {FigureGroup::Images, "temperature", "image temperature", "°C"},
    {FigureGroup::Images, "amplitude", "image amplitude", ""},
};
inline constexpr std::size_t kFigureCount = std::size(kFigures);
inline constexpr std::size_t kFramesLostFigure = 0;

// The figures of one run. One thread at a time.
class Figures {
  public:
    void addFrame(const FrameRecord& frame);
    // Those of the images, and the frames lost: once, when the run has ended.
    void addRest(const RunRecord& run);

    const Range& operator[](std::size_t figure) const { return _ranges[figure]; }

  private:
    std::array<Range, kFigureCount> _ranges;
    std::optional<FrameRecord> _last;
};

}  // namespace host

#endif
