#include "host/record/frame_gap.h"

#include <fmt/format.h>

#include "host/record/run_text.h"

namespace host {

std::vector<FrameGap> gapsIn(const std::vector<FrameRecord>& frames) {
    std::vector<FrameGap> gaps;
    LostFrames lostFrames;
    const FrameRecord* numbered = nullptr;  // the last frame that had a sensor's number
    for (const FrameRecord& frame : frames) {
        const std::uint64_t lost = lostFrames.before(frame.sensorNumber);
        if (lost > 0) {
            gaps.push_back({numbered, &frame, lost});
        }
        numbered = frame.sensorNumber.has_value() ? &frame : numbered;
    }
    return gaps;
}

std::string gapText(const FrameGap& gap) {
    return fmt::format("{} lost between the received frames {} and {} (the sensor's {} and {})",
                       plural(gap.lost, "frame", "frames"), gap.before->number, gap.after->number,
                       *gap.before->sensorNumber, *gap.after->sensorNumber);
}

}  // namespace host
