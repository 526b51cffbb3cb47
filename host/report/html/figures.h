// The drawings of a run: frame timing, light and temperatures of its frames; samples and temperature of
// its images; duration of its repetitions.
#ifndef ZR_HOST_REPORT_HTML_FIGURES_H
#define ZR_HOST_REPORT_HTML_FIGURES_H

#include <string>

#include "host/record/run_record.h"

namespace host {

// Figures with headings of level 4; ids begin with `id`. Empty when there is nothing to draw.
std::string frameFigures(const RunRecord& run, const std::string& id);
std::string imageFigures(const RunRecord& run, const std::string& id);
std::string repetitionFigure(const RepeatRecord& repeat, const std::string& id);

}  // namespace host

#endif
