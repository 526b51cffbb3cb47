// FramePairs: brings the pictures of a camera together with their metadata, which come from another node.
//
// What belongs together has the same time; the sequence numbers of the two nodes are not comparable. Pictures come
// out in their order. One whose metadata does not come is given up when later metadata is there, or after a while.
#ifndef ZR_DEVICES_LINUX_FRAME_PAIRS_H
#define ZR_DEVICES_LINUX_FRAME_PAIRS_H

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <optional>
#include <span>
#include <vector>

#include "devices/linux/video_device.h"

namespace linux_device {

// Threads  One at a time.
class FramePairs {
  public:
    using TimePoint = std::chrono::steady_clock::time_point;
    static constexpr std::chrono::milliseconds kPatience{100};

    struct Frame {
        FilledBuffer picture;
        std::optional<std::vector<std::byte>> metadata = {};  // nothing when it did not come
    };

    // Without metadata every picture is a frame at once.
    explicit FramePairs(bool hasMetadata) : _hasMetadata(hasMetadata) {}

    void addPicture(const FilledBuffer& picture, TimePoint now);
    // Copies the content.
    void addMetadata(std::int64_t microseconds, std::span<const std::byte> content);

    // The next frame, if one is complete or given up at `now`.
    std::optional<Frame> next(TimePoint now);

    // When the next frame is given up; the clock's last time point when none waits.
    TimePoint deadline() const;

  private:
    struct Picture {
        FilledBuffer buffer;
        TimePoint deadline;
    };
    struct Metadata {
        std::int64_t microseconds;
        std::vector<std::byte> content;
    };

    const bool _hasMetadata;
    std::deque<Picture> _pictures;
    std::deque<Metadata> _metadata;
};

}  // namespace linux_device

#endif
