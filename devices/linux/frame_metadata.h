// The metadata of a frame, put together from what the description names.
#ifndef ZR_DEVICES_LINUX_FRAME_METADATA_H
#define ZR_DEVICES_LINUX_FRAME_METADATA_H

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "devices/linux/description.h"
#include "devices/linux/machine.h"
#include "devices/linux/video_device.h"
#include "platform/value.h"

namespace linux_device {

// A number of a file, a control, an extension unit or a constant. Throws a SystemProblem.
platform::Number readSource(const NumberSource& number, const Machine& machine, VideoDevice& video);

// Threads  One at a time.
class FrameMetadata {
  public:
    // `described` must live as long.
    FrameMetadata(const std::vector<NumberSource>& described,
                  Machine machine,
                  std::shared_ptr<VideoDevice> video);

    // The metadata of the frame with that buffer and that number; nothing when a key that is not optional is
    // missing. The log then names the key and the reason, once in a row.
    std::optional<platform::Dictionary> make(std::span<const std::byte> buffer,
                                             std::uint64_t number);

  private:
    struct Kept {
        std::chrono::steady_clock::time_point until = {};
        platform::Number number = {};  // absent when it could not be read
        std::string problem = {};
    };

    const Kept& _read(std::size_t index);

    const std::vector<NumberSource>& _described;
    const Machine _machine;
    const std::shared_ptr<VideoDevice> _video;
    std::vector<Kept> _kept;  // by the index of the source; unused for fields of the buffer
    std::string _lastProblem;
};

}  // namespace linux_device

#endif
