// What an experiment's result holds, for comparing one run with another.
#ifndef ZR_TESTS_SUPPORT_RESULT_VALUES_H
#define ZR_TESTS_SUPPORT_RESULT_VALUES_H

#include <cstddef>
#include <map>
#include <string>

#include "frame/host_interface.h"

namespace test {

struct ResultValues {
    // How many frames or images there are; 0 when the experiment captures neither. A camera sends on until it is
    // stopped, so that there may be more frames than were asked for.
    std::size_t captured = 0;
    std::map<std::string, double> measurements;  // but for the frame count
    platform::Dictionary auxiliaryData;

    bool hasSameValues(const ResultValues& other) const {
        return measurements == other.measurements && auxiliaryData == other.auxiliaryData;
    }
};

inline ResultValues valuesOf(const ZRExperimentResult& result) {
    ResultValues values;
    for (const auto& [name, measurement] : result.measurements()) {
        values.measurements.emplace(name, measurement->doubleValue());
    }
    if (const auto frames = values.measurements.extract("FrameCount")) {
        values.captured = static_cast<std::size_t>(frames.mapped());
    }
    values.auxiliaryData = platform::Dictionary(result.auxiliaryData());
    if (const platform::List* images = values.auxiliaryData["images"].list()) {
        values.captured = images->size();
    }
    return values;
}

}  // namespace test

#endif
