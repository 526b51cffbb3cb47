// FrameGap: frames that the sensor counted and the host never received.
#ifndef ZR_HOST_RECORD_FRAME_GAP_H
#define ZR_HOST_RECORD_FRAME_GAP_H

#include <algorithm>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "host/record/run_record.h"

namespace host {

// Counts lost frames from the sensor's numbers, frame by frame. One thread at a time.
class LostFrames {
  public:
    // The frames lost since the last frame that had a number; `sensorNumber` is the new frame's. A number
    // that repeats or goes back loses nothing: the sensor began to count anew. What was before the first
    // frame is not known, and a received frame without a number is taken to have one in between.
    std::uint64_t before(std::optional<std::int64_t> sensorNumber) {
        if (!sensorNumber.has_value()) {
            ++_unnumbered;
            return 0;
        }
        std::uint64_t lost = 0;
        if (_last.has_value() && *sensorNumber > *_last) {
            const std::uint64_t skipped =
                static_cast<std::uint64_t>(*sensorNumber) - static_cast<std::uint64_t>(*_last) - 1;
            lost = skipped - std::min(skipped, _unnumbered);
        }
        _last = sensorNumber;
        _unnumbered = 0;
        _count += lost;
        return lost;
    }

    // Of all frames so far; absent when none had a number.
    std::optional<std::uint64_t> count() const {
        return _last.has_value() ? std::optional(_count) : std::nullopt;
    }

  private:
    std::optional<std::int64_t> _last;
    std::uint64_t _unnumbered = 0;  // frames since that one
    std::uint64_t _count = 0;
};

// Lost frames between two received ones. Both have a sensor's number.
struct FrameGap {
    const FrameRecord* before;
    const FrameRecord* after;
    std::uint64_t lost;
};

// The gaps in the run's frames, in their order. Valid as long as the frames.
std::vector<FrameGap> gapsIn(const std::vector<FrameRecord>& frames);

// "3 frames lost between the received frames 8 and 9 (the sensor's 8 and 12)".
std::string gapText(const FrameGap& gap);

}  // namespace host

#endif
