#include "host/run/bench_judge.h"

#include <algorithm>
#include <limits>
#include <optional>
#include <string>

#include <fmt/format.h>

#include "host/run/judge.h"
#include "input/nearest.h"

namespace host {

namespace {

BenchResult resultOf(std::string name, const BenchLimit& limit) {
    BenchResult result;
    result.name = std::move(name);
    result.value = std::numeric_limits<double>::quiet_NaN();
    result.limit = limit.limit;
    result.judgement = Judgement::NotMeasured;
    result.partOfVerdict = limit.partOfVerdict;
    return result;
}

void measure(BenchResult& result, double value, std::string_view unit) {
    result.value = value;
    result.unit = unit;
    result.judgement = isWithin(value, *result.limit) ? Judgement::Within : Judgement::Outside;
}

BenchResult judgeMeasurement(const BenchLimit& limit, const RunRecord& run) {
    BenchResult result = resultOf(limit.measurement, limit);
    std::vector<std::string> names;
    for (const MeasurementRecord& one : run.measurements) {
        if (one.name == limit.measurement) {
            measure(result, one.value, one.unit);
            return result;
        }
        names.push_back(one.name);
    }
    result.note = names.empty()
                      ? "the run has no measurements"
                      : "the run has no such measurement" + input::didYouMean(result.name, names);
    return result;
}

std::string whyNotMeasured(std::size_t figure, const RunRecord& run) {
    if (kFigures[figure].group == FigureGroup::Images) {
        return "the run has no image with it";
    }
    if (run.framesDelivered == 0) {
        return "no frame was delivered";
    }
    return figure == kFramesLostFigure ? "the device does not number its frames"
                                       : "no frame has it";
}

}  // namespace

bool BenchJudge::followsFrames() const {
    return std::any_of(_limits.begin(), _limits.end(), [](const BenchLimit& limit) {
        return limit.figure.has_value() && kFigures[*limit.figure].group == FigureGroup::Frames &&
               *limit.figure != kFramesLostFigure;
    });
}

bool BenchJudge::hasLimitsFor(std::string_view run) const {
    return std::any_of(_limits.begin(), _limits.end(),
                       [run](const BenchLimit& limit) { return limit.run == run; });
}

void BenchJudge::add(const FrameBatch& batch) {
    for (const FrameRecord& frame : batch.frames) {
        _figures.addFrame(frame);
    }
}

std::vector<BenchResult> BenchJudge::judge(const RunRecord& run) {
    _figures.addRest(run);
    std::vector<BenchResult> results;
    for (const BenchLimit& limit : _limits) {
        if (limit.run != run.plan.name) {
            continue;
        }
        if (!limit.figure.has_value()) {
            results.push_back(judgeMeasurement(limit, run));
            continue;
        }
        const FigureEntry& figure = kFigures[*limit.figure];
        const Range& range = _figures[*limit.figure];
        const auto add = [&](std::string name, double value, bool lower, bool upper) {
            BenchResult result = resultOf(std::move(name), limit);
            if (!lower) {
                result.limit->lower.reset();
            }
            if (!upper) {
                result.limit->upper.reset();
            }
            if (range.isEmpty()) {
                result.note = whyNotMeasured(*limit.figure, run);
            } else {
                measure(result, value, figure.unit);
            }
            results.push_back(std::move(result));
        };
        if (*limit.figure == kFramesLostFigure) {
            add(std::string(figure.name), range.greatest(), true, true);
            continue;
        }
        if (limit.limit.lower.has_value()) {
            add(fmt::format("{}, least", figure.name), range.least(), true, false);
        }
        if (limit.limit.upper.has_value()) {
            add(fmt::format("{}, greatest", figure.name), range.greatest(), false, true);
        }
    }
    return results;
}

}  // namespace host
